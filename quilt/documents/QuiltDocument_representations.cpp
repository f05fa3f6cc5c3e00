// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"

namespace quilt {

using platform::services;

// ---- Pasteboard

std::vector<std::string> QuiltDocument::readableTypesForPasteboard(const platform::Pasteboard&) {
  return {dragTypeIdentifier()};
}

std::vector<std::string> QuiltDocument::writableTypesForPasteboard(const platform::Pasteboard&) const {
  return {dragTypeIdentifier()};
}

// ---- Image browser

Text QuiltDocument::imageTitle() {
  const Text own = title();
  return own ? own : untitledEpisode();
}

Text QuiltDocument::imageSubtitle() {
  const auto date = creationDate();
  return date ? Text(services().dates->shortDescription(*date)) : std::nullopt;
}

bool QuiltDocument::isShownByFile() {
  const auto poster = posterImage();
  const Path file = posterImagePath();
  return poster && !file.empty() && services().files->fileExistsAtPath(file);
}

std::string QuiltDocument::imageRepresentationType() {
  return isShownByFile() ? kImageBrowserPathRepresentationType : kImageBrowserImageRepresentationType;
}

ImageRepresentation QuiltDocument::imageRepresentation() {
  if (isShownByFile()) return posterImagePath();
  const auto poster = posterImage();
  return poster ? ImageRepresentation(poster) : ImageRepresentation();
}

}  // namespace quilt
