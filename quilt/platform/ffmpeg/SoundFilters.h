// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "quilt/platform/ffmpeg/Handles.h"

namespace quilt::platform::ffmpeg {

/// The filters that turn decoded sound like `frame` into one or two channels of planar floating-point samples at
/// `sampleRate`. More than two channels are mixed: the fronts as they are, the centre and the surrounds at 0.707, the
/// low-frequency channel left out; what would clip is turned down for the moment. Channels whose places nobody knows
/// count as is usual for their number, or all alike.
std::string soundFilters(const AVFrame& frame, int sampleRate, int channels);

}  // namespace quilt::platform::ffmpeg
