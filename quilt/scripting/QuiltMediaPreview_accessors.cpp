// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/QuiltMediaPreview.h"

#include "quilt/platform/base/FDYLogger.h"
#include "quilt/scripting/AccessorTable.h"

namespace quilt::scripting::table {

using platform::FDYLogger;

namespace {

/// Scripts get sizes in single precision, and an integer 0 without an image.
Number pixels(const std::shared_ptr<platform::ImageWrapper>& image, double platform::Size::*side) {
  if (!image) return std::int64_t{0};
  return static_cast<double>(static_cast<float>(image->size().*side));
}

}  // namespace

std::span<const Accessor> ofPreview() {
  using Self = QuiltMediaPreview;
  static const Accessor accessors[] = {
      getter<Self>("cvUUID", "Its identity.",
                   [](const Self& preview) {
                     FDYLogger::logDebug("Conveyor is getting source preview \"%@\" uuid", preview.uuid());
                     return preview.uuid();
                   }),
      getter<Self>("cvTitle", "Its title: the chapter's, or the first line of the page.",
                   [](const Self& preview) {
                     FDYLogger::logDebug("Conveyor is getting source preview \"%@\" title \"%@\"", preview.uuid(),
                                         preview.title());
                     return preview.title();
                   }),
      getter<Self>("cvContent", "The text of the page.",
                   [](const Self& preview) {
                     FDYLogger::logDebug("Conveyor is getting source preview \"%@\" content \"%@\"", preview.uuid(),
                                         preview.content());
                     return preview.content();
                   }),
      getter<Self>("cvTimeCode", "Seconds from the start of the source.",
                   [](const Self& preview) {
                     FDYLogger::logDebug("Conveyor is getting source preview \"%@\" timecode \"%lf\"", preview.uuid(),
                                         preview.timecode());
                     return preview.timecode();
                   }),
      getter<Self>("cvWidth", "Pixels; 0 when it has no image.",
                   [](Self& preview) {
                     FDYLogger::logDebug("Conveyor is getting width of preview \"%@\"", preview.uuid());
                     return pixels(preview.image(), &platform::Size::width);
                   }),
      getter<Self>("cvHeight", "Pixels; 0 when it has no image.",
                   [](Self& preview) {
                     FDYLogger::logDebug("Conveyor is getting height of preview \"%@\"", preview.uuid());
                     return pixels(preview.image(), &platform::Size::height);
                   }),
      getter<Self>("cvPath", "Where its image lies.",
                   [](const Self& preview) {
                     const Path path = preview.path();
                     FDYLogger::logDebug("Conveyor is getting source preview \"%@\" path \"%@\"", preview.uuid(),
                                         path.empty() ? Text() : Text(path.native()));
                     return path;
                   }),
  };
  return accessors;
}

}  // namespace quilt::scripting::table
