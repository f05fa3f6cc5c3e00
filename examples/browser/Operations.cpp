// SPDX-License-Identifier: Apache-2.0
#include "examples/browser/Operations.h"

#include <QCoreApplication>
#include <algorithm>

#include "examples/browser/LogLines.h"
#include "examples/browser/Text.h"
#include "quilt/collections/LibraryLock.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/themes/QuiltThemesController.h"

namespace browser {

using quilt::Path;
using quilt::ProgressionBlock;
using quilt::QuiltCollection;
using quilt::QuiltDocument;
using quilt::QuiltMedia;
using quilt::QuiltMediaSource;
using quilt::platform::services;

namespace {

QString tr(const char* text) { return QCoreApplication::translate("Operations", text); }
QString nameOf(const Path& file) { return toQt(file.filename()); }
/// The library's errors are sentences without a full stop.
QString sentence(const QString& text) { return text.endsWith('.') ? text : text + "."; }
QString nameOf(const QuiltDocument& document) {
  return document.title() ? toQt(document.title()) : tr("Untitled Episode");
}

Problem problem(const QString& what, const LogLines& log, const QString& advice) {
  const QString cause = toQt(log.cause());
  return {cause.isEmpty() ? what + "." : what + ": " + sentence(cause), advice};
}

/// What somebody else has locked.
Problem inUse(const QString& what, const quilt::platform::Error& refusal) {
  return {what + ": " + sentence(toQt(refusal.text)), tr("Wait until the other program has ended, and try again.")};
}

enum class Kind { Document, Item, Neither };

// Some files make a document by themselves; all that Quilt can show may be items of one.
Kind kindOf(const Path& file) {
  if (QuiltDocument::canImportFromPath(file)) return Kind::Document;
  const auto type = quilt::platform::FDYTypePreferredIdentifier(file);
  return QuiltMediaSource::contentCategoryForContentType(type) ? Kind::Item : Kind::Neither;
}

std::optional<Problem> whyNotUsable(const Path& file) {
  const auto attributes = services().files->attributesOfItemAtPath(file);
  if (!attributes)
    return Problem{tr("“%1” cannot be read: %2").arg(nameOf(file), sentence(toQt(attributes.error().text))),
                   tr("Check that the file is still there and that you may read it.")};
  if (attributes->kind == quilt::platform::FileKind::Folder)
    return Problem{tr("“%1” is a folder.").arg(nameOf(file)), tr("Drop the files that it holds instead.")};
  if (kindOf(file) == Kind::Neither)
    return Problem{tr("“%1” is of a kind that cannot be shown.").arg(nameOf(file)),
                   tr("Use a movie, sound, picture, PDF, EPUB or office document.")};
  return std::nullopt;
}

/// One step's 0 to 100 as its part of `steps`.
ProgressionBlock step(const ProgressionBlock& block, std::size_t index, std::size_t steps) {
  return [&block, index, steps](double percentage) {
    return quilt::platform::report(block, (static_cast<double>(index) * 100 + percentage) / static_cast<double>(steps));
  };
}

void takePoster(QuiltDocument& document) {
  const auto item = document.mediaAtIndex(0);
  const auto url = item ? item->previewItemURL() : std::nullopt;
  if (const auto picture = url ? quilt::platform::FDYThumbnailImageForURL(*url) : nullptr)
    document.updatePosterImage(picture);
}

bool addFile(QuiltDocument& document, const Path& file, const ProgressionBlock& block) {
  const auto source = QuiltMediaSource::initWithPath(file);
  if (!source) return false;
  const auto item = QuiltMedia::init();
  item->setTitle(file.stem().native());
  item->addSource(source);
  document.addMedia(item);
  // Flattening copies the file into the package.
  if (document.flattenWithProgressionBlock(block)) return true;
  document.removeMedia(item);
  return false;
}

}  // namespace

bool moveItems(QuiltDocument& document, const std::vector<std::string>& uuids, std::size_t gap) {
  quilt::platform::IndexSet indexes;
  const auto items = document.media();
  for (const std::string& uuid : uuids) {
    const auto item =
        std::find_if(items.begin(), items.end(), [&uuid](const auto& one) { return one->uuid() == uuid; });
    if (item == items.end()) return false;
    indexes.insert(static_cast<std::size_t>(item - items.begin()));
  }
  document.moveMediaAtIndexes(indexes, std::min(gap, items.size()));
  return true;
}

Problems moveDocuments(const quilt::QuiltCollectionsController& library, const std::vector<std::string>& uuids,
                       const std::shared_ptr<QuiltCollection>& to) {
  Problems problems;
  for (const std::string& uuid : uuids) {
    for (const auto& from : library.collections()) {
      const auto document = from->documentWithUUID(uuid);
      if (!document || from == to) continue;
      const QString what = tr("“%1” was not moved").arg(nameOf(*document));
      if (document->isProcessing()) {
        problems.push_back({what + tr(": it is being worked on."), tr("Move it when that has ended.")});
        continue;
      }
      const Path package = document->path();
      const Path target = to->path() / package.filename();
      const auto lock = quilt::LibraryLock::ofDocument(package);
      const auto targetLock = quilt::LibraryLock::ofDocument(target);
      if (!lock || !targetLock) {
        problems.push_back(inUse(what, (lock ? targetLock : lock).error()));
        continue;
      }
      if (const auto moved = services().files->moveItem(package, target); !moved) {
        problems.push_back(
            {what + ": " + sentence(toQt(moved.error().text)), tr("Check the disk that the library is on.")});
        continue;
      }
      // Opened anew: what the document knows of its files are their places in the package that was.
      const LogLines log;
      const auto opened = QuiltDocument::initWithPath(target);
      if (!opened) {
        (void)services().files->moveItem(target, package);
        problems.push_back(problem(what, log, tr("It stays where it was.")));
        continue;
      }
      from->removeDocument(document, /*andDelete=*/false);
      to->addDocument(opened);
    }
  }
  return problems;
}

Problems importFiles(const std::shared_ptr<QuiltCollection>& collection, const std::vector<Path>& files,
                     const ProgressionBlock& block) {
  Problems problems;
  std::vector<Path> items;
  std::size_t done = 0;
  for (const Path& file : files) {
    const ProgressionBlock part = step(block, done++, files.size());
    if (!part(0)) return problems;
    if (auto unusable = whyNotUsable(file)) {
      problems.push_back(*std::move(unusable));
      continue;
    }
    if (kindOf(file) == Kind::Item) {
      items.push_back(file);
      continue;
    }
    const LogLines log;
    const std::string uuid = quilt::platform::generateUUID();
    const auto lock = quilt::LibraryLock::ofDocument(
        collection->path() / quilt::platform::withExtension(uuid, quilt::kQuiltDocumentExtension));
    if (!lock) {
      problems.push_back(inUse(tr("“%1” was not imported").arg(nameOf(file)), lock.error()));
      continue;
    }
    const auto document = collection->importDocumentFromPath(file, uuid, part);
    if (!part(100)) return problems;
    if (!document) {
      problems.push_back(problem(tr("“%1” was not imported").arg(nameOf(file)), log,
                                 tr("Try to open it in a player; if it does not play there, it is damaged.")));
      continue;
    }
    // Without a title of its own the document has been saved under a fall-back.
    const auto facts = services().inspector->inspect(file);
    if (!facts || facts->metadataTitle.value_or("").empty()) document->setTitle(file.stem().native());
    takePoster(*document);
  }
  if (items.empty()) return problems;

  const auto document = collection->newDocumentWithType(quilt::kQuiltDocumentTypeInteractive);
  if (!document) {
    problems.push_back({tr("No document could be made in “%1”.").arg(toQt(collection->title())),
                        tr("Check that the disk is not full and that you may write to the library folder.")});
    return problems;
  }
  document->setTitle(items.size() == 1 ? items.front().stem().native() : tr("Pictures").toStdString());
  if (!document->theme()) document->setTheme(quilt::QuiltThemesController::defaultController()->defaultTheme());
  for (auto& failed : addFiles(document, items, block)) problems.push_back(std::move(failed));
  if (document->mediaCount() == 0) {
    collection->removeDocument(document, /*andDelete=*/true);
  } else {
    takePoster(*document);
  }
  return problems;
}

Problems addFiles(const std::shared_ptr<QuiltDocument>& document, const std::vector<Path>& files,
                  const ProgressionBlock& block) {
  const auto lock = quilt::LibraryLock::ofDocument(document->path());
  if (!lock) return {inUse(tr("Nothing was added to “%1”").arg(nameOf(*document)), lock.error())};
  Problems problems;
  std::size_t done = 0;
  for (const Path& file : files) {
    const ProgressionBlock part = step(block, done++, files.size());
    if (!part(0)) return problems;
    if (auto unusable = whyNotUsable(file)) {
      problems.push_back(*std::move(unusable));
      continue;
    }
    const LogLines log;
    const bool added = addFile(*document, file, part);
    if (!part(100)) return problems;
    if (!added)
      problems.push_back(problem(tr("“%1” was not added").arg(nameOf(file)), log,
                                 tr("Try to open it in another program; if that fails too, it is damaged.")));
  }
  return problems;
}

Exported exportDocument(const std::shared_ptr<QuiltDocument>& document, const Path& folder, const std::string& format,
                        const ProgressionBlock& block) {
  const auto lock = quilt::LibraryLock::ofDocument(document->path());
  if (!lock) return {{}, {inUse(tr("“%1” was not exported").arg(nameOf(*document)), lock.error())}};
  const LogLines log;
  bool isCancelled = false;
  const auto untilCancelled = [&](double percentage) {
    isCancelled = !quilt::platform::report(block, percentage) || isCancelled;
    return !isCancelled;
  };
  const Path path = document->exportToPath(folder, /*zipped=*/false, {format}, untilCancelled);
  if (!path.empty() || isCancelled) return {path, {}};
  return {{},
          {problem(tr("“%1” was not exported to “%2”").arg(nameOf(*document), toQt(folder)), log,
                   tr("Check that the folder can be written to and that the disk has room."))}};
}

}  // namespace browser
