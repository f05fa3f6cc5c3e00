// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>

#include "cli/Lookup.h"
#include "quilt/collections/QuiltCollectionsController.h"
#include "quilt/platform/interfaces/FileManager.h"

namespace quilt::cli {

/// The title of the collection that takes what is given none.
inline constexpr const char* kDefaultCollectionTitle = "Imports";

/// A writer's hold on a library: the lock, the catalogue read under it, and the model's objects, opened as they are
/// needed. Makes the library when it is not there.
class LibrarySession {
 public:
  /// Throws a Failure: Locked, with the holder, when another process writes to the library.
  explicit LibrarySession(const Path& library);
  LibrarySession(const LibrarySession&) = delete;
  LibrarySession& operator=(const LibrarySession&) = delete;
  /// Removes the library again when this session made it and no collection came to be.
  ~LibrarySession();

  [[nodiscard]] const Catalogue& catalogue() const { return _catalogue; }
  [[nodiscard]] QuiltCollectionsController& controller() { return *_controller; }

  /// Opens a collection with its documents. Throws a Failure when it is damaged.
  std::shared_ptr<QuiltCollection> open(const CollectionEntry& entry);
  /// Opens a document in its collection. Throws a Failure when it is damaged.
  std::shared_ptr<QuiltDocument> open(const FoundDocument& found);

  /// Makes and saves an empty collection.
  std::shared_ptr<QuiltCollection> makeCollection(const std::string& title);
  /// Removes a collection that this session made.
  void removeMadeCollection(const std::shared_ptr<QuiltCollection>& collection);

 private:
  bool _madeLibrary;
  std::unique_ptr<platform::FileLock> _lock;
  Catalogue _catalogue;
  std::shared_ptr<QuiltCollectionsController> _controller;
};

/// The collection that a request names, or the default one: the oldest of its title. Null when the default one is not
/// there yet.
const CollectionEntry* collectionFor(const Catalogue& catalogue, const std::optional<std::string>& name);

}  // namespace quilt::cli
