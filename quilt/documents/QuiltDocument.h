// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>

#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/base/ChildList.h"
#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/MainThread.h"
#include "quilt/platform/base/Property.h"
#include "quilt/sources/ConflictChoice.h"
#include "quilt/sources/ModelTypes.h"
#include "quilt/sources/Representations.h"
#include "quilt/themes/QuiltTheme.h"

namespace quilt {

class QuiltCollection;
class SavedRecord;
struct RecordMerge;

/// @{
/// Document types, compared by string equality: a package built from a theme; one movie; one sound; one PDF; one EPUB;
/// one file of another kind.
inline constexpr const char* kQuiltDocumentTypeInteractive = "Interactive";
inline constexpr const char* kQuiltDocumentTypeClassicMovie = "Movie";
inline constexpr const char* kQuiltDocumentTypeClassicAudio = "Audio";
inline constexpr const char* kQuiltDocumentTypeFilePDF = "PDF";
inline constexpr const char* kQuiltDocumentTypeFileEPUB = "EPUB";
inline constexpr const char* kQuiltDocumentTypeStaticFile = "Static";
/// @}

/// @{
/// The extension of a package's folder, without its dot, and the properties file in it.
inline constexpr const char* kQuiltDocumentExtension = "qpk";
inline constexpr const char* kQuiltDocumentPropertiesFilename = "properties.plist";
/// @}

/// One document: a package folder with a properties file, a media folder and what finalizing writes. Owned by its
/// collection, or free-standing. Any thread may call it; the media list has a recursive lock.
///
/// A document saves itself: setting title, description, author, keywords, category, advisoryLabel, jukeboxOrder, theme,
/// creationDate or lastPublishURL rewrites the properties file at once, on the setting thread, unless the document is
/// processing. While a long operation or a load runs, isProcessing is true and saving is refused.
class QUILT_EXPORT QuiltDocument : public platform::Object, public ImageBrowserItem, public platform::PasteboardItem {
 public:
  // Construction
  /// A free-standing document: a fresh identity and nothing else.
  static std::shared_ptr<QuiltDocument> init();
  /// Opens the package, or makes an empty one when nothing is there (its properties file comes with the first save).
  /// Null when it cannot be opened or made; the reason is logged, but for a wrong format version.
  static std::shared_ptr<QuiltDocument> initWithPath(const Path& path);
  /// The identity of a package, read without opening it; none when it cannot be read.
  static Text uuidForDocumentAtPath(const Path& path);

  // Which files may be imported as a new document
  /// @{
  /// Type identifiers: of PDF and EPUB files, of movies and audio, of all these.
  static const std::vector<std::string>& allSupportedStaticDocumentImportUTIs();
  static const std::vector<std::string>& allSupportedClassicImportUTIs();
  static const std::vector<std::string>& allSupportedImportUTIs();
  /// @}
  /// Whether the file's type is among allSupportedImportUTIs(). Reads its first bytes at most.
  static bool canImportFromPath(const Path& path);

  // Properties
  /// Names the package in its collection.
  std::string uuid() const { return _uuid.get(); }
  void setUuid(std::string uuid) { _uuid.set(std::move(uuid)); }
  /// The package folder; empty while the document has none. Setting moves nothing on disk.
  Path path() const { return _path.get(); }
  void setPath(Path path) { _path.set(std::move(path)); }
  /// path() as text, which is a tenth of the cost.
  std::string folder() const {
    return _path.with([](const Path& path) { return path.native(); });
  }
  /// The extension of the package's folder, as initWithPath() found it; none otherwise.
  Text uti() const { return _uti.get(); }
  void setUti(Text uti) { _uti.set(std::move(uti)); }
  /// @{
  /// What people and stores read, UTF-8; none: not given. Setting saves, as above.
  Text title() const { return _title.get(); }
  void setTitle(Text title) { _title.set(std::move(title)); }
  Text description() const { return _description.get(); }
  void setDescription(Text description) { _description.set(std::move(description)); }
  Text author() const { return _author.get(); }
  void setAuthor(Text author) { _author.set(std::move(author)); }
  Text keywords() const { return _keywords.get(); }
  void setKeywords(Text keywords) { _keywords.set(std::move(keywords)); }
  Text category() const { return _category.get(); }
  void setCategory(Text category) { _category.set(std::move(category)); }
  Text advisoryLabel() const { return _advisoryLabel.get(); }
  void setAdvisoryLabel(Text advisoryLabel) { _advisoryLabel.set(std::move(advisoryLabel)); }
  /// @}
  /// The place among its collection's documents in a store.
  std::int64_t jukeboxOrder() const { return _jukeboxOrder.get(); }
  void setJukeboxOrder(std::int64_t order) { _jukeboxOrder.set(order); }
  /// When it was made; none when no one said.
  std::optional<Date> creationDate() const { return _creationDate.get(); }
  void setCreationDate(std::optional<Date> date) { _creationDate.set(date); }
  /// The time of the last save.
  std::optional<Date> modifiedDate() const { return _modifiedDate.get(); }
  void setModifiedDate(std::optional<Date> date) { _modifiedDate.set(date); }
  /// Where a host last published it; none: nowhere.
  Text lastPublishURL() const { return _lastPublishURL.get(); }
  void setLastPublishURL(Text url) { _lastPublishURL.set(std::move(url)); }
  /// The theme that was chosen, null without one. Setting alone copies nothing: see applyTheme().
  std::shared_ptr<QuiltTheme> theme() const { return _theme.get(); }
  void setTheme(std::shared_ptr<QuiltTheme> theme) { _theme.set(std::move(theme)); }
  /// One of the document types; none for a document without one. Saved with the next save.
  Text type() const { return _type.get(); }
  void setType(Text type) { _type.set(std::move(type)); }
  /// Whether a load, a save or a long operation runs. A host does not set it.
  bool isProcessing() const { return _isProcessing.get(); }
  void setIsProcessing(bool isProcessing) { _isProcessing.set(isProcessing); }
  /// The owner, which sets and clears it; null while detached. Never keeps it alive.
  std::shared_ptr<QuiltCollection> collectionOwner() const { return _collectionOwner.get(); }
  void setCollectionOwner(const std::shared_ptr<QuiltCollection>& owner) { _collectionOwner.set(owner); }

