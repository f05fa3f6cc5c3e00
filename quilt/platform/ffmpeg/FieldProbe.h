// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/ffmpeg/Input.h"
#include "quilt/platform/ffmpeg/PictureFilters.h"
#include "quilt/platform/ffmpeg/TranscodePlan.h"

namespace quilt::platform::ffmpeg {

/// Finds out which pictures of a stream are interlaced: flags are not believed without a look at some pictures from
/// different places. Streams that say nothing are looked at only when they have as many rows as interlaced video has.
/// `input` must be the caller's for this alone; `duration` is the file's in seconds.
Fields probeFields(Input& input, AVStream& stream, double duration);

}  // namespace quilt::platform::ffmpeg
