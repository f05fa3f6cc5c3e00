// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/PictureFilters.h"

extern "C" {
#include <libavutil/pixdesc.h>
}

#include <algorithm>
#include <cstdlib>
#include <sstream>

#include "quilt/platform/ffmpeg/ToneMap.h"

namespace quilt::platform::ffmpeg {

namespace {

// How the values of a picture are to be read, nothing left open.
struct Colours {
  int matrix;
  int primaries;
  int transfer;
  bool isFullRange;

  bool operator==(const Colours&) const = default;
};

constexpr Colours kOutput{AVCOL_SPC_BT709, AVCOL_PRI_BT709, AVCOL_TRC_BT709, false};

bool isRgb(const AVFrame& frame) {
  const AVPixFmtDescriptor* format = av_pix_fmt_desc_get(static_cast<AVPixelFormat>(frame.format));
  return format != nullptr && (format->flags & (AV_PIX_FMT_FLAG_RGB | AV_PIX_FMT_FLAG_PAL)) != 0;
}

// The "J" formats are the plain ones with full range.
bool isFullRange(const AVFrame& frame) {
  switch (frame.format) {
    case AV_PIX_FMT_YUVJ420P:
    case AV_PIX_FMT_YUVJ422P:
    case AV_PIX_FMT_YUVJ444P:
    case AV_PIX_FMT_YUVJ440P:
    case AV_PIX_FMT_YUVJ411P:
      return true;
    default:
      return frame.color_range == AVCOL_RANGE_JPEG;
  }
}

// What screens treat alike counts as alike: converting between the curves of cameras would change what is seen.
int transferOf(const AVFrame& frame) {
  switch (static_cast<int>(frame.color_trc)) {  // an open list: the library adds to it
    case AVCOL_TRC_SMPTE2084:
    case AVCOL_TRC_ARIB_STD_B67:
    case AVCOL_TRC_LINEAR:
    case AVCOL_TRC_LOG:
    case AVCOL_TRC_LOG_SQRT:
      return frame.color_trc;
    default:
      return AVCOL_TRC_BT709;
  }
}

int primariesOf(const AVFrame& frame) {
  switch (static_cast<int>(frame.color_primaries)) {
    case AVCOL_PRI_BT470M:
    case AVCOL_PRI_BT470BG:
    case AVCOL_PRI_SMPTE170M:
    case AVCOL_PRI_SMPTE240M:
    case AVCOL_PRI_FILM:
    case AVCOL_PRI_BT2020:
    case AVCOL_PRI_SMPTE428:
    case AVCOL_PRI_SMPTE431:
    case AVCOL_PRI_SMPTE432:
      return frame.color_primaries;
    case AVCOL_PRI_UNSPECIFIED:
      return isHighDynamicRange(frame.color_trc) ? AVCOL_PRI_BT2020 : AVCOL_PRI_BT709;
    default:
      return AVCOL_PRI_BT709;
  }
}

int matrixOf(const AVFrame& frame) {
  if (isRgb(frame)) return AVCOL_SPC_RGB;
  switch (static_cast<int>(frame.colorspace)) {
    case AVCOL_SPC_BT709:
    case AVCOL_SPC_FCC:
    case AVCOL_SPC_BT470BG:
    case AVCOL_SPC_SMPTE170M:
    case AVCOL_SPC_SMPTE240M:
    case AVCOL_SPC_YCGCO:
    case AVCOL_SPC_BT2020_NCL:
      return frame.colorspace;
    case AVCOL_SPC_BT2020_CL:
      return AVCOL_SPC_BT2020_NCL;
    default:
      break;
  }
  if (isHighDynamicRange(frame.color_trc)) return AVCOL_SPC_BT2020_NCL;
  return frame.height <= kTallestStandardDefinition ? AVCOL_SPC_SMPTE170M : AVCOL_SPC_BT709;
}

Colours coloursOf(const AVFrame& frame) {
  return {matrixOf(frame), primariesOf(frame), transferOf(frame), isRgb(frame) || isFullRange(frame)};
}

bool hasFilter(const char* name) { return avfilter_get_by_name(name) != nullptr; }

const char* rangeName(bool isFull) { return isFull ? "full" : "limited"; }

class Chain {
 public:
  template <class... Parts>
  void add(const Parts&... parts) {
    if (_text.tellp() > 0) _text << ',';
    (_text << ... << parts);
  }
  [[nodiscard]] std::string text() const { return _text.str(); }

