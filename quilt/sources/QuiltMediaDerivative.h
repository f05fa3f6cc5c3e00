// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Property.h"
#include "quilt/sources/KeptEntries.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt {

class QuiltMediaSource;

/// Playback targets that a derivative suits, and the formats asked of convert and export.
inline constexpr const char* kQuiltMediaDerivativeCompatibilityTagDesktop = "Desktop";  ///< full quality
inline constexpr const char* kQuiltMediaDerivativeCompatibilityTag720p = "720p";        ///< fits 1280 × 720
inline constexpr const char* kQuiltMediaDerivativeCompatibilityTag480p = "480p";        ///< fits 640 × 480

/// One encoded file, or one web link, of a source in one format. Owned by its source; any thread may call it. Holds no
/// file open.
class QUILT_EXPORT QuiltMediaDerivative : public platform::Object {
 public:
  /// A fresh identity and nothing else.
  static std::shared_ptr<QuiltMediaDerivative> init();
  /// @{
  /// Classifies a file, or takes any other URL as a web link. The file is not copied. Null, after a debug line, for a
  /// file that cannot serve.
  static std::shared_ptr<QuiltMediaDerivative> initWithURL(const Url& url);
  static std::shared_ptr<QuiltMediaDerivative> initWithPath(const Path& path);
  /// @}
  /// Reads a record. Null, after a warning, when its names would lead out of the source's folder.
  static std::shared_ptr<QuiltMediaDerivative> initWithDictionary(
      Dictionary dictionary, const std::shared_ptr<QuiltMediaSource>& andMediaSource);
  /// The same, emptying the record; a refused one stays as it is.
  static std::shared_ptr<QuiltMediaDerivative> read(Dictionary& record,
                                                    const std::shared_ptr<QuiltMediaSource>& andMediaSource);

  /// @{
  /// Whether the file's type is one that any source, a classic document or a document-file source accepts. True for
  /// every web link in the first form.
  static bool canInitWithURL(const Url& url);
  static bool canInitWithURLForClassic(const Url& url);
  static bool canInitWithURLOfTypeDocument(const Url& url);
  /// @}
  /// @{
  /// The type identifiers behind these tests.
  static const std::vector<std::string>& allSupportedUTIs();
  static const std::vector<std::string>& classicSupportedUTIs();
  static const std::vector<std::string>& documentSupportedUTIs();
  /// @}
  /// The targets that the file suits, given its content category; empty when it suits none. Logs one debug line.
  static std::vector<std::string> compatibilityTagsForURL(const Url& url, const Text& andContentCategory);

  /// Names the file in the package, so it is a plain file name. What is none, and what begins with ".", is refused with
  /// a warning.
  std::string uuid() const { return _uuid.get(); }
  void setUuid(std::string uuid);
  /// Where the content is: the outside file, the copy in the package, or the page of a web link.
  std::optional<Url> url() const { return _url.get(); }
  void setUrl(std::optional<Url> url) { _url.set(std::move(url)); }
  /// Type identifier of the content.
  Text contentType() const { return _contentType.get(); }
  void setContentType(Text contentType) { _contentType.set(std::move(contentType)); }
  /// The targets that it suits, best first; none when they were never told.
  std::optional<std::vector<std::string>> compatibilityTags() const { return _compatibilityTags.get(); }
  void setCompatibilityTags(std::optional<std::vector<std::string>> tags) { _compatibilityTags.set(std::move(tags)); }
  /// "video/mp4"; none when the type has none.
  Text mimetype() const { return _mimetype.get(); }
  void setMimetype(Text mimetype) { _mimetype.set(std::move(mimetype)); }
  /// Pixels, 0 when unknown.
  double height() const { return _height.get(); }
  void setHeight(double height) { _height.set(height); }
  /// Pixels, 0 when unknown.
  double width() const { return _width.get(); }
  void setWidth(double width) { _width.set(width); }
  /// Seconds, 0 when unknown.
  double duration() const { return _duration.get(); }
  void setDuration(double duration) { _duration.set(duration); }
  /// Whether the file lies inside the document package; true for a web link.
  bool isFlattened() const { return _isFlattened.get(); }
  void setIsFlattened(bool isFlattened) { _isFlattened.set(isFlattened); }
  /// The owner, which sets and clears it; null while detached. Never keeps it alive.
  std::shared_ptr<QuiltMediaSource> sourceOwner() const { return _sourceOwner.get(); }
  void setSourceOwner(const std::shared_ptr<QuiltMediaSource>& owner) { _sourceOwner.set(owner); }

  /// Whether the tag is among compatibilityTags().
  bool hasTag(const std::string& tag) const;
  /// 0 for a web link, and after a warning for a file that cannot be sized.
  double totalSizeInMegaBytes() const;
  /// There are none; here because every child of a source has it.
  void invalidateCaches() {}

  /// Copies (or moves) the file into the source's "derivatives" folder, under the derivative's identity, and points the
  /// URL there. True at once when it is flattened or a web link. False, after a critical line, when it has no place in
  /// a document, the copy fails or the block answers false; nothing is left behind then.
  bool flattenCopy(bool copy, const ProgressionBlock& withProgressionBlock);
  /// Copies the file into a folder under the document's title, made unique. The path written, or empty.
  Path exportToPath(const Path& path, const ProgressionBlock& withProgressionBlock);

  /// The record as it is written, with what no loader could use of the one that was read.
  Dictionary dictionary() const;

 protected:
  explicit QuiltMediaDerivative(std::string uuid);
  void valueWasSet(std::string_view key) override;

 private:
  static std::shared_ptr<QuiltMediaDerivative> make(std::string uuid);
  bool classify(const Url& url);

  platform::Property<std::string> _uuid{*this, "uuid"};
  platform::Property<std::optional<Url>> _url{*this, "url"};
  platform::Property<Text> _contentType{*this, "contentType"};
  platform::Property<std::optional<std::vector<std::string>>> _compatibilityTags{*this, "compatibilityTags"};
  platform::Property<Text> _mimetype{*this, "mimetype"};
  platform::Property<double> _height{*this, "height"};
  platform::Property<double> _width{*this, "width"};
  platform::Property<double> _duration{*this, "duration"};
  platform::Property<bool> _isFlattened{*this, "isFlattened"};
  platform::WeakProperty<QuiltMediaSource> _sourceOwner{*this, "sourceOwner"};
  KeptEntries _kept;
};

}  // namespace quilt
