// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>

#include "quilt/platform/interfaces/FDYMedia.h"

namespace quilt::platform {

/// Asks the inspector that knows the file's kind, as the installed type identifiers tell it. NotFound when there is no
/// file, Unsupported for other kinds.
class InspectionByKind final : public MediaInspector {
 public:
  /// None may be null. `movies` inspects movies and sound, `documents` PDF and EPUB.
  InspectionByKind(std::shared_ptr<const MediaInspector> movies, std::shared_ptr<const MediaInspector> images,
                   std::shared_ptr<const MediaInspector> documents, std::shared_ptr<const MediaInspector> office);

  [[nodiscard]] Result<MediaFacts> inspect(const std::filesystem::path& path) const override;

 private:
  std::shared_ptr<const MediaInspector> _movies;
  std::shared_ptr<const MediaInspector> _images;
  std::shared_ptr<const MediaInspector> _documents;
  std::shared_ptr<const MediaInspector> _office;
};

}  // namespace quilt::platform