  /// "Movie" or "Audio".
  bool isClassic() const;
  /// "PDF" or "EPUB"; "Static" is deliberately none.
  bool isStaticDocument() const;
  /// False for every document: compare the type to learn whether one is interactive.
  bool isInteractive() const { return false; }

  // Places in the package
  /// @{
  /// Where the document keeps its properties, its items, its poster, the data and the words for the theme, the artwork
  /// and metadata for stores, and the thumbnail. Empty without a path; what is there depends on what was done.
  Path propertiesPath() const;
  Path mediaFolderPath() const;
  Path posterImagePath() const;
  Path dataControllerPath() const;
  Path localizationControllerPath() const;
  Path jukeboxArtworkPath() const;
  Path jukeboxMetadataPath() const;
  Path glanceThumbnailPath() const;
  /// @}

  // Loading and saving
  /// loadDictionaryAtPath() with the package's own properties file.
  bool loadDictionary();
  /// Adds the file's media to those held. A file whose "Media" is no array is damaged and does not load.
  bool loadDictionaryAtPath(const Path& path);
  /// The properties record. Gives the document its fall-back title when it has none.
  Dictionary dictionary();
  /// @{
  /// Stamps modifiedDate and saves. False, after a critical line, while processing or when the file cannot be written.
  /// Waits for a save that another thread has begun.
  ///
  /// A record that another hand has written since this document last read or wrote it is not overwritten: what only one
  /// of the two changed is kept, the other's being taken over into this document, with a warning; what both changed is
  /// decided by the choice, and refused with a critical line that names it when the choice is to refuse. Fields are
  /// told apart by their keys, items by their UUIDs; an item that the other hand changed is a new object here. So it is
  /// with every save, automatic ones and those of long operations included, which refuse.
  bool update() { return update(ConflictChoice::Refuse); }
  bool update(ConflictChoice inConflict);
  /// @}
  /// The automatic save after a change: update() without its refusal, because a long operation may begin at any moment
  /// between the change and its save.
  void saveChange();
  /// Whether a change is not to be saved now: a load, a long operation or a save of this thread runs. A save of another
  /// thread does not count; update() waits for it.
  bool isBusy() const;
  /// Reads the package again when its file is newer than the document.
  void reload();
  /// Whether modifiedDate and creationDate are a second or more apart.
  bool hasBeenModified() const;
  /// Makes the document count as never modified, and saves unless it is processing.
  void resetModifiedDate();
  /// Drops the cached poster and every cache of the items. Files stay.
  void invalidateCaches();
  /// What the document's own observations call: saves when the key is one that saves and nothing else is under way.
  void observeValueForKeyPath(std::string_view keyPath, platform::Object& ofObject, platform::ChangePhase change,
                              void* context);

