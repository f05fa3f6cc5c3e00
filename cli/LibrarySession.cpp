// SPDX-License-Identifier: Apache-2.0
#include "cli/LibrarySession.h"

#include <unistd.h>

#include "cli/Failure.h"
#include "cli/Text.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::Result;
using platform::services;

constexpr const char* kLockFilename = ".quilt-lock";

std::string thisProcess() {
  std::string host(256, '\0');
  if (gethostname(host.data(), host.size()) != 0) host = "unknown";
  host.resize(std::min(host.find('\0'), host.size()));
  return "process " + std::to_string(getpid()) + " on " + host;
}

bool makeLibrary(const Path& library) {
  if (services().files->fileExistsAtPath(library)) return false;
  const Result<void> made = services().files->createDirectoryAtPath(library);
  if (!made) throw Failure("Cannot make the library " + inQuotes(library.native()), made.error());
  return true;
}

std::unique_ptr<platform::FileLock> lock(const Path& library) {
  const Path file = library / kLockFilename;
  Result<std::unique_ptr<platform::FileLock>> held = services().files->lockFile(file, thisProcess());
  if (!held) throw Failure("Cannot write to the library " + inQuotes(library.native()), held.error());
  // A killed writer's half-made items; what cannot be deleted now can be next time.
  if ((*held)->wasAbandoned()) (void)services().files->removeTemporariesIn(library);
  return *std::move(held);
}

}  // namespace

LibrarySession::LibrarySession(const Path& library)
    : _madeLibrary(makeLibrary(library)),
      _lock(lock(library)),
      _catalogue(readCatalogue(library)),
      _controller(QuiltCollectionsController::defaultController()) {
  _controller->setLibraryPath(library);
}

LibrarySession::~LibrarySession() {
  if (!_madeLibrary || _controller->collectionsCount() > 0) return;
  // The lock file goes with the folder, while the lock is held.
  (void)services().files->removeItem(_catalogue.library, _catalogue.library.parent_path());
}

std::shared_ptr<QuiltCollection> LibrarySession::open(const CollectionEntry& entry) {
  const std::string name = "The collection " + inQuotes(entry.title, entry.uuid);
  if (entry.damage) throw Failure(name + " cannot be opened", *entry.damage);
  for (const auto& opened : _controller->collections())
    if (opened->path() == entry.path) return opened;
  const std::shared_ptr<QuiltCollection> collection = QuiltCollection::initWithPath(entry.path);
  if (!collection) throw Failure(ExitCode::Invalid, name + " cannot be opened; --verbose tells more", entry.path);
  _controller->addCollection(collection);
  return collection;
}

std::shared_ptr<QuiltDocument> LibrarySession::open(const FoundDocument& found) {
  const DocumentEntry& entry = *found.document;
  const std::string name = "The document " + inQuotes(entry.title, entry.uuid);
  if (entry.damage) throw Failure(name + " cannot be opened", *entry.damage);
  for (const auto& document : open(*found.collection)->documents())
    if (document->path() == entry.path) return document;
  throw Failure(ExitCode::Invalid, name + " cannot be opened; --verbose tells more", entry.path);
}

std::shared_ptr<QuiltCollection> LibrarySession::makeCollection(const std::string& title) {
  const std::shared_ptr<QuiltCollection> collection = _controller->newCollectionWithUUID(std::nullopt, title);
  if (!collection)
    throw Failure(ExitCode::InputOutput,
                  "The collection " + inQuotes(title) + " cannot be made in " + inQuotes(_catalogue.library.native()),
                  _catalogue.library);
  collection->setTitle(title);  // saves
  if (const Result<platform::Dictionary> written = readCollectionRecord(collection->path());
      !written || written->string("Title") != title) {
    removeMadeCollection(collection);
    throw Failure(ExitCode::InputOutput,
                  "The collection " + inQuotes(title) + " cannot be saved in " + inQuotes(_catalogue.library.native()),
                  _catalogue.library);
  }
  return collection;
}

void LibrarySession::removeMadeCollection(const std::shared_ptr<QuiltCollection>& collection) {
  _controller->removeCollection(collection, true);
}

const CollectionEntry* collectionFor(const Catalogue& catalogue, const std::optional<std::string>& name) {
  if (name) return findCollection(catalogue, *name).collection;
  for (const CollectionEntry& collection : catalogue.collections)
    if (collection.title == kDefaultCollectionTitle && !collection.damage) return &collection;
  return nullptr;
}

}  // namespace quilt::cli
