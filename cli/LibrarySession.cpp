// SPDX-License-Identifier: Apache-2.0
#include "cli/LibrarySession.h"

#include <algorithm>

#include "cli/Failure.h"
#include "cli/Interrupt.h"
#include "cli/Text.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

using platform::ErrorKind;
using platform::Result;
using platform::services;

/// How long what commands hold for a moment only is waited for, whatever the user says.
constexpr std::chrono::milliseconds kMoment{5000};

std::string nameOf(const CollectionEntry& entry) { return "the collection " + inQuotes(entry.title, entry.uuid); }
std::string nameOf(const DocumentEntry& entry) { return "the document " + inQuotes(entry.title, entry.uuid); }

std::string capitalized(std::string text) {
  if (!text.empty() && text.front() == 't') text.front() = 'T';
  return text;
}

void checkThere(const Path& path, const std::string& name) {
  if (!services().files->fileExistsAtPath(path))
    throw Failure(ExitCode::NotFound, capitalized(name) + " has gone meanwhile", path);
}

}  // namespace

LibrarySession::LibrarySession(const Path& library, const Context& context)
    : _context(context),
      _catalogue(readCatalogue(library)),
      _controller(QuiltCollectionsController::defaultController()) {
  _controller->setLibraryPath(library);
}

LibrarySession::~LibrarySession() {
  _locks.clear();
  if (_made) removeIfEmpty(_made);
}

// Locks

LockWait LibrarySession::wait() const {
  const auto told = std::make_shared<bool>(false);
  return {_context.settings.wait, [this, told](const platform::Error& refusal) {
            if (!*told) _context.messages.note("Waiting: " + escaped(refusal.text));
            *told = true;
            return !Interrupt::isRequested();
          }};
}

LockWait LibrarySession::waitForAMoment() const {
  LockWait moment = wait();
  if (moment.limit >= kMoment) return moment;
  return {kMoment, [](const platform::Error&) { return !Interrupt::isRequested(); }};
}

LibraryLock LibrarySession::taken(Result<LibraryLock> lock, const std::string& what) const {
  if (lock) return *std::move(lock);
  platform::Error error = lock.error();
  if (error.kind == ErrorKind::Cancelled) throw Interrupt::failure("Nothing was changed");
  if (error.kind == ErrorKind::NotFound) throw Failure(ExitCode::NotFound, capitalized(what) + " has gone", error.file);
  // It is the disk that cannot, and not the library that is damaged.
  if (error.kind == ErrorKind::Unsupported) error.kind = ErrorKind::InputOutput;
  const bool mayWait = error.kind == ErrorKind::Locked && _context.settings.wait == std::chrono::milliseconds(0);
  if (mayWait) error.text += "; --wait SECONDS waits for it";
  throw Failure("Cannot write to " + what, error);
}

void LibrarySession::lock(const FoundDocument& found) {
  const Path path = found.document->path;
  _locks.push_back(taken(LibraryLock::ofDocument(path, wait()), nameOf(*found.document)));
  checkThere(path, nameOf(*found.document));
  for (CollectionEntry& collection : _catalogue.collections)
    for (DocumentEntry& document : collection.documents)
      if (document.path == path) document = readDocumentEntry(path);
  _locked.insert(path);
}

void LibrarySession::lock(const FoundCollection& found) {
  _locks.push_back(
      taken(LibraryLock::ofCollection(found.collection->path, waitForAMoment()), nameOf(*found.collection)));
  refresh(*found.collection);
}

void LibrarySession::lockWhole(const FoundCollection& found) {
  _locks.push_back(taken(LibraryLock::ofWholeCollection(found.collection->path, wait()), nameOf(*found.collection)));
  refresh(*found.collection);
}

void LibrarySession::refresh(const CollectionEntry& entry) {
  const Path path = entry.path;
  checkThere(path, nameOf(entry));
  for (CollectionEntry& collection : _catalogue.collections)
    if (collection.path == path) collection = readCollectionEntry(path);
}

LibraryLock LibrarySession::lockForAMoment(const Path& collection) const {
  return taken(LibraryLock::ofCollection(collection, waitForAMoment()),
               "the collection " + inQuotes(collection.native()));
}

LibraryLock LibrarySession::lockNew(const Path& package) const {
  return lockNew(package, lockForAMoment(package.parent_path()));
}

LibraryLock LibrarySession::lockNew(const Path& package, const LibraryLock& /*moment*/) const {
  return taken(LibraryLock::ofDocument(package, waitForAMoment()), "the document " + inQuotes(package.native()));
}

// Objects of the model

