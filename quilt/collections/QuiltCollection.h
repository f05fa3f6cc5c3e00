// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <cstdint>
#include <mutex>
#include <set>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/Export.h"
#include "quilt/sources/ConflictChoice.h"

namespace quilt {

class QuiltCollectionsController;
class SavedRecord;

/// A folder of documents under one title and one set of default metadata. Owned by the controller, or free-standing.
/// Any thread may call it; the document list has a recursive lock.
///
/// A collection saves itself: setting title, description, author, copyright, keywords, category, advisoryLabel,
/// preferredTheme or lastPublishURL rewrites "collection.plist" at once, on the setting thread, unless it is loading.
class QUILT_EXPORT QuiltCollection : public platform::Object {
 public:
  // Construction
  /// A detached collection: fresh identity, made now, no folder.
  static std::shared_ptr<QuiltCollection> init();
  /// Opens the folder with its documents, or makes it when nothing is there. Null when that fails; the reason is
  /// logged. Broken documents are removed, as removeAllBrokenDocuments() does: this is for a host that loads a library,
  /// and holds its lock (LibraryLock) meanwhile.
  static std::shared_ptr<QuiltCollection> initWithPath(const Path& path);
  /// Opens the folder and leaves its documents alone: reads the collection file, and opens, makes and removes nothing
  /// else. openDocument() opens the documents that are wanted. Null when there is no collection file to read; the
  /// reason is logged.
  static std::shared_ptr<QuiltCollection> initWithPathAlone(const Path& path);

  // Properties
  /// Names the folder in its library.
  std::string uuid() const { return _uuid.get(); }
  void setUuid(std::string uuid) { _uuid.set(std::move(uuid)); }
  /// The folder; empty while detached. Setting moves nothing on disk.
  Path path() const { return _path.get(); }
  void setPath(Path path) { _path.set(std::move(path)); }
  /// When it was made; init() says now.
  std::optional<Date> creationDate() const { return _creationDate.get(); }
  void setCreationDate(std::optional<Date> date) { _creationDate.set(date); }
  /// The later of the stored stamp and the latest document's; changes with the document list.
  std::optional<Date> modifiedDate() const;
  /// Sets the stored stamp.
  void setModifiedDate(std::optional<Date> date) { _modifiedDate.set(date); }
  /// @{
  /// What people read, UTF-8; none: not given. Setting saves, as above.
  Text title() const { return _title.get(); }
  void setTitle(Text title) { _title.set(std::move(title)); }
  Text description() const { return _description.get(); }
  void setDescription(Text description) { _description.set(std::move(description)); }
  /// @}
  /// New documents take it.
  Text author() const { return _author.get(); }
  void setAuthor(Text author) { _author.set(std::move(author)); }
  /// @{
  /// More of the same, for the documents of the collection as a whole.
  Text copyright() const { return _copyright.get(); }
  void setCopyright(Text copyright) { _copyright.set(std::move(copyright)); }
  Text keywords() const { return _keywords.get(); }
  void setKeywords(Text keywords) { _keywords.set(std::move(keywords)); }
  Text category() const { return _category.get(); }
  void setCategory(Text category) { _category.set(std::move(category)); }
  Text advisoryLabel() const { return _advisoryLabel.get(); }
  void setAdvisoryLabel(Text advisoryLabel) { _advisoryLabel.set(std::move(advisoryLabel)); }
  /// @}
  /// New documents take it.
  std::shared_ptr<QuiltTheme> preferredTheme() const { return _preferredTheme.get(); }
  void setPreferredTheme(std::shared_ptr<QuiltTheme> theme) { _preferredTheme.set(std::move(theme)); }
  /// Where a host last published it; none: nowhere.
  Text lastPublishURL() const { return _lastPublishURL.get(); }
  void setLastPublishURL(Text url) { _lastPublishURL.set(std::move(url)); }
  /// The owner, which sets and clears it; null while detached. Never keeps it alive.
  std::shared_ptr<QuiltCollectionsController> collectionControllerOwner() const {
    return _collectionControllerOwner.get();
  }
  void setCollectionControllerOwner(const std::shared_ptr<QuiltCollectionsController>& owner) {
    _collectionControllerOwner.set(owner);
  }
  /// Whether the collection is being read; it does not save itself meanwhile. A host does not set it.
  bool isLoading() const { return _isLoading.get(); }
  void setIsLoading(bool isLoading) { _isLoading.set(isLoading); }

