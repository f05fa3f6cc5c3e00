// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/media/QuiltMediaExtra.h"
#include "quilt/platform/base/ChildList.h"
#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Property.h"
#include "quilt/sources/ModelTypes.h"
#include "quilt/sources/QuiltMediaSource.h"
#include "quilt/sources/Representations.h"

namespace quilt {

class QuiltDocument;

/// One item of a document: a movie, audio, an image, a document file, a web page, a montage of stills or two sources
/// shown together. Owned by its document; any thread may call it; sources and extras have a recursive lock each, never
/// held together.
class QUILT_EXPORT QuiltMedia : public platform::Object, public ImageBrowserItem, public platform::PasteboardItem {
 public:
  // Construction
  /// A fresh identity and nothing in it.
  static std::shared_ptr<QuiltMedia> init();
  /// Reads a record. Null, after a warning, when its identity is no plain folder name. Children whose records yield
  /// nothing are skipped.
  static std::shared_ptr<QuiltMedia> initWithDictionary(Dictionary dictionary,
                                                        const std::shared_ptr<QuiltDocument>& andDocument);

  // Properties
  /// Names the item's folder in the package, so it is a plain folder name.
  std::string uuid() const { return _uuid.get(); }
  void setUuid(std::string uuid) { _uuid.set(std::move(uuid)); }
  /// @{
  /// For people, UTF-8; none: not given. Setting saves nothing by itself.
  Text title() const { return _title.get(); }
  void setTitle(Text title) { _title.set(std::move(title)); }
  Text description() const { return _description.get(); }
  void setDescription(Text description) { _description.set(std::move(description)); }
  /// @}
  /// Whether a picture is drawn of several sources: a montage, two sources; any other item is shown by its file.
  bool isComposed() const;
  /// The category that was set; else, once, that of the only source; else none.
  Text contentCategory() const;
  void setContentCategory(Text contentCategory) { _contentCategory.set(std::move(contentCategory)); }
  /// The owner, which sets and clears it; null while detached. Never keeps it alive.
  std::shared_ptr<QuiltDocument> documentOwner() const { return _documentOwner.get(); }
  void setDocumentOwner(const std::shared_ptr<QuiltDocument>& owner) { _documentOwner.set(owner); }

  // Places in the package; empty while the item is not in a document
  /// @{
  /// The item's folder, the folders of its children and the poster's file. Empty while the item is not in a document.
  Path path() const;
  Path sourcesFolderPath() const;
  Path extrasFolderPath() const;
  Path posterImagePath() const;
  /// @}

  // Derived values
  /// Seconds.
  double duration() const;
  /// Of everything of the children in the package.
  double totalSizeInMegaBytes() const;

  // Poster image
  /// The item's still in standard definition: cached, else read from the package, else drawn and saved there. Null
  /// silently when an ordinary item's first source has no preview, else after a warning.
  std::shared_ptr<ImageWrapper> posterImage();
  void setPosterImage(std::shared_ptr<ImageWrapper> image) { _posterImage.set(std::move(image)); }
  /// Rises whenever the poster is drawn anew or invalidated; 1 for a new item.
  std::uint64_t posterImageVersion() const { return _posterImageVersion.get(); }
  void setPosterImageVersion(std::uint64_t version) { _posterImageVersion.set(version); }
  /// @{
  /// Pixels; the integer 0 without a poster, else a real.
  platform::PropertyList posterImageWidth();
  platform::PropertyList posterImageHeight();
  /// @}
  /// Drops the cached poster, raises the version and deletes the file.
  void invalidatePosterImage();
  /// Drops the cached poster and every cache of the children. The file and the version stay.
  void invalidateCaches();

  // Pasteboard: the UUID alone, under the drag type
  /// The one type under which an item travels.
  static std::string dragTypeIdentifier() { return kQuiltMediaDragType; }
  /// The drag type alone.
  static std::vector<std::string> readableTypesForPasteboard(const platform::Pasteboard& pasteboard);
  /// The UUID is a text.
  static unsigned readingOptionsForType(const std::string&, const platform::Pasteboard&) {
    return platform::kPasteboardReadingAsString;
  }
  /// Always null: an item is looked up by its UUID, and never made anew from a pasteboard.
  static std::shared_ptr<QuiltMedia> initWithPasteboardPropertyList(const platform::PropertyList&, const std::string&) {
    return nullptr;
  }
  std::vector<std::string> writableTypesForPasteboard(const platform::Pasteboard& pasteboard) const override;
  unsigned writingOptionsForType(const std::string&, const platform::Pasteboard&) const override {
    return platform::kPasteboardNoOptions;
  }
  platform::PropertyList pasteboardPropertyListForType(const std::string&) const override { return uuid(); }

