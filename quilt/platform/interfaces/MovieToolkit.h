// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <memory>
#include <optional>
#include <vector>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Result.h"
#include "quilt/platform/interfaces/FDYMedia.h"
#include "quilt/platform/interfaces/ImageWrapper.h"

namespace quilt::platform {

/// One opened movie. Used by one thread at a time. Times are seconds from the start.
class QUILT_EXPORT Movie {
 public:
  virtual ~Movie() = default;

  /// None when the file does not say and its packets do not tell.
  [[nodiscard]] virtual std::optional<double> duration() const = 0;
  /// The time of the poster frame that the author chose; none when none is recorded.
  [[nodiscard]] virtual std::optional<double> posterTime() const = 0;
  /// In order of time; empty when there are none.
  [[nodiscard]] virtual const std::vector<Chapter>& chapters() const = 0;

  /// The start of the key frame at or before the time; none when the file has no usable index there.
  [[nodiscard]] virtual std::optional<double> keyFrameTimeAtOrBefore(double time) = 0;
  /// The frame shown at the time: upright, square pixels, sRGB. The last frame for a time past the end.
  [[nodiscard]] virtual Result<std::shared_ptr<ImageWrapper>> frameAtTime(double time) = 0;
  /// The picture that stands for an album or book, or null.
  [[nodiscard]] virtual std::shared_ptr<ImageWrapper> albumArtworkMovie() = 0;
};

/// Opens movies. Any thread.
class QUILT_EXPORT MovieToolkit {
 public:
  virtual ~MovieToolkit() = default;
  /// NotFound without a file, Damaged or Unsupported for what is no movie. The file stays open while the movie lives.
  [[nodiscard]] virtual Result<std::unique_ptr<Movie>> openMovie(const std::filesystem::path& path) const = 0;
};

}  // namespace quilt::platform
