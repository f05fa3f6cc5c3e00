// SPDX-License-Identifier: Apache-2.0
#include "cli/ActingDelegate.h"
#include "cli/Interrupt.h"
#include "cli/LibrarySession.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "cli/ThemeLookup.h"
#include "quilt/platform/base/Worker.h"

namespace quilt::cli {

namespace {

FoundDocument check(const FinalizeRequest& request, const Catalogue& catalogue) {
  const FoundDocument found = findDocument(catalogue, request.document);
  checkTheme(*found.document,
             "The document " + inQuotes(found.document->title, found.document->uuid) + " cannot be finalized",
             "set one with \"quilt set\"");
  return found;
}

}  // namespace

void ActingDelegate::perform(const FinalizeRequest& request) {
  LibrarySession session(library(), _context);
  session.lock(check(request, session.catalogue()));
  const FoundDocument found = check(request, session.catalogue());
  const auto document = session.open(found);
  _context.log.beginOperation();
  bool finalized = false;
  platform::runOnWorker([&] {
    finalized = document->finalizeWithProgressionBlock([&](double percentage) {
      _context.progress.report("Finalizing", percentage);
      return !Interrupt::isRequested();
    });
  });
  if (!finalized && Interrupt::isRequested()) throw Interrupt::failure("The document is not finalized");
  if (!finalized)
    throw explain("The document " + inQuotes(found.document->title, found.document->uuid) + " cannot be finalized",
                  _context.log, document->path(), document->path());
  _context.output.object({{"uuid", document->uuid()},
                          {"title", document->title().value_or("")},
                          {"type", document->type().value_or("")},
                          {"path", document->path().native()}},
                         "");
}

void PreviewDelegate::perform(const FinalizeRequest& request) {
  const Catalogue catalogue = readCatalogue(library());
  const DocumentEntry& entry = *check(request, catalogue).document;
  plan({{"action", "finalize"}, {"uuid", entry.uuid}, {"title", entry.title}, {"path", entry.path.native()}},
       "Would finalize the document " + inQuotes(entry.title, entry.uuid));
}

}  // namespace quilt::cli
