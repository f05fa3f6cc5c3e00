// SPDX-License-Identifier: Apache-2.0
#include "quilt/collections/QuiltCollectionsController.h"

#include <algorithm>

#include "quilt/platform/base/CleanUp.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"

namespace quilt {

using platform::FDYLogger;
using platform::Result;
using platform::services;

std::shared_ptr<QuiltCollectionsController> QuiltCollectionsController::defaultController() {
  // Never destroyed: the host may use it while the process ends.
  static const auto& controller = *new std::shared_ptr<QuiltCollectionsController>(init());
  return controller;
}

std::shared_ptr<QuiltCollectionsController> QuiltCollectionsController::init() {
  struct Made final : QuiltCollectionsController {};
  return std::make_shared<Made>();
}

Path QuiltCollectionsController::_collectionsDirectory() const {
  const Path library = libraryPath();
  return library.empty() ? library : library / "Collections";
}

bool QuiltCollectionsController::loadLibraryPath(const Path& path,
                                                 const ObjectProgressionBlock<QuiltCollection>& withProgressionBlock) {
  // The exchange lets one of two threads pass; the look before it keeps a refused load from announcing anything.
  if (loadingCollections()) return false;
  bool isOurs = false;
  // A library that cannot be listed refuses every later load.
  bool mayLoadAgain = true;
  return platform::withCleanUp(
      [&] {
        {
          const platform::Uninterrupted whole;
          isOurs = !_loadingCollections.exchange(true);
        }
        return isOurs && loadCollections(path, withProgressionBlock, mayLoadAgain);
      },
      [&] {
        if (isOurs && mayLoadAgain) setLoadingCollections(false);
      });
}

bool QuiltCollectionsController::loadCollections(const Path& path, const ObjectProgressionBlock<QuiltCollection>& block,
                                                 bool& mayLoadAgain) {
  FDYLogger::logDebug("Loading collections at path \"%@\"...", path);
  setLibraryPath(path);
  _collections.assign({});

  platform::FileManager& files = *services().files;
  const Path directory = _collectionsDirectory();
  if (!files.fileExistsAtPath(directory))
    if (const Result<void> made = files.createDirectoryAtPath(directory); !made)
      FDYLogger::logCritical("Failed to create collections directory at path \"%@\": \"%@\"", directory, made.error());

  sweepLevel(directory);
  const Result<std::vector<std::string>> listing = files.contentsOfDirectoryAtPath(directory);
  if (!listing) {
    mayLoadAgain = false;
    FDYLogger::logCritical("Failed to load collections in directory \"%@\": \"%@\"", directory, listing.error());
    return false;
  }
  const std::vector<std::string> names = platform::finishedNames(*listing);
  const std::size_t total = names.size();
  std::size_t done = 0;
  for (const std::string& name : names) {
    const auto collection = QuiltCollection::initWithPath(directory / name);
    addCollection(collection);
    if (!platform::report(block, collection, platform::integerPercentage(++done, total))) {
      FDYLogger::logCritical("Loading collections at path \"%@\" has been cancelled", path);
      return false;
    }
  }
  platform::report(block, std::shared_ptr<QuiltCollection>(), 100);
  return true;
}

bool QuiltCollectionsController::update() {
  if (loadingCollections()) return false;
  const auto updateAll = [this] {
    const platform::Uninterrupted whole;
    if (libraryPath().empty()) {
      FDYLogger::logCritical("Failed to update collections because there is no library path available");
      return false;
    }
    return _collections.walk([](const std::shared_ptr<QuiltCollection>& collection) {
      collection->update();
      return true;
    });
  };
  return platform::whileSet(_isUpdating, updateAll).value_or(false);
}

std::shared_ptr<QuiltCollection> QuiltCollectionsController::collectionWithUUID(const std::string& uuid) const {
  return _collections.first(
      [&uuid](const std::shared_ptr<QuiltCollection>& collection) { return collection->uuid() == uuid; });
}

void QuiltCollectionsController::performBlockOnCollections(
    const std::function<bool(const std::shared_ptr<QuiltCollection>&)>& block) const {
  _collections.walk(block);
}

void QuiltCollectionsController::addCollection(const std::shared_ptr<QuiltCollection>& collection) {
  _collections.append(collection);
}

void QuiltCollectionsController::removeCollection(const std::shared_ptr<QuiltCollection>& collection,
                                                  bool andDeleteDocuments) {
  if (!collection) return;
  const platform::Uninterrupted whole;
  const platform::MonitorLock lock = _collections.lock();
  const Path folder = collection->path();
  // The folder goes out of sight in one step, so that no half of it is ever there; its documents go with it.
  const Path aside = andDeleteDocuments ? setAside(folder) : Path();
  collection->removeAllDocumentsAndDelete(andDeleteDocuments);
  if (andDeleteDocuments) deleteFolder(aside.empty() ? folder : aside, folder);
  _collections.remove(collection);
}

Path QuiltCollectionsController::setAside(const Path& folder) const {
  platform::FileManager& files = *services().files;
  sweepLevel(_collectionsDirectory());
  if (folder.empty() || !files.fileExistsAtPath(folder)) return {};
  auto aside = files.setAside(folder, _collectionsDirectory(), /*forGood=*/true);
  return aside ? *std::move(aside) : Path();
}

void QuiltCollectionsController::deleteFolder(const Path& folder, const Path& called) const {
  platform::FileManager& files = *services().files;
  if (folder.empty() || !files.fileExistsAtPath(folder)) return;
  if (const Result<void> removed = files.removeItem(folder, _collectionsDirectory()); !removed)
    FDYLogger::logWarning("Failed to remove collection at path \"%@\": \"%@\"", called, removed.error());
}

std::shared_ptr<QuiltCollection> QuiltCollectionsController::newCollectionWithUUID(const Text& uuid) {
  return newCollectionWithUUID(uuid, std::nullopt);
}

std::shared_ptr<QuiltCollection> QuiltCollectionsController::newCollectionWithUUID(const Text& uuid,
                                                                                   const Text& title) {
  const platform::Uninterrupted whole;
  const std::string name = uuid ? *uuid : platform::generateUUID();
  const Path directory = _collectionsDirectory();
  const Path folder = directory.empty() ? directory : directory / name;
  // Without a library, or with an identity that would lead out of it, there is no place to make the folder.
  const bool hasPlace = !folder.empty() && platform::isPlainComponent(name);
  const auto collection = hasPlace ? QuiltCollection::initWithPath(folder, title) : nullptr;
  if (!collection) {
    FDYLogger::logCritical("Failed to create a new empty collection at path \"%@\"", folder);
    return nullptr;
  }
  collection->setUuid(name);
  addCollection(collection);
  collection->setCreationDate(collection->modifiedDate());
  return collection;
}

}  // namespace quilt
