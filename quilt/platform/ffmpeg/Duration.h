// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <optional>

#include "quilt/platform/ffmpeg/Input.h"

namespace quilt::platform::ffmpeg {

/// The duration in seconds of what the file really holds; 0 when nothing tells. The header is believed when the data
/// that it promises is there; otherwise the packets that are there decide. The reading position is lost.
double trustedDuration(Input& input);

/// Whether the file's index lists packets, yet the file ends before every one of them.
bool endsBeforeItsMedia(const Input& input);

/// The time stamp, in the stream's ticks, of the last key frame in its index whose bytes are all in the file.
std::optional<std::int64_t> lastCompleteKeyFrame(const Input& input, AVStream& stream);

}  // namespace quilt::platform::ffmpeg
