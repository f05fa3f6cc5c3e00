// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>

#include "quilt/platform/base/Bitmap.h"
#include "quilt/platform/base/Result.h"
#include "quilt/platform/ffmpeg/Handles.h"
#include "quilt/platform/ffmpeg/Streams.h"

namespace quilt::platform::ffmpeg {

/// A decoded frame as it is to be seen: square pixels, turned, sRGB. Frames that do not say how their colours are coded
/// count as BT.601 up to 576 lines and as BT.709 above; high dynamic range is tone-mapped. `file` is for errors.
Result<Bitmap> framePixels(const AVFrame& frame, AVRational pixelShape, const Orientation& orientation,
                           const std::filesystem::path& file);

}  // namespace quilt::platform::ffmpeg
