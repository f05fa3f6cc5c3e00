// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <set>

#include "quilt/platform/base/ChildList.h"
#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Property.h"
#include "quilt/sources/ModelTypes.h"
#include "quilt/sources/QuiltMediaAudioSamples.h"
#include "quilt/sources/QuiltMediaDerivative.h"
#include "quilt/sources/QuiltMediaPreview.h"

namespace quilt {

class QuiltDocument;
class QuiltMedia;

/// @{
/// Content categories, compared by string equality. The first five are a source's; the last two exist for media items
/// only.
inline constexpr const char* kQuiltMediaContentCategoryMovie = "Movie";
inline constexpr const char* kQuiltMediaContentCategoryAudio = "Audio";
inline constexpr const char* kQuiltMediaContentCategoryImage = "Image";
inline constexpr const char* kQuiltMediaContentCategoryDocument = "Document";
inline constexpr const char* kQuiltMediaContentCategoryWeb = "Web";
inline constexpr const char* kQuiltMediaContentCategoryMontage = "Montage";
inline constexpr const char* kQuiltMediaContentCategoryDualSource = "DualSource";
/// @}

/// One piece of content of a media item: its encoded files (derivatives), its stills (previews), its audio samples.
/// Owned by the item as a source, an extra or the audio commentary. Any thread may call it; each of the three
/// collections has its own recursive lock.
class QUILT_EXPORT QuiltMediaSource : public platform::Object {
 public:
  // Construction
  /// A fresh identity, no content and no timecode.
  static std::shared_ptr<QuiltMediaSource> init();
  /// @{
  /// A source whose first derivative is the file (or link), left where it is. Null when no derivative accepts it.
  static std::shared_ptr<QuiltMediaSource> initWithURL(const Url& url);
  static std::shared_ptr<QuiltMediaSource> initWithPath(const Path& path);
  /// @}
  /// Reads a record. Null, after a warning, when its identity is no plain folder name.
  static std::shared_ptr<QuiltMediaSource> initWithDictionary(Dictionary dictionary,
                                                              const std::shared_ptr<QuiltMedia>& andMedia);

  // Properties
  /// Names the source's folder in the package, so it is a plain folder name.
  std::string uuid() const { return _uuid.get(); }
  void setUuid(std::string uuid) { _uuid.set(std::move(uuid)); }
  /// @{
  /// For people, UTF-8; none: not given. Setting saves nothing by itself.
  Text title() const { return _title.get(); }
  void setTitle(Text title) { _title.set(std::move(title)); }
  Text description() const { return _description.get(); }
  void setDescription(Text description) { _description.set(std::move(description)); }
  /// @}
  /// Position of the source inside its item in seconds; kNoTimecode for none.
  double timecode() const { return _timecode.get(); }
  void setTimecode(double timecode) { _timecode.set(timecode); }
  /// The source's file was replaced and what derives from it must be made anew.
  bool dirty() const { return _dirty.get(); }
  /// True removes everything but the main derivative, which becomes the "Desktop" one, each time it is set.
  void setDirty(bool dirty);
  /// The owner, which sets and clears it; null while detached. Never keeps it alive.
  std::shared_ptr<QuiltMedia> mediaOwner() const { return _mediaOwner.get(); }
  void setMediaOwner(const std::shared_ptr<QuiltMedia>& owner) { _mediaOwner.set(owner); }

  // Derived values
  /// The category of the main derivative's content, or none.
  Text contentCategory() const;
  /// The category that a type identifier belongs to; none for none and for a type of no category.
  static Text contentCategoryForContentType(const Text& contentType);
  /// Seconds; 0 for what does not play.
  double duration() const;
  /// Of everything in the package: derivatives, previews and samples.
  double totalSizeInMegaBytes() const;
  /// The main derivative's picture, cached. Null after a warning.
  std::shared_ptr<ImageWrapper> thumbnailImage();
  void setThumbnailImage(std::shared_ptr<ImageWrapper> image) { _thumbnailImage.set(std::move(image)); }
  /// The first preview in standard definition, cached. Null without one.
  std::shared_ptr<ImageWrapper> posterImage();
  void setPosterImage(std::shared_ptr<ImageWrapper> image) { _posterImage.set(std::move(image)); }
  /// The main derivative's file or link; none without one.
  std::optional<Url> previewItemURL() const;
  /// The line under a quick preview.
  Text previewItemTitle() const { return title(); }
  /// No display state is kept.
  std::optional<std::string> previewItemDisplayState() const { return std::nullopt; }

  // Places in the package; empty while the source is not in a document
  /// @{
  /// The source's folder in the package, also as text, which is cheaper; and the folders in it. Empty while the source
  /// is not in a document.
  Path path() const { return folder(); }
  virtual std::string folder() const;
  Path derivativesFolderPath() const;
  Path previewsFolderPath() const;
  Path audioSamplesFolderPath() const;
  /// @}

