// SPDX-License-Identifier: Apache-2.0
#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt {

using platform::services;

// ---- Pasteboard

std::vector<std::string> QuiltMedia::readableTypesForPasteboard(const platform::Pasteboard&) {
  return {dragTypeIdentifier()};
}

std::vector<std::string> QuiltMedia::writableTypesForPasteboard(const platform::Pasteboard&) const {
  return {dragTypeIdentifier()};
}

// ---- Image browser

namespace {

bool hasPosterFile(QuiltMedia& item) {
  const auto poster = item.posterImage();
  const Path file = item.posterImagePath();
  return poster && !file.empty() && services().files->fileExistsAtPath(file);
}

}  // namespace

std::string QuiltMedia::imageRepresentationType() {
  if (!isComposed()) return kImageBrowserPreviewPathRepresentationType;
  return hasPosterFile(*this) ? kImageBrowserPathRepresentationType : kImageBrowserBitmapRepresentationType;
}

ImageRepresentation QuiltMedia::imageRepresentation() {
  if (!isComposed()) {
    const auto url = previewItemURL();
    return url ? ImageRepresentation(*url) : ImageRepresentation();
  }
  if (hasPosterFile(*this)) return posterImagePath();
  const auto poster = posterImage();
  return poster ? ImageRepresentation(poster) : ImageRepresentation();
}

// ---- Quick preview

std::optional<Url> QuiltMedia::previewItemURL() const {
  if (isComposed()) return std::nullopt;
  const auto source = sourceAtIndex(0);
  const auto main = source ? source->mainDerivative() : nullptr;
  return main ? main->url() : std::nullopt;
}

Dictionary QuiltMedia::glanceThumbnailOptions() { return {{kGlanceIconModeOption, true}}; }

}  // namespace quilt
