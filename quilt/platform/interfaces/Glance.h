// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <memory>
#include <optional>
#include <string>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Url.h"
#include "quilt/platform/interfaces/ImageWrapper.h"

namespace quilt::platform {

/// A page of a document: its picture and its text in reading order.
struct DocumentPage {
  std::shared_ptr<ImageWrapper> image;  ///< never null in an answer
  std::string text;                     ///< UTF-8; empty for a page of pictures and when it cannot be read
};

/// The quick-preview service: a picture of any file, and the pages of documents.
class QUILT_EXPORT Glance {
 public:
  virtual ~Glance() = default;

  /// A picture that stands for the file, or null.
  [[nodiscard]] virtual std::shared_ptr<ImageWrapper> thumbnailImageForURL(const Url& url) const = 0;
  /// Does beforehand what may take long: a document whose pages are asked for on the main thread is prepared on the
  /// thread that wants them. Asking without it answers the same, later. `goesOn` is asked several times a second
  /// where it takes long; after its first false the document stays unprepared.
  virtual void prepareDocument(const std::filesystem::path& path, const ContinueBlock& goesOn = {}) const {
    (void)path;
    (void)goesOn;
  }
  /// 0 for what is no document, cannot be opened or has no pages.
  [[nodiscard]] virtual std::size_t documentPagesCount(const std::filesystem::path& path) const = 0;
  /// None past the last page, and for a page that cannot be drawn.
  [[nodiscard]] virtual std::optional<DocumentPage> documentPageAtIndex(const std::filesystem::path& path,
                                                                        std::size_t index) const = 0;
};

/// @{
/// The installed service's operations.
QUILT_EXPORT std::shared_ptr<ImageWrapper> FDYThumbnailImageForURL(const Url& url);
QUILT_EXPORT void FDYPreviewPrepareDocument(const std::filesystem::path& path, const ContinueBlock& goesOn = {});
QUILT_EXPORT std::size_t FDYPreviewDocumentPagesCount(const std::filesystem::path& path);
QUILT_EXPORT std::optional<DocumentPage> FDYPreviewDocumentPageAtIndex(const std::filesystem::path& path,
                                                                       std::size_t index);
/// @}

}  // namespace quilt::platform
