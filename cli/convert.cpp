// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include <set>

#include "cli/ActingDelegate.h"
#include "cli/Interrupt.h"
#include "cli/LibrarySession.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "quilt/media/QuiltMediaExtra.h"
#include "quilt/platform/base/Worker.h"

namespace quilt::cli {

namespace {

/// Calls the block on every source of the document: those of the items, their extras and commentaries.
void forEachSource(const QuiltDocument& document,
                   const std::function<void(const QuiltMedia&, const QuiltMediaSource&)>& block) {
  for (const auto& item : document.media()) {
    for (const auto& source : item->sources()) block(*item, *source);
    for (const auto& extra : item->extras()) block(*item, *extra);
    if (const auto commentary = item->audioCommentarySource()) block(*item, *commentary);
  }
}

using Identities = std::set<std::string>;

Identities derivativesOf(const QuiltDocument& document) {
  Identities all;
  forEachSource(document, [&all](const QuiltMedia&, const QuiltMediaSource& source) {
    for (const auto& derivative : source.derivatives()) all.insert(derivative->uuid());
  });
  return all;
}

// The format that it was made for is the last tag.
std::string formatOf(const QuiltMediaDerivative& derivative) {
  const auto tags = derivative.compatibilityTags();
  return tags && !tags->empty() ? tags->back() : std::string();
}

void printNew(const QuiltDocument& document, Identities& known, Output& output) {
  forEachSource(document, [&](const QuiltMedia& item, const QuiltMediaSource& source) {
    const Text title = source.title() ? source.title() : item.title();
    for (const auto& derivative : source.derivatives()) {
      if (!known.insert(derivative->uuid()).second) continue;
      const auto url = derivative->url();
      const std::string format = formatOf(*derivative);
      output.item({{"uuid", derivative->uuid()},
                   {"title", title.value_or("")},
                   {"type", derivative->contentType().value_or("")},
                   {"path", url ? url->relativePath().native() : std::string()},
                   {"format", format},
                   {"item", item.uuid()}},
                  derivative->uuid() + '\t' + format + '\t' + escaped(title.value_or("")));
    }
  });
}

}  // namespace

void ActingDelegate::perform(const ConvertRequest& request) {
  _context.output.beginList();
  LibrarySession session(library(), _context);
  session.lock(findDocument(session.catalogue(), request.document));
  const FoundDocument found = findDocument(session.catalogue(), request.document);
  const auto document = session.open(found);
  Identities known = derivativesOf(*document);
  const auto formats = static_cast<double>(request.formats.size());
  double before = 0;
  for (auto wanted = request.formats.begin(); wanted != request.formats.end(); ++wanted) {
    const std::string& format = *wanted;
    _context.log.beginOperation();
    bool converted = false;
    platform::runOnWorker([&] {
      converted = document->convertToFormat(format,
                                            [&](double percentage) {
                                              _context.progress.report("Converting to " + format,
                                                                       before + percentage / formats);
                                              return !Interrupt::isRequested();
                                            },
                                            {std::next(wanted), request.formats.end()});
    });
    // What was made before a failure stays, and is told.
    printNew(*document, known, _context.output);
    if (Interrupt::isRequested()) throw Interrupt::failure("The rest was not converted");
    if (!converted)
      throw explain(
          "The document " + inQuotes(found.document->title, found.document->uuid) + " cannot be converted to " + format,
          _context.log, document->path(), document->path());
    before += 100 / formats;
  }
}

void PreviewDelegate::perform(const ConvertRequest& request) {
  _context.output.beginList();
  const Catalogue catalogue = readCatalogue(library());
  const FoundDocument found = findDocument(catalogue, request.document);
  const DocumentEntry& entry = *found.document;
  if (entry.damage)
    throw Failure("The document " + inQuotes(entry.title, entry.uuid) + " cannot be opened", *entry.damage);
  for (const std::string& format : request.formats)
    plan({{"action", "convert"}, {"document", entry.uuid}, {"format", format}},
         fmt::format("Would make what is missing of the format {} in the document {}", format,
                     inQuotes(entry.title, entry.uuid)));
}

}  // namespace quilt::cli
