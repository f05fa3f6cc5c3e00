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

/// Whether a picture is drawn of several sources; any other item is shown by its file.
bool isComposed(const QuiltMedia& item) {
  const Text category = item.contentCategory();
  return category == kQuiltMediaContentCategoryDualSource || category == kQuiltMediaContentCategoryMontage;
}

bool hasPosterFile(QuiltMedia& item) {
  const auto poster = item.posterImage();
  const Path file = item.posterImagePath();
  return poster && !file.empty() && services().files->fileExistsAtPath(file);
}

}  // namespace

std::string QuiltMedia::imageRepresentationType() {
  if (!isComposed(*this)) return kImageBrowserPreviewPathRepresentationType;
  return hasPosterFile(*this) ? kImageBrowserPathRepresentationType : kImageBrowserBitmapRepresentationType;
}

ImageRepresentation QuiltMedia::imageRepresentation() {
  if (!isComposed(*this)) {
    const auto url = previewItemURL();
    return url ? ImageRepresentation(*url) : ImageRepresentation();
  }
  if (hasPosterFile(*this)) return posterImagePath();
  const auto poster = posterImage();
  return poster ? ImageRepresentation(poster) : ImageRepresentation();
}

// ---- Quick preview

std::optional<Url> QuiltMedia::previewItemURL() const {
  if (isComposed(*this)) return std::nullopt;
  const auto source = sourceAtIndex(0);
  const auto main = source ? source->mainDerivative() : nullptr;
  return main ? main->url() : std::nullopt;
}

Dictionary QuiltMedia::glanceThumbnailOptions() { return {{kGlanceIconModeOption, true}}; }

}  // namespace quilt
