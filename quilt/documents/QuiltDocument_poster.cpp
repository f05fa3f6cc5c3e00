// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/RecordNames.h"

namespace quilt {

using platform::FDYLogger;
using platform::services;

namespace {

std::shared_ptr<ImageWrapper> placeholderPoster() {
  const auto image = services().images->imageWithData(services().resources->artwork("PlaceholderPoster", "png"));
  return image ? (*image)->convertToSD() : nullptr;
}

}  // namespace

std::shared_ptr<ImageWrapper> QuiltDocument::posterImage() {
  const platform::Uninterrupted whole;
  if (auto cached = _posterImage.get()) return cached;
  const Path file = posterImagePath();
  if (file.empty() || !services().files->fileExistsAtPath(file)) {
    updatePosterImage(nullptr);
    return _posterImage.get();
  }
  const bool isInside = isInsidePackage(file, shared(this), "document poster image");
  const auto stored = isInside ? ImageWrapper::imageWithPath(file) : nullptr;
  setPosterImage(stored);
  if (!stored) FDYLogger::logWarning("Document poster image path \"%@\" is not a valid image", file);
  return stored;
}

void QuiltDocument::updatePosterImage(const std::shared_ptr<ImageWrapper>& image) {
  const platform::Uninterrupted whole;
  if (!image) {
    setPosterImage(placeholderPoster());
    return;
  }
  const auto poster = image->convertToSD();
  setPosterImage(poster);
  setPosterImageVersion(posterImageVersion() + 1);
  const Path file = posterImagePath();
  if (!poster) return;
  if (file.empty()) return keepPosterInMemory(poster);
  if (const auto created = createDirectoryIfMissing(file.parent_path()); !created) {
    FDYLogger::logCritical("Failed to create intermediate directories for document at path \"%@\": \"%@\"",
                           file.parent_path(), created.error());
    return keepPosterInMemory(poster);
  }
  if (const auto saved = poster->saveAsPNGAtURL(Url::fileUrl(file)); !saved) {
    FDYLogger::logWarning("Document poster image cannot be saved at path \"%@\": \"%@\"", file, saved.error());
    return keepPosterInMemory(poster);
  }
  // Read from the package from now on: the given image may refer to a file that its owner moves or deletes.
  if (const auto stored = ImageWrapper::imageWithPath(file)) _posterImage.store(stored);
}

void QuiltDocument::keepPosterInMemory(const std::shared_ptr<ImageWrapper>& poster) {
  auto pixels = poster->bitmap();
  auto held = pixels ? services().images->imageWithBitmap(*std::move(pixels)) : pixels.error();
  if (held) {
    _posterImage.store(*held);
  } else if (cannotBeDrawn(held.error())) {
    FDYLogger::logWarning("The image given as poster of document at path \"%@\" cannot be drawn: \"%@\"", path(),
                          held.error());
    setPosterImage(placeholderPoster());
  }
}

bool QuiltDocument::glanceUpdate() {
  if (!posterImage()) return true;
  const Path file = glanceThumbnailPath();
  const Path folder = file.parent_path();
  if (const auto created = createDirectoryIfMissing(folder); !created) {
    FDYLogger::logWarning("Failed to create intermediate directory \"@\" for Glance: \"%@\"", folder, created.error());
    return false;
  }
  const auto poster = posterImage();
  if (!poster) return true;
  const bool isInside = isInsidePackage(file, shared(this), "Glance thumbnail");
  if (isInside && poster->saveAsPNGAtURL(Url::fileUrl(file))) return true;
  FDYLogger::logWarning("Failed to save Glance thumbnail at path \"%@\"", file);
  return false;
}

}  // namespace quilt