  // Poster image, kept in "poster.png" alone
  /// Null while detached or without a poster.
  std::shared_ptr<ImageWrapper> posterImage();
  /// Writes or, with null, deletes the file. While detached it only clears the cache.
  void setPosterImage(const std::shared_ptr<ImageWrapper>& image);
  /// The file, when it exists; else empty.
  Path posterImagePath() const;

  // Loading and saving
  /// @{
  /// "collection.plist" and "poster.png" in the folder, there or not; empty while detached.
  Path _collectionFilepath() const;
  Path _posterImageFilepath() const;
  /// @}
  /// Reads the collection file. Never rewrites it.
  bool loadDictionary();
  /// Opens every document in the folder; what does not open is passed over.
  bool _loadDocuments();
  /// The record as it is written, with the entries that a newer version left in it.
  Dictionary dictionary() const;
  /// @{
  /// Stamps and saves; true without saving while loading. False after a critical line.
  ///
  /// A collection file that another hand has written since this collection last read or wrote it is not overwritten:
  /// what only one of the two changed is kept, the other's being taken over into this collection, with a warning; what
  /// both changed is decided by the choice, and refused with a critical line that names it when the choice, or an
  /// automatic save, is to refuse.
  bool update() { return update(ConflictChoice::Refuse); }
  bool update(ConflictChoice inConflict);
  /// @}
  /// Whether modifiedDate and creationDate are a second or more apart.
  bool hasBeenModified() const;
  /// Makes the collection count as never modified, as far as its documents do, and saves.
  void resetModifiedDate();
  /// Drops the caches of every document. Files stay.
  void invalidateCaches();
  /// {"documents"}.
  static std::set<std::string> keyPathsForValuesAffectingModifiedDate();

  // Documents
  /// A copy of the list. Setting replaces the list and leaves packages and back-pointers as they are.
  std::vector<std::shared_ptr<QuiltDocument>> documents() const { return _documents.copy(); }
  void setDocuments(std::vector<std::shared_ptr<QuiltDocument>> documents) { _documents.assign(std::move(documents)); }
  /// @{
  /// How many there are; one of them, null when the index is not below the count.
  std::size_t documentsCount() const { return _documents.count(); }
  std::shared_ptr<QuiltDocument> documentAtIndex(std::size_t index) const { return _documents.at(index); }
  /// @}
  /// Null when none has it.
  std::shared_ptr<QuiltDocument> documentWithUUID(const std::string& uuid) const;
  /// Calls the block on each with the lock held; stops at the first false and answers false.
  bool performBlockOnDocuments(const std::function<bool(const std::shared_ptr<QuiltDocument>&)>& block) const;
  /// At most `count`, newest first.
  std::vector<std::shared_ptr<QuiltDocument>> lastCreatedDocuments(std::size_t count) const;
  /// The document of that package in the folder: the one in the list, else opened now and added. Null when it is not
  /// there or does not open, the reason being logged. Makes and removes nothing.
  std::shared_ptr<QuiltDocument> openDocument(const Path& package);
  /// Attaches and appends it. Its package is not moved. Null is ignored.
  void addDocument(const std::shared_ptr<QuiltDocument>& document);
  /// Takes the document out of the list; with `andDelete` also deletes its package. A package that cannot be deleted,
  /// or that lies outside the collection's folder, stays, with a warning.
  void removeDocument(const std::shared_ptr<QuiltDocument>& document, bool andDelete);
  /// removeDocument() for each that is there now.
  void removeAllDocumentsAndDelete(bool andDelete);
  /// Takes out the classic documents that hold no media and deletes their packages, each with a warning that names it.
  /// One with files below "media", a poster or a description is damaged or unfinished, not empty: it stays, in the list
  /// and on disk, with a warning; and one whose record names media that did not load stays on disk.
  void removeAllBrokenDocuments();
  /// Makes and saves an empty document with the collection's author and theme. Null after a critical line.
  std::shared_ptr<QuiltDocument> newDocumentWithType(const Text& type);
  /// @{
  /// Makes a document of a file: inspects it, adds it as the one item, and copies it into the package, which is named
  /// by `withUUID` (a fresh one for none). A file of a type that cannot be imported gives an empty document. Null,
  /// after a critical line, on failure or when the block answers false; the package is then gone, unless it was there
  /// before. Reports 10 to 100, on the calling thread.
  std::shared_ptr<QuiltDocument> importDocumentFromPath(const Path& path, const Text& withUUID,
                                                        const ProgressionBlock& withProgressionBlock);
  std::shared_ptr<QuiltDocument> importDocumentFromPath(const Path& path, const ProgressionBlock& withProgressionBlock);
  /// @}

