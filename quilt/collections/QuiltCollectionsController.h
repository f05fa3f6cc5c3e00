// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/collections/QuiltCollection.h"
#include "quilt/platform/base/Export.h"

namespace quilt {

/// The library: the collections found in one library folder. Any thread may call it; the list has a recursive lock.
class QUILT_EXPORT QuiltCollectionsController : public platform::Object {
 public:
  /// The shared controller, made on first use; lives until the process ends.
  static std::shared_ptr<QuiltCollectionsController> defaultController();
  /// One of the host's own, empty until it loads.
  static std::shared_ptr<QuiltCollectionsController> init();

  /// The library folder; empty before the first load.
  Path libraryPath() const { return _libraryPath.get(); }
  void setLibraryPath(Path path) { _libraryPath.set(std::move(path)); }
  /// @{
  /// Whether a load, or update(), runs. A host does not set it.
  bool loadingCollections() const { return _loadingCollections.get(); }
  void setLoadingCollections(bool loading) { _loadingCollections.set(loading); }
  bool isUpdating() const { return _isUpdating.get(); }
  void setIsUpdating(bool isUpdating) { _isUpdating.set(isUpdating); }
  /// @}

  /// Opens every collection of the library folder, reporting each (or null for one that does not open) with the
  /// percentage, and null with 100 at the end. False while another load runs, when the folder cannot be listed (later
  /// loads are then refused) and when the block answers false (what was opened stays).
  bool loadLibraryPath(const Path& path, const ObjectProgressionBlock<QuiltCollection>& withProgressionBlock);
  /// "Collections" in the library folder, there or not.
  Path _collectionsDirectory() const;
  /// Has every collection save itself. False while loading or updating, or without a library path.
  bool update();

  /// A copy of the list. Setting replaces the list and leaves folders and back-pointers as they are.
  std::vector<std::shared_ptr<QuiltCollection>> collections() const { return _collections.copy(); }
  void setCollections(std::vector<std::shared_ptr<QuiltCollection>> collections) {
    _collections.assign(std::move(collections));
  }
  /// @{
  /// How many there are; one of them, null when the index is not below the count.
  std::size_t collectionsCount() const { return _collections.count(); }
  std::shared_ptr<QuiltCollection> collectionAtIndex(std::size_t index) const { return _collections.at(index); }
  /// @}
  /// Null when none has it.
  std::shared_ptr<QuiltCollection> collectionWithUUID(const std::string& uuid) const;
  /// Calls the block on each with the lock held until it answers false.
  void performBlockOnCollections(const std::function<bool(const std::shared_ptr<QuiltCollection>&)>& block) const;
  /// Attaches and appends it. Its folder is not moved. Null is ignored.
  void addCollection(const std::shared_ptr<QuiltCollection>& collection);
  /// Takes the collection and its documents out; with `andDeleteDocuments` also deletes their folders.
  void removeCollection(const std::shared_ptr<QuiltCollection>& collection, bool andDeleteDocuments);
  /// @{
  /// Makes a collection in a folder named by the identity (a fresh one for none), with the title from its first save
  /// on. Null after a critical line.
  std::shared_ptr<QuiltCollection> newCollectionWithUUID(const Text& uuid);
  std::shared_ptr<QuiltCollection> newCollectionWithUUID(const Text& uuid, const Text& title);
  std::shared_ptr<QuiltCollection> newCollection() { return newCollectionWithUUID(std::nullopt); }
  /// @}

 protected:
  QuiltCollectionsController() = default;

 private:
  bool loadCollections(const Path& path, const ObjectProgressionBlock<QuiltCollection>& block, bool& mayLoadAgain);
  Path setAside(const Path& folder) const;
  void deleteFolder(const Path& folder, const Path& called) const;

  platform::Property<Path> _libraryPath{*this, "libraryPath"};
  platform::Property<bool> _loadingCollections{*this, "loadingCollections"};
  platform::Property<bool> _isUpdating{*this, "isUpdating"};
  platform::ChildList<QuiltCollection, QuiltCollectionsController> _collections{
      *this, "collections", &QuiltCollection::setCollectionControllerOwner};
};

}  // namespace quilt
