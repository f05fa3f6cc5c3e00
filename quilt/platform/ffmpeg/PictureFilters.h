// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "quilt/platform/ffmpeg/Handles.h"
#include "quilt/platform/ffmpeg/Streams.h"

namespace quilt::platform::ffmpeg {

/// Which pictures of a stream hold two moments, one in the even rows and one in the odd ones.
enum class Fields {
  None,         ///< none does, whatever flags say
  AsFlagged,    ///< those that are flagged, in the order that they say
  TopFirst,     ///< all, flagged or not
  BottomFirst,  ///< all, flagged or not
};

/// The filters that turn decoded pictures like `frame` into what is encoded: deinterlaced, with square pixels, at
/// `size`, upright, 8-bit 4:2:0, BT.709, limited range. Empty when the pictures are that already. Untagged colours
/// count as BT.601 up to 576 rows, as BT.709 above.
std::string pictureFilters(const AVFrame& frame, PictureSize size, const Orientation& orientation, Fields fields);

/// Whether the installed library has all the filters that pictures with this transfer and these primaries need.
bool hasFiltersFor(int transfer, int primaries);

}  // namespace quilt::platform::ffmpeg