  // Media
  /// A copy of the list. Setting replaces the list and leaves files and back-pointers as they are.
  std::vector<std::shared_ptr<QuiltMedia>> media() const { return _media.copy(); }
  void setMedia(std::vector<std::shared_ptr<QuiltMedia>> media) { _media.assign(std::move(media)); }
  /// @{
  /// How many there are; one of them, null when the index is not below the count.
  std::size_t mediaCount() const { return _media.count(); }
  std::shared_ptr<QuiltMedia> mediaAtIndex(std::size_t index) const { return _media.at(index); }
  /// @}
  /// Null when none has it.
  std::shared_ptr<QuiltMedia> mediaWithUUID(const std::string& uuid) const;
  /// Calls the block on each with the lock held; stops at the first false and answers false.
  bool performBlockOnMedia(const std::function<bool(const std::shared_ptr<QuiltMedia>&)>& block) const;
  /// @{
  /// Attaches it and puts it at the end, or before the index; saves unless the document is processing. Null is ignored.
  /// An index beyond the count changes nothing and logs a critical line.
  void addMedia(const std::shared_ptr<QuiltMedia>& media);
  void addMedia(const std::shared_ptr<QuiltMedia>& media, std::size_t atIndex);
  /// @}
  /// Moves a group, in its order, to a position counted before the move, and saves likewise. An index outside the list
  /// changes nothing and logs a critical line.
  void moveMediaAtIndexes(const IndexSet& indexes, std::size_t toIndex);
  /// Deletes the item's folder and removes it from the list.
  void removeMedia(const std::shared_ptr<QuiltMedia>& media);
  /// removeMedia() for each that is there now.
  void removeAllMedia();
  /// Removes the items without sources.
  void removeAllEmptyMedia();
  /// Removes the items of which a source, or a montage's commentary, has lost its file.
  void removeAllBrokenMedia();
  /// Removes the extras that have lost their file, of every item.
  void removeAllBrokenMediaExtra();
  /// Seconds, over all items.
  double duration() const;

  // Poster image
  /// Cached, else "poster.png", else the built-in placeholder. Null, after a warning, when "poster.png" is no image.
  std::shared_ptr<ImageWrapper> posterImage();
  void setPosterImage(std::shared_ptr<ImageWrapper> image) { _posterImage.set(std::move(image)); }
  /// Rises whenever the poster changes, so that a host shows it anew; 1 for a new document.
  std::uint64_t posterImageVersion() const { return _posterImageVersion.get(); }
  void setPosterImageVersion(std::uint64_t version) { _posterImageVersion.set(version); }
  /// Keeps the image in standard definition and writes it to "poster.png"; null only caches the placeholder.
  void updatePosterImage(const std::shared_ptr<ImageWrapper>& image);
  /// Writes the poster as the quick-preview thumbnail.
  bool glanceUpdate();

  // Pasteboard: the UUID alone, under the drag type
  /// The one type under which a document travels.
  static std::string dragTypeIdentifier() { return kQuiltDocumentDragType; }
  /// The drag type alone.
  static std::vector<std::string> readableTypesForPasteboard(const platform::Pasteboard& pasteboard);
  /// The UUID is a text.
  static unsigned readingOptionsForType(const std::string&, const platform::Pasteboard&) {
    return platform::kPasteboardReadingAsString;
  }
  /// Always null: a document is looked up by its UUID, and never made anew from a pasteboard.
  static std::shared_ptr<QuiltDocument> initWithPasteboardPropertyList(const platform::PropertyList&,
                                                                       const std::string&) {
    return nullptr;
  }
  std::vector<std::string> writableTypesForPasteboard(const platform::Pasteboard& pasteboard) const override;
  unsigned writingOptionsForType(const std::string&, const platform::Pasteboard&) const override {
    return platform::kPasteboardNoOptions;
  }
  platform::PropertyList pasteboardPropertyListForType(const std::string&) const override { return uuid(); }

  // Image browser: the poster, by its file when there is one
  std::string imageUID() override { return uuid(); }
  std::uint64_t imageVersion() override { return posterImageVersion(); }
  /// The title, or a localised "Untitled Episode".
  Text imageTitle() override;
  /// The day of creation in the language's short form.
  Text imageSubtitle() override;
  std::string imageRepresentationType() override;
  ImageRepresentation imageRepresentation() override;

  // Themes
  /// Copies the theme's template into the package after clearing the previous one's files.
  bool applyTheme(const std::shared_ptr<QuiltTheme>& theme, const ProgressionBlock& withProgressionBlock);
  /// Deletes what a theme copied into the package. False, after a critical line, when the package cannot be listed;
  /// what cannot be deleted stays, with a warning.
  bool removeTheme();
  /// Succeeds without writing anything.
  bool generateLocalizationControllerFromTheme(const std::shared_ptr<QuiltTheme>& theme);
  /// The store metadata.
  Dictionary jukeboxMetadata() const;

