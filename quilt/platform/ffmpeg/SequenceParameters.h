// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>

#include "quilt/platform/ffmpeg/Handles.h"

namespace quilt::platform::ffmpeg {

/// What an H.264 stream says of its pictures, as read from a movie's header without opening a decoder.
struct SequenceParameters {
  int width = 0;  ///< pixels, cropped
  int height = 0;
  AVRational pixelShape{0, 1};  ///< 0/1 when not given
  int bitDepth = 8;
  int chromaFormat = 1;  ///< 1 is 4:2:0, 2 is 4:2:2, 3 is 4:4:4, 0 is grey
  int transfer = AVCOL_TRC_UNSPECIFIED;
};

/// Reads the first parameter set of an AVC decoder configuration record ("avcC"). None when there is none, when it is
/// damaged, or when it is not of the kind that this reader knows.
std::optional<SequenceParameters> readSequenceParameters(std::span<const std::uint8_t> configuration);

}  // namespace quilt::platform::ffmpeg