  // Image browser: the file, or the poster of an item that is composed of several
  std::string imageUID() override { return uuid(); }
  std::uint64_t imageVersion() override { return posterImageVersion(); }
  std::string imageRepresentationType() override;
  ImageRepresentation imageRepresentation() override;

  // Quick preview
  /// The first source's main file; none for an item that is composed of several.
  std::optional<Url> previewItemURL() const;
  /// Thumbnails of items are drawn as icons.
  static Dictionary glanceThumbnailOptions();

  // Sources
  /// A copy of the list. Setting replaces the list and leaves files and back-pointers as they are.
  std::vector<std::shared_ptr<QuiltMediaSource>> sources() const { return _sources.copy(); }
  void setSources(std::vector<std::shared_ptr<QuiltMediaSource>> sources) { _sources.assign(std::move(sources)); }
  /// @{
  /// How many there are; one of them, null when the index is not below the count.
  std::size_t sourcesCount() const { return _sources.count(); }
  std::shared_ptr<QuiltMediaSource> sourceAtIndex(std::size_t index) const { return _sources.at(index); }
  /// @}
  /// Null when none has it.
  std::shared_ptr<QuiltMediaSource> sourceWithUUID(const std::string& uuid) const;
  /// Calls the block on each with the lock held; stops at the first false and answers false.
  bool performBlockOnSources(const std::function<bool(const std::shared_ptr<QuiltMediaSource>&)>& block) const;
  /// @{
  /// Attaches it and puts it at the end, or before the index; saves the document unless that is processing. Null is
  /// ignored. An index beyond the count changes nothing and logs a critical line.
  void addSource(const std::shared_ptr<QuiltMediaSource>& source);
  void addSource(const std::shared_ptr<QuiltMediaSource>& source, std::size_t atIndex);
  /// @}
  /// Moves a group, in its order, to a position counted before the move, and saves likewise. An index outside the list
  /// changes nothing and logs a critical line.
  void moveSourcesAtIndexes(const IndexSet& indexes, std::size_t toIndex);
  /// Deletes the source's folder and removes it from the list.
  void removeSource(const std::shared_ptr<QuiltMediaSource>& source);
  /// removeSource() for each that is there now.
  void removeAllSources();
  /// How many previews the sources have together, made or not. Opens their files.
  std::size_t totalSourcesPreviewsCount() const;
  /// The preview at this place when those of all sources are numbered in source order; null past the last.
  std::shared_ptr<QuiltMediaPreview> sourcePreviewAtIndex(std::size_t index) const;

  // Extras
  /// A copy of the list. Setting replaces the list and leaves files and back-pointers as they are.
  std::vector<std::shared_ptr<QuiltMediaExtra>> extras() const { return _extras.copy(); }
  void setExtras(std::vector<std::shared_ptr<QuiltMediaExtra>> extras) { _extras.assign(std::move(extras)); }
  /// @{
  /// How many there are; one of them, null when the index is not below the count.
  std::size_t extraCount() const { return _extras.count(); }
  std::shared_ptr<QuiltMediaExtra> extraAtIndex(std::size_t index) const { return _extras.at(index); }
  /// @}
  /// Calls the block on each with the lock held; stops at the first false and answers false.
  bool performBlockOnExtra(const std::function<bool(const std::shared_ptr<QuiltMediaExtra>&)>& block) const;
  /// @{
  /// Attaches it and puts it at the end, or before the index; saves the document unless that is processing. Null is
  /// ignored. An index beyond the count changes nothing and logs a critical line.
  void addExtra(const std::shared_ptr<QuiltMediaExtra>& extra);
  void addExtra(const std::shared_ptr<QuiltMediaExtra>& extra, std::size_t atIndex);
  /// @}
  /// Moves a group, in its order, to a position counted before the move, and saves likewise. An index outside the list
  /// changes nothing and logs a critical line.
  void moveExtraAtIndexes(const IndexSet& indexes, std::size_t toIndex);
  /// Deletes the extra's folder and removes it from the list.
  void removeExtra(const std::shared_ptr<QuiltMediaExtra>& extra);
  /// removeExtra() for each that is there now.
  void removeAllExtras();

