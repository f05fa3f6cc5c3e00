// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <memory>
#include <variant>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Pasteboard.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt {

// How the model's objects show themselves to a host's image browser, pasteboard and quick preview.

/// @{
/// What documents and media items are called on a pasteboard; it holds their UUID. A receiver looks the object up with
/// documentWithUUID or mediaWithUUID.
inline constexpr const char* kQuiltDocumentDragType = "org.quilt.QuiltDocument";
inline constexpr const char* kQuiltMediaDragType = "org.quilt.QuiltFramework.QuiltMedia";
/// @}

/// @{
/// What kind of image an image browser is given: an image file, an image object, a drawn bitmap.
inline constexpr const char* kImageBrowserPathRepresentationType = "org.quilt.image-browser.path";
inline constexpr const char* kImageBrowserImageRepresentationType = "org.quilt.image-browser.image";
inline constexpr const char* kImageBrowserBitmapRepresentationType = "org.quilt.image-browser.bitmap";
/// @}
/// A file of any kind, for the browser to make a thumbnail of.
inline constexpr const char* kImageBrowserPreviewPathRepresentationType = "org.quilt.image-browser.preview-path";

/// In an item's glanceThumbnailOptions: draw the thumbnail as an icon.
inline constexpr const char* kGlanceIconModeOption = "IconMode";

/// Nothing, a file, the address of a file or page, or an image whose pixels are decoded when they are asked for.
using ImageRepresentation = std::variant<std::monostate, Path, Url, std::shared_ptr<ImageWrapper>>;

/// An object that an image browser shows as a cell. The two representation operations always agree; they may load or
/// draw a poster, and so are called where that may take its time.
class QUILT_EXPORT ImageBrowserItem {
 public:
  virtual ~ImageBrowserItem() = default;

  /// The identity of the cell: the same for the same object, whatever it shows.
  virtual std::string imageUID() = 0;
  /// Rises when the browser has to fetch the representation again.
  virtual std::uint64_t imageVersion() = 0;
  /// @{
  /// The two lines under the cell. None: it has no such line.
  virtual Text imageTitle() { return std::nullopt; }
  virtual Text imageSubtitle() { return std::nullopt; }
  /// @}
  /// @{
  /// One of the representation types, and what it stands for; nothing when there is no picture.
  virtual std::string imageRepresentationType() = 0;
  virtual ImageRepresentation imageRepresentation() = 0;
  /// @}
};

}  // namespace quilt
