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
  if (!poster) {
    FDYLogger::logWarning("Media poster image cannot be previewed");
    return nullptr;
  }
  setPosterImage(poster);

  const Path folder = file.parent_path();
  const auto created =
      file.empty()
          ? platform::Result<void>(platform::Error{platform::ErrorKind::NotFound, "The item is not in a document", {}})
          : createDirectoryInPackage(folder, documentOwner());
  if (!created)
    FDYLogger::logCritical("Failed to create intermediate directories for media at path \"%@\": \"%@\"", folder,
                           created.error());
  // A poster that could not be saved is drawn again when it is needed next.
  if (!file.empty() && isInsidePackage(file, documentOwner(), "media poster image"))
    (void)poster->saveAsJPGAtPath(file);
  return poster;
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