  // Audio commentary
  /// The voice over a montage; null without one.
  std::shared_ptr<QuiltMediaSource> audioCommentarySource() const { return _audioCommentarySource.get(); }
  /// Replaces the commentary; files stay, nothing is saved.
  void setAudioCommentarySource(const std::shared_ptr<QuiltMediaSource>& source);

  // Long operations, on the calling thread; the block gets 0 to 100
  /// Whether every child's files lie in the package.
  bool isFlattened() const;
  /// Copies every child's files into the item's folder. This, finalize and convert hold the lock of the list that they
  /// are at, the sources' and then the extras', throughout.
  bool flattenWithProgressionBlock(const ProgressionBlock& withProgressionBlock);
  /// Makes the poster and every child's previews.
  bool finalizeWithProgressionBlock(const ProgressionBlock& withProgressionBlock);
  /// Writes the children's previews that were made since the item was flattened into the package, so that what finalize
  /// promises to readers of the record is on disk.
  void flattenPreviews();
  /// Has every child make the format; stops at the first that cannot. `followedBy` as of the source's.
  bool convertToFormat(const std::string& format, const ProgressionBlock& withProgressionBlock,
                       const std::vector<std::string>& followedBy = {});
  /// Flattens, converts and finalizes the whole document, then copies this item's sources into a folder.
  bool exportToPath(const Path& path, const std::string& withFormat, const ProgressionBlock& withProgressionBlock);
  /// The formats that every child offers, in the first source's order.
  std::vector<std::string> availableFormats() const;

  // Record
  /// Reads the poster, and so may draw and save it.
  Dictionary dictionary();

 protected:
  QuiltMedia();

 private:
  void updateDocumentUnlessProcessing() const;
  template <class List, class Child>
  void insertChild(List& list, const Child& child, std::size_t index);
  template <class List, class Child>
  void appendChild(List& list, const Child& child);
  template <class List>
  void moveChildren(List& list, const IndexSet& indexes, std::size_t target);
  template <class List, class Child>
  void removeChild(List& list, const Child& child, const char* warning);
  bool flattenChildren(const ProgressionBlock& block);
  bool finalizeChildren(const ProgressionBlock& block);
  /// The poster anew; null silently when an ordinary item has no preview, else after a warning.
  std::shared_ptr<ImageWrapper> drawnPoster();
  /// Writes the poster into the package, and has one that was made from a file read from there from then on.
  platform::Result<void> savePoster(const std::shared_ptr<ImageWrapper>& poster);
  /// Writes a poster that is in memory alone, because it could not be saved or its file is gone; else draws it anew.
  void savePosterIfMissing();
  /// The second source's poster with the first's as an inset; null without the second's.
  std::shared_ptr<ImageWrapper> dualSourcePoster();
  /// The first four sources' posters in a grid, under a badge.
  std::shared_ptr<ImageWrapper> montagePoster();

  platform::Property<std::string> _uuid{*this, "uuid"};
  platform::Property<Text> _title{*this, "title"};
  platform::Property<Text> _description{*this, "description"};
  mutable platform::Property<Text> _contentCategory{*this, "contentCategory"};
  platform::Property<std::shared_ptr<ImageWrapper>> _posterImage{*this, "posterImage"};
  platform::Property<std::uint64_t> _posterImageVersion{*this, "posterImageVersion", 1};
  platform::ChildList<QuiltMediaSource, QuiltMedia> _sources{*this, "sources", &QuiltMediaSource::setMediaOwner};
  platform::ChildList<QuiltMediaExtra, QuiltMedia> _extras{*this, "extras", &QuiltMediaExtra::setMediaOwner};
  platform::Property<std::shared_ptr<QuiltMediaSource>> _audioCommentarySource{*this, "audioCommentarySource"};
  platform::WeakProperty<QuiltDocument> _documentOwner{*this, "documentOwner"};
  Dictionary _unknownEntries;
};

}  // namespace quilt
