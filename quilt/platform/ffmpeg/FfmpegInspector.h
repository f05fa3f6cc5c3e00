// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/FDYMedia.h"

namespace quilt::platform {

/// Inspects movies and sound files. Of ordinary, complete MPEG-4 and QuickTime files only the header is read; nothing
/// is ever decoded further than to know what it is. Opens no other file, whatever this one refers to.
///
/// Title: the tag "title". Information: the first of "description", "synopsis", "comment". Author: the first of
/// "artist", "author", "album_artist".
class FfmpegInspector final : public MediaInspector {
 public:
  [[nodiscard]] Result<MediaFacts> inspect(const std::filesystem::path& path) const override;
};

}  // namespace quilt::platform