  // Derivatives
  /// A copy of the list. Setting replaces the list and leaves files and back-pointers as they are.
  std::vector<std::shared_ptr<QuiltMediaDerivative>> derivatives() const { return _derivatives.copy(); }
  void setDerivatives(std::vector<std::shared_ptr<QuiltMediaDerivative>> derivatives);
  /// @{
  /// How many there are; one of them, null when the index is not below the count.
  std::size_t derivativeCount() const { return _derivatives.count(); }
  std::shared_ptr<QuiltMediaDerivative> derivativeAtIndex(std::size_t index) const { return _derivatives.at(index); }
  /// @}
  /// Calls the block on each with the lock held; stops at the first false and answers false.
  bool performBlockOnDerivatives(const std::function<bool(const std::shared_ptr<QuiltMediaDerivative>&)>& block) const;
  /// Attaches and appends it, and saves the document unless that is processing. Null is ignored.
  void addDerivative(const std::shared_ptr<QuiltMediaDerivative>& derivative);
  /// Deletes the derivative's file when it lies in the package, and removes it.
  void removeDerivative(const std::shared_ptr<QuiltMediaDerivative>& derivative);
  /// removeDerivative() for each that is there now.
  void removeAllDerivatives();
  /// The first with the tag, or null.
  std::shared_ptr<QuiltMediaDerivative> derivativeWithFormat(const std::string& format) const;
  /// The first with the tag, else with the best lower tag, or null. Never a better one than asked.
  std::shared_ptr<QuiltMediaDerivative> bestDerivativeForFormat(const std::string& format) const;
  /// The first with the best tag that any has, or null.
  std::shared_ptr<QuiltMediaDerivative> mainDerivative() const;
  /// "Desktop", "720p", "480p": best first.
  static const std::vector<std::string>& compatibilityTagsInOrderOfQuality();

  // Previews, made lazily by index
  /// A copy of the list, in the order of making. Setting replaces it, as setDerivatives() does.
  std::vector<std::shared_ptr<QuiltMediaPreview>> previews() const { return _previews.copy(); }
  void setPreviews(std::vector<std::shared_ptr<QuiltMediaPreview>> previews);
  /// How many previews the content has: chapters or a poster frame, pages, or one picture. Opens the file.
  std::size_t previewCount() const;
  /// The preview for the index, made when it is not there yet, or was lost. Null past the last, and after a warning
  /// when it cannot be drawn. What is made of a file in the package is written there at once.
  std::shared_ptr<QuiltMediaPreview> previewAtIndex(std::size_t index);
  /// Has the preview of that index, if there is one, count as none, with a warning that names file, item and picture.
  /// It is not made again before the caches are invalidated.
  void leaveOutPreview(std::size_t index, const platform::Error& error);
  /// The indexes of the previews that cannot be drawn, as far as it was tried.
  std::set<std::size_t> previewsLeftOut() const;
  /// What was found out about another source with the same content, so that it is not tried and told again.
  void setPreviewsLeftOut(std::set<std::size_t> indexes);
  /// Makes every preview, reporting each. False, after a critical line, when the block answers false. While an office
  /// document is converted, for seconds, 0 is reported with a null preview, so that a cancel is heard.
  bool previewWithProgressionBlock(const ObjectProgressionBlock<QuiltMediaPreview>& withProgressionBlock);
  /// Writes the previews that were made since the source was flattened into the package.
  void flattenPreviews();
  /// Whether every preview that the content has was made.
  bool isPreviewed() const;
  /// Attaches and appends it, and saves the document unless that is processing. Null is ignored.
  void addPreview(const std::shared_ptr<QuiltMediaPreview>& preview);
  /// Deletes the preview's file and removes it.
  void removePreview(const std::shared_ptr<QuiltMediaPreview>& preview);
  /// removePreview() for each that is there now.
  void removeAllPreviews();

  // Audio samples
  /// Null when there are none.
  std::shared_ptr<QuiltMediaAudioSamples> audioSamples() const { return _audioSamples.get(); }
  void setAudioSamples(std::shared_ptr<QuiltMediaAudioSamples> samples) { _audioSamples.set(std::move(samples)); }
  /// Extracts the main derivative's samples into the package and attaches them. False when there is no main derivative
  /// or no sound; true does not promise that they were attached. `goesOn` can stop a long extraction.
  bool addAudioSamplesForMainDerivative(const ContinueBlock& goesOn = {});
  /// Extracts the samples unless they are, and attaches them; when that fails they are not.
  void addAudioSamples(const std::shared_ptr<QuiltMediaAudioSamples>& samples, const ContinueBlock& goesOn = {});
  /// Deletes the samples file and leaves the source without samples.
  void removeAudioSamples(const std::shared_ptr<QuiltMediaAudioSamples>& samples);
  /// removeAudioSamples() for those that are there.
  void removeAllAudioSamples();

