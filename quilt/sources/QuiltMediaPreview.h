// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Property.h"
#include "quilt/platform/base/Result.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt {

class QuiltMediaSource;

/// One still of a source: a movie's chapter or poster frame, a document's page, the picture of an image. Owned by its
/// source; any thread may call it.
///
/// Its picture is in one of two places: in the package, and then it is read from there and from nowhere else; or, until
/// it is written there, in memory or in the file that it is made from.
class QUILT_EXPORT QuiltMediaPreview : public platform::Object {
 public:
  /// A fresh identity, no picture, no index and no timecode.
  static std::shared_ptr<QuiltMediaPreview> init();
  /// A preview of the image fitted into high definition. Null for an absent image.
  static std::shared_ptr<QuiltMediaPreview> initWithImageWrapper(const std::shared_ptr<ImageWrapper>& imageWrapper);
  /// Reads a record. Null, after a warning, when its identity is no plain file name.
  static std::shared_ptr<QuiltMediaPreview> initWithDictionary(Dictionary dictionary,
                                                               const std::shared_ptr<QuiltMediaSource>& andMediaSource);

  /// Names the file of a preview without an index, so it is a plain file name.
  std::string uuid() const { return _uuid.get(); }
  void setUuid(std::string uuid) { _uuid.set(std::move(uuid)); }
  /// A movie chapter's name, or a page's first line.
  Text title() const { return _title.get(); }
  void setTitle(Text title) { _title.set(std::move(title)); }
  /// The text of a document page.
  Text content() const { return _content.get(); }
  void setContent(Text content) { _content.set(std::move(content)); }
  /// Position among the source's previews; kNoIndex for none.
  std::size_t index() const { return _index.get(); }
  void setIndex(std::size_t index) { _index.set(index); }
  /// Seconds from the movie's start; kNoTimecode for none.
  double timecode() const { return _timecode.get(); }
  void setTimecode(double timecode) { _timecode.set(timecode); }
  /// The picture, read from the package when it is first asked for. Null, after a warning, when the file is missing or
  /// no image; null silently without a place in a document.
  std::shared_ptr<ImageWrapper> image();
  void setImage(std::shared_ptr<ImageWrapper> image) { _image.set(std::move(image)); }
  /// Pixels; none until the image was asked for.
  std::optional<double> width() const { return _width.get(); }
  void setWidth(std::optional<double> width) { _width.set(width); }
  /// Pixels; none until the image was asked for.
  std::optional<double> height() const { return _height.get(); }
  void setHeight(std::optional<double> height) { _height.set(height); }
  /// Whether the picture was written into the package.
  bool isFlattened() const { return _isFlattened.get(); }
  void setIsFlattened(bool isFlattened) { _isFlattened.set(isFlattened); }
  /// The owner, which sets and clears it; null while detached. Never keeps it alive.
  std::shared_ptr<QuiltMediaSource> sourceOwner() const { return _sourceOwner.get(); }
  void setSourceOwner(const std::shared_ptr<QuiltMediaSource>& owner) { _sourceOwner.set(owner); }

  /// Where the picture lies in the package: index (or identity) and "jpg"; empty without a place in a document.
  Path path() const;
  /// Whether there is a picture: one that is still to be written, or a file at the path.
  bool hasPicture() const;
  /// Whether its source may make it again of its main derivative: it made it, or it was read from a record. What a host
  /// or a merge brought is theirs.
  bool isRenewable() const { return _isRenewable.get(); }
  void setIsRenewable(bool isRenewable) { _isRenewable.set(isRenewable); }
  /// Writes the picture into the package, unless it is marked as written. From then on it is read from there: what it
  /// was made from may go. NotFound without a place in a document or without a picture, Damaged or Unsupported when the
  /// picture cannot be drawn, else what kept it from being written; logs a critical line, but for what cannot be drawn
  /// or has no place, and then it is as it was.
  platform::Result<void> writePicture();
  /// writePicture(), after a warning when the picture cannot be drawn. Whether the picture is in the package.
  bool flatten();
  /// 0 unless flattened.
  double totalSizeInMegaBytes() const;
  /// There are none; here because every child of a source has it.
  void invalidateCaches() {}

  /// The record as it is written, with the entries that a newer version left in it.
  Dictionary dictionary() const;

 protected:
  explicit QuiltMediaPreview(std::string uuid);

 private:
  static std::shared_ptr<QuiltMediaPreview> make(std::string uuid);
  std::string pathIn(const std::shared_ptr<QuiltMediaSource>& source) const;
  void adopt(const std::shared_ptr<ImageWrapper>& image);

  platform::Property<std::string> _uuid{*this, "uuid"};
  platform::Property<Text> _title{*this, "title"};
  platform::Property<Text> _content{*this, "content"};
  platform::Property<std::size_t> _index{*this, "index", kNoIndex};
  platform::Property<double> _timecode{*this, "timecode", kNoTimecode};
  platform::Property<std::shared_ptr<ImageWrapper>> _image{*this, "image"};
  platform::Property<std::optional<double>> _width{*this, "width"};
  platform::Property<std::optional<double>> _height{*this, "height"};
  platform::Property<bool> _isFlattened{*this, "isFlattened"};
  platform::Property<bool> _isRenewable{*this, "isRenewable"};
  // What the record said. Told again in the next one, so that a save need not open every picture.
  std::optional<double> _recordedWidth;
  std::optional<double> _recordedHeight;
  platform::WeakProperty<QuiltMediaSource> _sourceOwner{*this, "sourceOwner"};
  Dictionary _unknownEntries;
};

}  // namespace quilt
