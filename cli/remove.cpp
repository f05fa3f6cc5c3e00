// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <iostream>

#include "cli/ActingDelegate.h"
#include "cli/EntryJson.h"
#include "cli/Interrupt.h"
#include "cli/LibrarySession.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::services;

/// What to remove: items of a document, or one document or collection.
struct RemovalTarget {
  Found found;
  std::vector<ItemEntry> items;  ///< when not empty, of the document that was found
};

RemovalTarget findTarget(const Catalogue& catalogue, const RemoveRequest& request) {
  if (!request.from) return {find(catalogue, request.objects.front(), {.collections = true, .documents = true}), {}};
  RemovalTarget target{findDocument(catalogue, *request.from), {}};
  const DocumentEntry& document = *std::get<FoundDocument>(target.found).document;
  for (const std::string& object : request.objects) {
    const ItemEntry& item = findItem(document, object);
    const bool isNamedTwice = std::any_of(target.items.begin(), target.items.end(),
                                          [&](const ItemEntry& other) { return other.uuid == item.uuid; });
    if (!isNamedTwice) target.items.push_back(item);
  }
  return target;
}

std::string describe(const RemovalTarget& target) {
  if (const auto* found = std::get_if<FoundCollection>(&target.found)) {
    const std::size_t count = found->collection->documents.size();
    return fmt::format("the collection {} with {} document{}",
                       inQuotes(found->collection->title, found->collection->uuid), count, count == 1 ? "" : "s");
  }
  const DocumentEntry& document = *std::get<FoundDocument>(target.found).document;
  const std::string name = "the document " + inQuotes(document.title, document.uuid);
  if (target.items.empty()) return name;
  if (target.items.size() > 1) return fmt::format("{} items of {}", target.items.size(), name);
  return "the item " + inQuotes(target.items.front().title, target.items.front().uuid) + " of " + name;
}

Json json(const RemovalTarget& target) {
  if (const auto* found = std::get_if<FoundCollection>(&target.found)) return toJson(*found->collection);
  const DocumentEntry& document = *std::get<FoundDocument>(target.found).document;
  if (target.items.empty()) return toJson(document);
  Json list = Json::array();
  for (const ItemEntry& item : target.items)
    list.push_back({{"uuid", item.uuid},
                    {"title", item.title},
                    {"category", item.category},
                    {"path", (document.path / "media" / item.uuid).native()}});
  return list;
}

// Asks on a terminal; elsewhere --force has to be said.
void confirm(const RemoveRequest& request, const RemovalTarget& target, Messages& messages) {
  if (request.force) return;
  if (!isatty(STDIN_FILENO) || !isatty(STDERR_FILENO))
    throw Failure(ExitCode::Usage,
                  "Removing " + describe(target) + " needs --force when there is no terminal to ask on");
  messages.line("Remove " + describe(target) + ", and all its files? [y/N]");
  std::string answer;
  std::getline(std::cin, answer);
  if (Interrupt::isRequested()) throw Interrupt::failure("Nothing was removed");
  if (answer.empty() || std::tolower(static_cast<unsigned char>(answer.front())) != 'y')
    throw Failure(ExitCode::Failed, "Nothing was removed");
}

// What does not open in the model is deleted as files.
void deleteFolder(const Path& folder, const Path& within) {
  const auto removed = services().files->removeItem(folder, within);
  if (!removed) throw Failure("Cannot remove " + inQuotes(folder.native()), removed.error());
}

void checkGone(const Path& path, const LogCollector& log) {
  if (services().files->fileExistsAtPath(path))
    throw explain("Cannot remove " + inQuotes(path.native()), log, path, path);
}

void removeCollection(const CollectionEntry& entry, LibrarySession& session, const LogCollector& log) {
  if (entry.damage) return deleteFolder(entry.path, entry.path.parent_path());
  session.controller().removeCollection(session.open(entry), true);
  checkGone(entry.path, log);
}

void removeDocument(const FoundDocument& found, LibrarySession& session, const LogCollector& log) {
  const Path& path = found.document->path;
  const LibraryLock moment = session.lockForAMoment(found.collection->path);
  if (found.document->damage || found.collection->damage) return deleteFolder(path, found.collection->path);
  const auto document = session.open(found);
  document->collectionOwner()->removeDocument(document, true);
  checkGone(path, log);
}

std::string emptied(const QuiltDocument& document) {
  return "The document " + inQuotes(document.title().value_or(""), document.uuid()) +
         " holds no media now; a program that opens the whole library deletes an empty " +
         escaped(document.type().value_or("")) +
         " document that has neither description nor poster. \"quilt add\" gives it media again";
}

void removeItems(const RemovalTarget& target, LibrarySession& session, const LogCollector& log, Messages& messages) {
  const auto document = session.open(std::get<FoundDocument>(target.found));
  std::vector<Path> folders;
  const bool saved = changeAndSave(*document, [&] {
    for (const ItemEntry& item : target.items)
      if (const auto media = document->mediaWithUUID(item.uuid)) {
        folders.push_back(media->path());
        document->removeMedia(media);
      }
  });
  if (!saved) throw explain("Cannot remove " + describe(target), log, document->path(), document->path());
  for (const Path& folder : folders) checkGone(folder, log);
  if (document->isClassic() && document->mediaCount() == 0) messages.warning(emptied(*document));
}

}  // namespace

void ActingDelegate::perform(const RemoveRequest& request) {
  LibrarySession session(library(), _context);
  {
    const RemovalTarget before = findTarget(session.catalogue(), request);
    confirm(request, before, _context.messages);
    if (const auto* collection = std::get_if<FoundCollection>(&before.found)) {
      session.lockWhole(*collection);
    } else {
      session.lock(std::get<FoundDocument>(before.found));
    }
  }
  const RemovalTarget target = findTarget(session.catalogue(), request);
  if (const auto* collection = std::get_if<FoundCollection>(&target.found)) {
    removeCollection(*collection->collection, session, _context.log);
  } else if (target.items.empty()) {
    removeDocument(std::get<FoundDocument>(target.found), session, _context.log);
  } else {
    removeItems(target, session, _context.log, _context.messages);
  }
  _context.output.object(json(target), "");
}

void PreviewDelegate::perform(const RemoveRequest& request) {
  const Catalogue catalogue = readCatalogue(library());
  const RemovalTarget target = findTarget(catalogue, request);
  plan({{"action", "remove"}, {"objects", json(target)}}, "Would remove " + describe(target) + ", and all its files");
}

}  // namespace quilt::cli