 private:
  std::ostringstream _text;
};

void deinterlace(Chain& chain, const AVFrame& frame, Fields fields) {
  constexpr int smallest = 16;  // the filter's limit, for any format
  if (isRgb(frame) || frame.width < smallest || frame.height < smallest) return;
  switch (fields) {
    case Fields::None:
      break;
    case Fields::AsFlagged:
      chain.add("bwdif=mode=send_frame:parity=auto:deint=interlaced");
      break;
    case Fields::TopFirst:
      chain.add("bwdif=mode=send_frame:parity=tff:deint=all");
      break;
    case Fields::BottomFirst:
      chain.add("bwdif=mode=send_frame:parity=bff:deint=all");
      break;
  }
}

std::string inputColours(const Colours& colours) {
  std::ostringstream text;
  text << "min=" << colours.matrix << ":pin=" << colours.primaries << ":tin=" << colours.transfer
       << ":rin=" << rangeName(colours.isFullRange);
  return text.str();
}

std::string sizing(PictureSize size) {
  return "w=" + std::to_string(size.width) + ":h=" + std::to_string(size.height) +
         ":filter=bicubic:param_a=0:param_b=0.6";
}

constexpr const char* kOutputColours = "m=709:p=709:t=709:r=limited";

// Deeper pictures are dithered. In others there is nothing between two values to show, and noise is costly to encode.
const char* ditherOf(const AVFrame& frame) {
  const AVPixFmtDescriptor* format = av_pix_fmt_desc_get(static_cast<AVPixelFormat>(frame.format));
  return format != nullptr && format->comp[0].depth > 8 ? ":dither=ordered" : ":dither=none";
}

// Scaled in linear light first, so that there are fewer pixels to map; brightness up to half of reference white is
// kept, what is above is rolled off, as in posters.
void toneMap(Chain& chain, const AVFrame& frame, const Colours& colours, PictureSize size) {
  chain.add("zscale=", sizing(size), ":", inputColours(colours),
            ":t=linear:p=709:m=gbr:r=full:npl=", ToneMap::kReferenceWhite);
  chain.add("format=gbrpf32le");
  chain.add("tonemap=tonemap=mobius:param=0.5:desat=0:peak=", ToneMap::peakOf(frame) / ToneMap::kReferenceWhite);
  // Screens show BT.709 with about this curve; the one that the standard gives for cameras would be too bright below.
  chain.add("zscale=min=gbr:pin=709:tin=linear:rin=full:m=709:p=709:t=iec61966-2-1:r=limited:dither=ordered");
}

// The library's own scaler, for builds without the better one. It knows no primaries.
void scalePlainly(Chain& chain, const Colours& colours, PictureSize size) {
  chain.add("scale=w=", size.width, ":h=", size.height, ":flags=bicubic+accurate_rnd+full_chroma_int",
            colours.matrix == AVCOL_SPC_RGB ? "" : ":in_color_matrix=",
            colours.matrix == AVCOL_SPC_RGB ? "" : av_color_space_name(static_cast<AVColorSpace>(colours.matrix)),
            ":in_range=", rangeName(colours.isFullRange), ":out_color_matrix=bt709:out_range=limited");
}

void turn(Chain& chain, const Orientation& orientation) {
  if (orientation.transpose) {
    const char* direction = orientation.mirrorX ? (orientation.mirrorY ? "clock_flip" : "cclock")
                                                : (orientation.mirrorY ? "clock" : "cclock_flip");
    chain.add("transpose=dir=", direction);
    return;
  }
  if (orientation.mirrorX) chain.add("hflip");
  if (orientation.mirrorY) chain.add("vflip");
}

}  // namespace

std::string pictureFilters(const AVFrame& frame, PictureSize size, const Orientation& orientation, Fields fields) {
  Chain chain;
  deinterlace(chain, frame, fields);
  const PictureSize lying = turned(size, orientation);
  const Colours colours = coloursOf(frame);
  PictureSize stored{frame.width, frame.height};
  // Of a picture that is only a row or a column too large one is left out: scaling would blur all the others.
  if (stored.width - lying.width == 1 && stored.height - lying.height <= 1 && stored.height >= lying.height) {
    stored = lying;
  } else if (stored.height - lying.height == 1 && stored.width == lying.width) {
    stored = lying;
  }
  if (stored.width != frame.width || stored.height != frame.height) {
    chain.add("crop=w=", stored.width, ":h=", stored.height, ":x=0:y=0");
  }
  if (isRgb(frame)) chain.add("format=gbrp|gbrap|gbrp10le|gbrp12le|gbrp14le|gbrp16le|gbrap16le");
  const bool isResized = stored.width != lying.width || stored.height != lying.height;
  if (isHighDynamicRange(colours.transfer)) {
    toneMap(chain, frame, colours, lying);
  } else if (isResized || colours != kOutput || frame.format != AV_PIX_FMT_YUV420P) {
    if (hasFilter("zscale")) {
      chain.add("zscale=", sizing(lying), ":", inputColours(colours), ":", kOutputColours, ditherOf(frame));
    } else {
      scalePlainly(chain, colours, lying);
    }
  }
  chain.add("format=yuv420p");
  turn(chain, orientation);
  return chain.text();
}

bool hasFiltersFor(int transfer, int primaries) {
  if (isHighDynamicRange(transfer)) return hasFilter("zscale") && hasFilter("tonemap");
  return primaries != AVCOL_PRI_BT2020 || hasFilter("zscale");
}

}  // namespace quilt::platform::ffmpeg
