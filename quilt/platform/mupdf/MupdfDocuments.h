// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/DocumentToolkit.h"

namespace quilt::platform {

/// PDF and EPUB. A book is laid out on pages of 450 × 600 points with letters of 12 points, in the fonts that it
/// brings along. Text keeps the order in which the author drew it, unless that jumps upwards without a new column.
/// What an opened document may take: 256 MiB, 20,000 pages, and 20 seconds a call; whatever needs more is Damaged.
/// Scripts are not run, and nothing outside the file is read.
class MupdfDocuments final : public DocumentToolkit {
 public:
  [[nodiscard]] Result<std::shared_ptr<PagedDocument>> openDocument(const std::filesystem::path& path,
                                                                    const ContinueBlock& goesOn = {}) const override;
};

}  // namespace quilt::platform