std::shared_ptr<QuiltCollection> LibrarySession::open(const CollectionEntry& entry) {
  const std::string name = capitalized(nameOf(entry));
  if (entry.damage) throw Failure(name + " cannot be opened", *entry.damage);
  for (const auto& opened : _controller->collections())
    if (opened->path() == entry.path) return opened;
  const std::shared_ptr<QuiltCollection> collection = QuiltCollection::initWithPathAlone(entry.path);
  if (!collection) throw Failure(ExitCode::Invalid, name + " cannot be opened; --verbose tells more", entry.path);
  _controller->addCollection(collection);
  return collection;
}

std::shared_ptr<QuiltDocument> LibrarySession::open(const FoundDocument& found) {
  const DocumentEntry& entry = *found.document;
  const std::string name = capitalized(nameOf(entry));
  if (!_locked.contains(entry.path))
    throw Failure(ExitCode::Locked, name + " has changed meanwhile; try again", entry.path);
  if (entry.damage) throw Failure(name + " cannot be opened", *entry.damage);
  if (auto document = open(*found.collection)->openDocument(entry.path)) return document;
  throw Failure(ExitCode::Invalid, name + " cannot be opened; --verbose tells more", entry.path);
}

// Collections

void LibrarySession::makeLibrary() {
  if (_library) return;
  try {
    _library.emplace(_catalogue.library / kCollectionsFolder);
  } catch (const Failure& failure) {
    throw Failure(failure.code,
                  "Cannot make the library " + inQuotes(_catalogue.library.native()) + ": " + failure.message,
                  _catalogue.library);
  }
}

std::shared_ptr<QuiltCollection> LibrarySession::makeCollection(const std::string& title) {
  makeLibrary();
  const LibraryLock lock = taken(LibraryLock::ofCollections(_catalogue.library, waitForAMoment()),
                                 "the library " + inQuotes(_catalogue.library.native()));
  return makeLocked(title);
}

std::shared_ptr<QuiltCollection> LibrarySession::makeLocked(const std::string& title) {
  const std::shared_ptr<QuiltCollection> collection = _controller->newCollection();
  if (!collection)
    throw Failure(ExitCode::InputOutput,
                  "The collection " + inQuotes(title) + " cannot be made in " + inQuotes(_catalogue.library.native()),
                  _catalogue.library);
  collection->setTitle(title);  // saves
  if (const Result<platform::Dictionary> written = readCollectionRecord(collection->path());
      !written || written->string("Title") != title) {
    removeIfEmpty(collection);
    throw Failure(ExitCode::InputOutput,
                  "The collection " + inQuotes(title) + " cannot be saved in " + inQuotes(_catalogue.library.native()),
                  _catalogue.library);
  }
  return collection;
}

std::shared_ptr<QuiltCollection> LibrarySession::collectionForNew(const std::optional<std::string>& name) {
  if (name) return open(*findCollection(_catalogue, *name).collection);
  return collectionTitled(kDefaultCollectionTitle);
}

std::shared_ptr<QuiltCollection> LibrarySession::collectionTitled(const std::string& title) {
  const auto there = [&]() -> const CollectionEntry* {
    for (const CollectionEntry& entry : _catalogue.collections)
      if (entry.title == title && !entry.damage) return &entry;
    return nullptr;
  };
  if (const CollectionEntry* entry = there()) return open(*entry);
  makeLibrary();
  const LibraryLock lock = taken(LibraryLock::ofCollections(_catalogue.library, waitForAMoment()),
                                 "the library " + inQuotes(_catalogue.library.native()));
  _catalogue = readCatalogue(_catalogue.library);  // somebody may have made it meanwhile
  if (const CollectionEntry* entry = there()) return open(*entry);
  _made = makeLocked(title);
  return _made;
}

// Only what is empty goes: another process may have put something there meanwhile.
void LibrarySession::removeIfEmpty(const std::shared_ptr<QuiltCollection>& collection) const {
  const Path folder = collection->path();
  {
    const Result<LibraryLock> lock = LibraryLock::ofWholeCollection(folder, waitForAMoment());
    const auto names = services().files->contentsOfDirectoryAtPath(folder);
    if (!lock || !names) return;
    const auto isOwn = [](const std::string& name) { return name == "collection.plist" || name == ".quilt-lock"; };
    if (!std::all_of(names->begin(), names->end(), isOwn)) return;
    if (!services().files->removeItem(collection->_collectionFilepath(), folder)) return;
  }
  std::error_code notEmpty;
  if (std::filesystem::remove(folder, notEmpty)) {
    _controller->removeCollection(collection, false);
  } else {
    collection->update();
  }
}

const CollectionEntry* collectionFor(const Catalogue& catalogue, const std::optional<std::string>& name) {
  if (name) return findCollection(catalogue, *name).collection;
  for (const CollectionEntry& collection : catalogue.collections)
    if (collection.title == kDefaultCollectionTitle && !collection.damage) return &collection;
  return nullptr;
}

}  // namespace quilt::cli
