// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/FDYMedia.h"

namespace quilt::platform {

/// Inspects PDF and EPUB files: title, author and subject, the displayed size of a PDF's first page in points, and the
/// number of its pages among the details. An EPUB's pages are not counted, since that lays out the whole book, and have
/// no size. A document that needs a password or is protected against copying is Unsupported. Each call takes at most
/// 256 MiB. Any thread.
class MupdfInspector final : public MediaInspector {
 public:
  [[nodiscard]] Result<MediaFacts> inspect(const std::filesystem::path& path) const override;

  /// The version of MuPDF, for people.
  static const char* version();
};

}  // namespace quilt::platform