  // Invalidation
  /// @{
  /// Drops the cached thumbnail, the cached poster, or these and the caches of every child. They are made again when
  /// asked for; files stay.
  void invalidateThumbnailImage() { _thumbnailImage.set(nullptr); }
  void invalidatePosterImage() { _posterImage.set(nullptr); }
  void invalidateCaches();
  /// @}
  /// Removes every derivative but the main one, all previews and samples, and drops the caches.
  void invalidateAll();

  // Long operations, on the calling thread; the block gets 0 to 100
  /// Replaces the content by the file, keeping identity, title, description and timecode. A file that no derivative
  /// accepts leaves the source empty.
  void reloadWithFileAtPath(const Path& path, const ProgressionBlock& withProgressionBlock);
  /// Makes a derivative for the tag when one is needed and can be made. On failure the source keeps what it had.
  ///
  /// `followedBy` are the tags that the caller is going to ask for next. What comes of the same pass over a movie is
  /// made now, so that the next call finds it there.
  bool convertToFormat(const std::string& format, const ProgressionBlock& withProgressionBlock,
                       const std::vector<std::string>& followedBy = {});
  /// Every tag of every derivative, each once, in list order.
  std::vector<std::string> availableFormats() const;
  /// Whether every derivative and the audio samples lie in the package. False without derivatives or samples.
  bool isFlattened() const;
  /// Copies (or moves) every file into the package, writes the previews there and extracts the samples.
  bool flattenCopy(bool copy, const ProgressionBlock& withProgressionBlock);
  /// Makes every preview.
  bool finalizeWithProgressionBlock(const ProgressionBlock& withProgressionBlock);
  /// Copies the best file for the tag into a folder; the path written, or empty.
  Path exportToPath(const Path& path, const std::string& withFormat, const ProgressionBlock& withProgressionBlock);

  // Record
  /// The record as it is written, with the entries that a newer version left in it.
  Dictionary dictionary() const;

 protected:
  QuiltMediaSource();
  /// Fills a fresh object from a record; false, after a warning, when the record is refused.
  bool initializeWithDictionary(Dictionary dictionary, const std::shared_ptr<QuiltMedia>& andMedia);
  bool initializeWithURL(const Url& url);

 private:
  std::shared_ptr<QuiltDocument> document() const;
  void updateDocumentUnlessProcessing() const;
  struct PreviewContent;
  std::shared_ptr<QuiltMediaPreview> existingPreview(std::size_t index) const;
  std::shared_ptr<QuiltMediaPreview> usablePreview(std::size_t index);
  std::shared_ptr<QuiltMediaPreview> makePreview(const PreviewContent& content, std::size_t index);
  void renewLostPreviews(const ContinueBlock& goesOn);
  void readPreviewsFromPackage();
  bool convertImage(const std::string& format);
  bool convertAudio(const std::string& format, const ProgressionBlock& block);
  bool convertMovie(const std::string& format, const ProgressionBlock& block,
                    const std::vector<std::string>& followedBy);
  bool adoptConverted(const Path& file, const std::string& format);
  /// A name in the folder of the derivatives that nothing has yet, for a file in the making.
  platform::Result<Path> newHiddenFile(const std::string& extension) const;

  platform::Property<std::string> _uuid{*this, "uuid"};
  platform::Property<std::shared_ptr<ImageWrapper>> _thumbnailImage{*this, "thumbnailImage"};
  platform::Property<std::shared_ptr<ImageWrapper>> _posterImage{*this, "posterImage"};
  platform::ChildList<QuiltMediaDerivative, QuiltMediaSource> _derivatives{*this, "derivatives",
                                                                           &QuiltMediaDerivative::setSourceOwner};
  platform::ChildList<QuiltMediaPreview, QuiltMediaSource> _previews{*this, "previews",
                                                                     &QuiltMediaPreview::setSourceOwner};
  std::set<std::size_t> _previewsLeftOut;  // guarded by the previews' lock
  platform::Property<std::shared_ptr<QuiltMediaAudioSamples>> _audioSamples{*this, "audioSamples"};
  platform::Property<Text> _title{*this, "title"};
  platform::Property<Text> _description{*this, "description"};
  platform::Property<double> _timecode{*this, "timecode", kNoTimecode};
  platform::Property<bool> _dirty{*this, "dirty"};
  platform::WeakProperty<QuiltMedia> _mediaOwner{*this, "mediaOwner"};
  Dictionary _unknownEntries;
};

}  // namespace quilt
