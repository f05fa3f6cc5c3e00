// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/QuiltDocument.h"
#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/DocumentSave.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/RecordNames.h"

namespace quilt {

using platform::FDYLogger;
using platform::services;

std::shared_ptr<ImageWrapper> QuiltMedia::posterImage() {
  const platform::Uninterrupted whole;
  // Making a first preview asks for a save, and a save reads the poster: it must be there by then.
  const SaveDeferral deferral;
  if (auto cached = _posterImage.get()) return cached;

  const Path file = posterImagePath();
  if (!file.empty() && services().files->fileExistsAtPath(file)) {
    const bool isInside = isInsidePackage(file, documentOwner(), "media poster image");
    const auto stored = isInside ? ImageWrapper::imageWithPath(file) : nullptr;
    const auto poster = stored ? stored->convertToSD() : nullptr;
    if (poster) {
      setPosterImage(poster);
    } else {
      FDYLogger::logWarning("Media poster image path \"%@\" is not a valid image", file);
    }
    return poster;
  }

  setPosterImageVersion(posterImageVersion() + 1);
  const auto poster = drawnPoster();
  if (!poster) return nullptr;
  setPosterImage(poster);
  const auto saved = savePoster(poster);
  if (!saved && cannotBeDrawn(saved.error())) {
    setPosterImage(nullptr);
    if (const auto first = sourceAtIndex(0)) first->leaveOutPreview(0, saved.error());
    return nullptr;
  }
  return _posterImage.get();
}

std::shared_ptr<ImageWrapper> QuiltMedia::drawnPoster() {
  const Text category = contentCategory();
  std::shared_ptr<ImageWrapper> poster;
  if (category == kQuiltMediaContentCategoryDualSource) {
    poster = dualSourcePoster();
  } else if (category == kQuiltMediaContentCategoryMontage) {
    poster = montagePoster();
  } else {
    if (!sourcePreviewAtIndex(0)) return nullptr;
    const auto first = sourceAtIndex(0);
    const auto picture = first ? first->posterImage() : nullptr;
    poster = picture ? picture->convertToSD() : nullptr;
  }
  if (!poster) FDYLogger::logWarning("Media poster image cannot be previewed");
  return poster;
}

platform::Result<void> QuiltMedia::savePoster(const std::shared_ptr<ImageWrapper>& poster) {
  using platform::Error;
  using platform::ErrorKind;
  const Path file = posterImagePath();
  const Path folder = file.parent_path();
  const auto created = file.empty()
                           ? platform::Result<void>(Error{ErrorKind::NotFound, "The item is not in a document", {}})
                           : createDirectoryInPackage(folder, documentOwner());
  if (!created)
    FDYLogger::logCritical("Failed to create intermediate directories for media at path \"%@\": \"%@\"", folder,
                           created.error());
  if (file.empty()) return created;
  if (!isInsidePackage(file, documentOwner(), "media poster image"))
    return Error{ErrorKind::Unsafe, "The file leads out of the document.", file};
  if (auto saved = poster->saveAsJPGAtPath(file); !saved) return saved;
  // A composition is in memory; any other poster would go on reading what it was made from.
  if (isComposed()) return {};
  const auto stored = ImageWrapper::imageWithPath(file);
  if (const auto small = stored ? stored->convertToSD() : nullptr) _posterImage.store(small);
  return {};
}

void QuiltMedia::savePosterIfMissing() {
  const auto poster = _posterImage.get();
  const Path file = posterImagePath();
  if (!poster || file.empty() || services().files->fileExistsAtPath(file)) return;
  if (savePoster(poster)) return;
  setPosterImage(nullptr);
  posterImage();
}

platform::PropertyList QuiltMedia::posterImageWidth() {
  const auto poster = posterImage();
  return poster ? platform::PropertyList(poster->size().width) : platform::PropertyList(0);
}

platform::PropertyList QuiltMedia::posterImageHeight() {
  const auto poster = posterImage();
  return poster ? platform::PropertyList(poster->size().height) : platform::PropertyList(0);
}

void QuiltMedia::invalidatePosterImage() {
  const platform::Uninterrupted whole;
  setPosterImage(nullptr);
  setPosterImageVersion(posterImageVersion() + 1);
  deleteFromPackage(posterImagePath(), documentOwner(), "Failed to delete poster image at path \"%@\": \"%@\"");
}

}  // namespace quilt
