// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <filesystem>
#include <memory>
#include <string>

#include "quilt/platform/base/Bitmap.h"
#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Geometry.h"
#include "quilt/platform/base/ProgressionBlock.h"
#include "quilt/platform/base/Result.h"

namespace quilt::platform {

/// One opened document. Any thread; calls on one document wait for each other. Pages are counted from 0. Each call
/// fails when the page does not exist (NotFound) or cannot be made sense of (Damaged), and then leaves the document as
/// it was.
class QUILT_EXPORT PagedDocument {
 public:
  virtual ~PagedDocument() = default;

  /// At least 1. For a book whose pages follow from its layout, the first call lays out the whole of it; the other
  /// operations lay out no further than their page.
  [[nodiscard]] virtual Result<std::size_t> pageCount() = 0;
  /// Points (1/72 inch) as the page is displayed, cropped and turned. Both sides are finite and more than 0.
  [[nodiscard]] virtual Result<Size> sizeOfPage(std::size_t index) = 0;
  /// The whole displayed page, with its annotations, on white and opaque. `pixels` are whole numbers, each at least 1.
  [[nodiscard]] virtual Result<Bitmap> drawPage(std::size_t index, Size pixels) = 0;
  /// The text on the page in reading order, UTF-8: a line feed after each line, an empty line between blocks, nothing
  /// around. Empty for a page of pictures. Cut after 256 KiB.
  [[nodiscard]] virtual Result<std::string> textOfPage(std::size_t index) = 0;
};

/// Opens documents. Any thread.
class QUILT_EXPORT DocumentToolkit {
 public:
  virtual ~DocumentToolkit() = default;

  /// Fails as NotFound without a file, as Damaged for what is no document or has no pages, as Unsupported for what is
  /// protected by a password or against copying and for kinds that nothing here handles. Where opening may take
  /// seconds, `goesOn` is asked several times a second, and after its first false the answer is Cancelled.
  [[nodiscard]] virtual Result<std::shared_ptr<PagedDocument>> openDocument(const std::filesystem::path& path,
                                                                            const ContinueBlock& goesOn = {}) const = 0;
};

}  // namespace quilt::platform