 protected:
  QuiltCollection();
  std::vector<std::string_view> keysDependingOn(std::string_view key) const override;

 private:
  void saveWhenChanged();
  void apply(const Dictionary& record);
  /// Changed when another hand was faster.
  platform::Result<void> write(const Dictionary& record, const Path& file);
  /// Takes over what another hand wrote into the collection file, so that `mine`, the record made anew, replaces it.
  /// False, after a critical line, when nothing may be written.
  bool takeOverChanges(const Dictionary& mine, ConflictChoice inConflict);
  /// A place in the folder; empty without one.
  Path inFolder(const std::string& name) const;
  /// Where the package of that identity belongs; empty without a folder or for an identity that is no plain name.
  Path packagePath(const std::string& uuid) const;
  void deletePackage(const Path& package) const;
  /// Writes the image and answers a copy of it to cache; null after a critical line.
  std::shared_ptr<ImageWrapper> savedPosterImage(const std::shared_ptr<ImageWrapper>& image) const;
  void deletePosterImage() const;

  platform::Property<std::string> _uuid{*this, "uuid"};
  platform::Property<Path> _path{*this, "path"};
  platform::Property<std::optional<Date>> _creationDate{*this, "creationDate"};
  platform::Property<std::optional<Date>> _modifiedDate{*this, "modifiedDate"};
  platform::Property<Text> _title{*this, "title"};
  platform::Property<Text> _description{*this, "description"};
  platform::Property<Text> _author{*this, "author"};
  platform::Property<Text> _copyright{*this, "copyright"};
  platform::Property<Text> _keywords{*this, "keywords"};
  platform::Property<Text> _category{*this, "category"};
  platform::Property<Text> _advisoryLabel{*this, "advisoryLabel"};
  std::mutex
      _posterMutex;  // held from the look at the file to the change of the cache; nothing else is locked under it
  std::shared_ptr<ImageWrapper> _posterImage;
  platform::Property<std::shared_ptr<QuiltTheme>> _preferredTheme{*this, "preferredTheme"};
  platform::ChildList<QuiltDocument, QuiltCollection> _documents{*this, "documents",
                                                                 &QuiltDocument::setCollectionOwner};
  platform::Property<Text> _lastPublishURL{*this, "lastPublishURL"};
  platform::WeakProperty<QuiltCollectionsController> _collectionControllerOwner{*this, "collectionControllerOwner"};
  platform::Property<bool> _isLoading{*this, "isLoading"};
  platform::Property<Dictionary> _unknownEntries{*this, "unknownEntries"};
  std::uint64_t _recordsBuilt = 0;  // guarded by the document list's lock
  std::mutex _saving;               // nothing else is locked under it
  std::uint64_t _newestSaved = 0;   // the turn of the record on disk; guarded by _saving
  const std::shared_ptr<SavedRecord> _saved;
  std::atomic<platform::ThreadIdentity> _takingOver{nullptr};  // while what another hand wrote is set
  std::vector<platform::Observation> _observations;            // last: ends before the properties do
};

}  // namespace quilt
