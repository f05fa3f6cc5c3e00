// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <set>

#include "cli/ActingDelegate.h"
#include "cli/Exporting.h"
#include "cli/Lookup.h"
#include "quilt/collections/LibraryLock.h"
#include "quilt/collections/QuiltCollectionsController.h"

namespace quilt::cli {

/// The title of the collection that takes what is given none.
inline constexpr const char* kDefaultCollectionTitle = "Imports";

/// A writer's work in a library: what it finds, what it holds of it so that nobody else changes it meanwhile, and the
/// model's objects, opened one by one. Holds its locks until it ends. A lock that another process has is waited for as
/// the user asked, and then a Failure (Locked, with the holder); what a command holds for a moment only is waited for
/// in any case.
class LibrarySession {
 public:
  /// Reads the library. It need not be there.
  LibrarySession(const Path& library, const Context& context);
  LibrarySession(const LibrarySession&) = delete;
  LibrarySession& operator=(const LibrarySession&) = delete;
  /// Removes a collection that took no document, and the library, when this session made them and they are empty.
  ~LibrarySession();

  /// The library as it was read; what was locked, as it was then.
  [[nodiscard]] const Catalogue& catalogue() const { return _catalogue; }
  [[nodiscard]] QuiltCollectionsController& controller() { return *_controller; }

  /// @{
  /// Locks what was found in the catalogue, and reads that part of the catalogue anew: what was found in it is to be
  /// found again. A collection is locked with its record, or with all its documents. Throws a Failure: Locked, or
  /// NotFound when it has gone.
  void lock(const FoundDocument& found);
  void lock(const FoundCollection& found);
  void lockWhole(const FoundCollection& found);
  /// @}
  /// Locks a collection's record and its list, for the moment in which a document comes or goes.
  [[nodiscard]] LibraryLock lockForAMoment(const Path& collection) const;
  /// Locks a document that is about to be made: its collection cannot be removed meanwhile.
  [[nodiscard]] LibraryLock lockNew(const Path& package) const;
  /// The same while its collection is locked.
  [[nodiscard]] LibraryLock lockNew(const Path& package, const LibraryLock& moment) const;

  /// @{
  /// Opens a collection without its documents, and one document in its collection. Nothing else is opened, and nothing
  /// is cleaned up. Throws a Failure when it is damaged, or when the document is not locked.
  std::shared_ptr<QuiltCollection> open(const CollectionEntry& entry);
  std::shared_ptr<QuiltDocument> open(const FoundDocument& found);
  /// @}

  /// Makes and saves an empty collection, and the library.
  std::shared_ptr<QuiltCollection> makeCollection(const std::string& title);
  /// The collection for a new document: the one that a request names, else the default one; or the oldest of a title.
  /// When there is none of the title it is made, and goes with the session unless it holds something then.
  std::shared_ptr<QuiltCollection> collectionForNew(const std::optional<std::string>& name);
  std::shared_ptr<QuiltCollection> collectionTitled(const std::string& title);
  /// Whether collectionForNew or collectionTitled has made it.
  [[nodiscard]] bool hasMadeCollection() const { return _made != nullptr; }

 private:
  [[nodiscard]] LockWait wait() const;
  [[nodiscard]] LockWait waitForAMoment() const;
  [[nodiscard]] LibraryLock taken(platform::Result<LibraryLock> lock, const std::string& what) const;
  void refresh(const CollectionEntry& entry);
  void makeLibrary();
  std::shared_ptr<QuiltCollection> makeLocked(const std::string& title);
  void removeIfEmpty(const std::shared_ptr<QuiltCollection>& collection) const;

  const Context _context;
  std::optional<Destination> _library;  // made for the first collection
  Catalogue _catalogue;
  std::shared_ptr<QuiltCollectionsController> _controller;
  std::shared_ptr<QuiltCollection> _made;
  std::vector<LibraryLock> _locks;
  std::set<Path> _locked;  // the documents
};

/// The collection that a request names, or the default one: the oldest of its title. Null when the default one is not
/// there yet.
const CollectionEntry* collectionFor(const Catalogue& catalogue, const std::optional<std::string>& name);

}  // namespace quilt::cli
