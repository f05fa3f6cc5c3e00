// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/MovieToolkit.h"

namespace quilt::platform {

/// Opens movies, and sound files for their chapters and covers. Opens no other file, whatever this one refers to.
/// Frames and covers become images through the installed image service. A frame has half a minute.
class FfmpegMovieToolkit final : public MovieToolkit {
 public:
  [[nodiscard]] Result<std::unique_ptr<Movie>> openMovie(const std::filesystem::path& path) const override;
};

}  // namespace quilt::platform