  // Long operations, on the calling thread; the block gets 0 to 100
  /// Makes the document ready to be played: finalizes every item, writes what the theme reads, the thumbnail and the
  /// properties file.
  bool finalizeWithProgressionBlock(const ProgressionBlock& withProgressionBlock);
  /// True when there are items and every one is flattened.
  bool isFlattened() const;
  /// Copies every outside file into the package.
  bool flattenWithProgressionBlock(const ProgressionBlock& withProgressionBlock);
  /// The formats that every item offers, in the first item's order.
  std::vector<std::string> availableFormats() const;
  /// Has every item make the format; false at the first that cannot, or when the block answers false. `followedBy`
  /// as of the source's.
  bool convertToFormat(const std::string& format, const ProgressionBlock& withProgressionBlock,
                       const std::vector<std::string>& followedBy = {});
  /// Builds a finished copy, as a folder or zipped, in the folder `path` under a unique name made from the title. The
  /// path of what was made, or empty. Flattens, converts and finalizes this document on the way.
  Path exportToPath(const Path& path, bool zipped, const std::vector<std::string>& usingFormats,
                    const ProgressionBlock& withProgressionBlock);
  /// Copies fields, poster and items, restricted to the formats, into another document. True also when an item lacked a
  /// format and the copy stopped there. The block is never called.
  bool mergeIntoDocument(const std::shared_ptr<QuiltDocument>& document, const std::vector<std::string>& withFormats,
                         const ProgressionBlock& withProgressionBlock);

 protected:
  QuiltDocument();

 private:
  bool isShownByFile();
  Path inPackage(std::initializer_list<const char*> components) const;
  /// The title, or the fall-back for a missing or empty one.
  std::string displayTitle() const;
  bool readProperties(const Path& file);
  void apply(Dictionary record);
  bool writeProperties(ConflictChoice inConflict = ConflictChoice::Refuse);
  /// Takes over what another hand wrote into the properties file, so that `mine`, the record made anew, replaces it.
  /// False, after a critical line, when nothing may be written.
  bool takeOverChanges(Dictionary mine, ConflictChoice inConflict);
  void takeOver(const RecordMerge& merge, const std::vector<std::shared_ptr<QuiltMedia>>& media);
  /// What update() does; none, and nothing logged, while busy.
  std::optional<bool> saveUnlessBusy(ConflictChoice inConflict);
  /// Sets isProcessing and answers the media lock, or none while busy. Waits for another thread's save.
  std::optional<platform::MonitorLock> beginProcessing();
  enum class Outcome { Done, Failed, Cancelled };
  Outcome finalizeMedia(const ProgressionBlock& block);
  bool finalizeInteractive();
  Outcome flattenMedia(const ProgressionBlock& block);
  Path exportCopy(const Path& path, bool zipped, const std::vector<std::string>& usingFormats,
                  const ProgressionBlock& block);
  /// Leaves the document untitled again when saving has given it the fall-back title. Saves nothing.
  void forgetFallBackTitle();

  platform::Property<std::string> _uuid{*this, "uuid"};
  platform::Property<Path> _path{*this, "path"};
  platform::Property<Text> _uti{*this, "uti"};
  platform::Property<Text> _title{*this, "title"};
  platform::Property<Text> _description{*this, "description"};
  platform::Property<Text> _author{*this, "author"};
  platform::Property<Text> _keywords{*this, "keywords"};
  platform::Property<Text> _category{*this, "category"};
  platform::Property<Text> _advisoryLabel{*this, "advisoryLabel"};
  platform::Property<std::int64_t> _jukeboxOrder{*this, "jukeboxOrder"};
  platform::Property<std::optional<Date>> _creationDate{*this, "creationDate"};
  platform::Property<std::optional<Date>> _modifiedDate{*this, "modifiedDate"};
  platform::Property<std::shared_ptr<ImageWrapper>> _posterImage{*this, "posterImage"};
  platform::Property<std::uint64_t> _posterImageVersion{*this, "posterImageVersion", 1};
  platform::ChildList<QuiltMedia, QuiltDocument> _media{*this, "media", &QuiltMedia::setDocumentOwner};
  platform::Property<Text> _lastPublishURL{*this, "lastPublishURL"};
  platform::Property<std::shared_ptr<QuiltTheme>> _theme{*this, "theme"};
  platform::Property<Text> _type{*this, "type"};
  platform::Property<bool> _isProcessing{*this, "isProcessing"};
  platform::WeakProperty<QuiltCollection> _collectionOwner{*this, "collectionOwner"};
  std::atomic<platform::ThreadIdentity> _savingThread{nullptr};  // while update() runs
  Dictionary _unknownEntries;
  const std::shared_ptr<SavedRecord> _saved;
  std::vector<platform::Observation> _observations;  // last: ends before the properties do
};

}  // namespace quilt
