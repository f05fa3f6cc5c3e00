// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/FramePixels.h"

extern "C" {
#include <libavutil/pixdesc.h>
}

#include <algorithm>
#include <array>
#include <cstring>

#include "quilt/platform/ffmpeg/Failure.h"
#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/ToneMap.h"

namespace quilt::platform::ffmpeg {

namespace {

// The "J" formats are the plain ones with full range.
AVPixelFormat plainFormat(int format, bool& isFullRange) {
  switch (format) {
    case AV_PIX_FMT_YUVJ420P:
      isFullRange = true;
      return AV_PIX_FMT_YUV420P;
    case AV_PIX_FMT_YUVJ422P:
      isFullRange = true;
      return AV_PIX_FMT_YUV422P;
    case AV_PIX_FMT_YUVJ444P:
      isFullRange = true;
      return AV_PIX_FMT_YUV444P;
    case AV_PIX_FMT_YUVJ440P:
      isFullRange = true;
      return AV_PIX_FMT_YUV440P;
    case AV_PIX_FMT_YUVJ411P:
      isFullRange = true;
      return AV_PIX_FMT_YUV411P;
    default:
      return static_cast<AVPixelFormat>(format);
  }
}

int scalerMatrixOf(const AVFrame& frame) {
  switch (static_cast<int>(frame.colorspace)) {  // an open list: the library adds to it
    case AVCOL_SPC_BT709:
      return SWS_CS_ITU709;
    case AVCOL_SPC_FCC:
      return SWS_CS_FCC;
    case AVCOL_SPC_BT470BG:
    case AVCOL_SPC_SMPTE170M:
      return SWS_CS_ITU601;
    case AVCOL_SPC_SMPTE240M:
      return SWS_CS_SMPTE240M;
    case AVCOL_SPC_BT2020_NCL:
    case AVCOL_SPC_BT2020_CL:
      return SWS_CS_BT2020;
    default:
      break;
  }
  if (isHighDynamicRange(frame.color_trc)) return SWS_CS_BT2020;
  return frame.height <= kTallestStandardDefinition ? SWS_CS_ITU601 : SWS_CS_ITU709;
}

// Scales to `size` and converts to RGBA of one or two bytes a channel.
int convert(const AVFrame& frame, PictureSize size, AVPixelFormat format, std::uint8_t* pixels, int stride) {
  bool isFullRange = frame.color_range == AVCOL_RANGE_JPEG;
  const AVPixelFormat stored = plainFormat(frame.format, isFullRange);
  // Without a change of size only the colour planes are enlarged, for which the sharper filter is not worth its time.
  const bool isResized = size.width != frame.width || size.height != frame.height;
  const int flags = (isResized ? SWS_BICUBIC : SWS_BILINEAR) | SWS_ACCURATE_RND | SWS_FULL_CHR_H_INT;
  const Scaler scaler(sws_getContext(frame.width, frame.height, stored, size.width, size.height, format, flags, nullptr,
                                     nullptr, nullptr));
  if (!scaler) return AVERROR_PATCHWELCOME;
  constexpr int one = 1 << 16;
  // Fails, harmlessly, for formats that are RGB already.
  sws_setColorspaceDetails(scaler.get(), sws_getCoefficients(scalerMatrixOf(frame)), isFullRange ? 1 : 0,
                           sws_getCoefficients(SWS_CS_DEFAULT), 1, 0, one, one);
  const std::array<std::uint8_t*, 4> planes{pixels, nullptr, nullptr, nullptr};
  const std::array<int, 4> strides{stride, 0, 0, 0};
  const int rows = sws_scale(scaler.get(), frame.data, frame.linesize, 0, frame.height, planes.data(), strides.data());
  return rows < 0 ? rows : 0;
}

Bitmap turnedBitmap(Bitmap source, const Orientation& orientation) {
  if (!orientation.mirrorX && !orientation.mirrorY && !orientation.transpose) return source;
  const PictureSize size = turned({static_cast<int>(source.width), static_cast<int>(source.height)}, orientation);
  Bitmap result{static_cast<std::size_t>(size.width), static_cast<std::size_t>(size.height), {}};
  result.pixels.resize(source.pixels.size());
  // Square tiles, so that rows and columns both stay in the cache.
  constexpr std::size_t tile = 32;
  for (std::size_t tileY = 0; tileY < result.height; tileY += tile) {
    for (std::size_t tileX = 0; tileX < result.width; tileX += tile) {
      for (std::size_t y = tileY; y < std::min(tileY + tile, result.height); ++y) {
        for (std::size_t x = tileX; x < std::min(tileX + tile, result.width); ++x) {
          std::size_t fromX = orientation.transpose ? y : x;
          std::size_t fromY = orientation.transpose ? x : y;
          if (orientation.mirrorX) fromX = source.width - 1 - fromX;
          if (orientation.mirrorY) fromY = source.height - 1 - fromY;
          std::memcpy(&result.pixels[(y * result.width + x) * 4], &source.pixels[(fromY * source.width + fromX) * 4],
                      4);
        }
      }
    }
  }
  return result;
}

}  // namespace

Result<Bitmap> framePixels(const AVFrame& frame, AVRational pixelShape, const Orientation& orientation,
                           const std::filesystem::path& file) {
  const PictureSize size = withSquarePixels({frame.width, frame.height}, pixelShape);
  if (size.width > kMaximumPictureSide || size.height > kMaximumPictureSide ||
      std::int64_t{size.width} * size.height > kMaximumPicturePixels) {
    return Error{ErrorKind::Damaged, "The movie's pictures are larger than any that can be shown.", file};
  }
  const auto count = static_cast<std::size_t>(size.width) * static_cast<std::size_t>(size.height);
  Bitmap bitmap{static_cast<std::size_t>(size.width), static_cast<std::size_t>(size.height), {}};
  constexpr std::size_t overrun = 64;  // the scaler may write whole vectors past the last pixel
  bitmap.pixels.resize(count * 4 + overrun);
  if (ToneMap::isNeeded(frame)) {
    std::vector<std::uint16_t> deep(count * 4 + overrun);
    const int code =
        convert(frame, size, AV_PIX_FMT_RGBA64, reinterpret_cast<std::uint8_t*>(deep.data()), size.width * 8);
    if (code < 0) return failure(code, file);
    ToneMap(frame).apply(deep.data(), bitmap.pixels.data(), count);
  } else if (const int code = convert(frame, size, AV_PIX_FMT_RGBA, bitmap.pixels.data(), size.width * 4); code < 0) {
    return failure(code, file);
  }
  bitmap.pixels.resize(count * 4);
  return turnedBitmap(std::move(bitmap), orientation);
}

}  // namespace quilt::platform::ffmpeg
