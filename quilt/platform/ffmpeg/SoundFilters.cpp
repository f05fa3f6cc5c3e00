// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/SoundFilters.h"

#include <array>
#include <sstream>

namespace quilt::platform::ffmpeg {

namespace {

constexpr double kHalfPower = 0.707;
constexpr double kHalf = 0.5;  // half the power at half the power: a surround that is behind, for both sides

struct Shares {
  double left;
  double right;
};

Shares sharesOf(AVChannel channel) {
  switch (static_cast<int>(channel)) {  // an open list: the library adds to it
    case AV_CHAN_FRONT_LEFT:
    case AV_CHAN_STEREO_LEFT:
      return {1, 0};
    case AV_CHAN_FRONT_RIGHT:
    case AV_CHAN_STEREO_RIGHT:
      return {0, 1};
    case AV_CHAN_FRONT_CENTER:
      return {kHalfPower, kHalfPower};
    case AV_CHAN_BACK_LEFT:
    case AV_CHAN_SIDE_LEFT:
    case AV_CHAN_FRONT_LEFT_OF_CENTER:
    case AV_CHAN_WIDE_LEFT:
    case AV_CHAN_TOP_FRONT_LEFT:
    case AV_CHAN_TOP_BACK_LEFT:
    case AV_CHAN_TOP_SIDE_LEFT:
    case AV_CHAN_SURROUND_DIRECT_LEFT:
      return {kHalfPower, 0};
    case AV_CHAN_BACK_RIGHT:
    case AV_CHAN_SIDE_RIGHT:
    case AV_CHAN_FRONT_RIGHT_OF_CENTER:
    case AV_CHAN_WIDE_RIGHT:
    case AV_CHAN_TOP_FRONT_RIGHT:
    case AV_CHAN_TOP_BACK_RIGHT:
    case AV_CHAN_TOP_SIDE_RIGHT:
    case AV_CHAN_SURROUND_DIRECT_RIGHT:
      return {0, kHalfPower};
    case AV_CHAN_BACK_CENTER:
    case AV_CHAN_TOP_CENTER:
    case AV_CHAN_TOP_FRONT_CENTER:
    case AV_CHAN_TOP_BACK_CENTER:
      return {kHalf, kHalf};
    default:  // low frequencies among them
      return {0, 0};
  }
}

std::string downmix(const AVChannelLayout& given) {
  const int count = given.nb_channels;
  AVChannelLayout layout{};
  if (given.order == AV_CHANNEL_ORDER_NATIVE || given.order == AV_CHANNEL_ORDER_CUSTOM) {
    if (av_channel_layout_copy(&layout, &given) < 0) layout = {};
  } else {
    av_channel_layout_default(&layout, count);
  }
  const bool isKnown = layout.order == AV_CHANNEL_ORDER_NATIVE || layout.order == AV_CHANNEL_ORDER_CUSTOM;
  std::ostringstream left;
  std::ostringstream right;
  for (int i = 0; i < count; ++i) {
    const Shares shares = isKnown ? sharesOf(av_channel_layout_channel_from_index(&layout, static_cast<unsigned>(i)))
                                  : Shares{1.0 / count, 1.0 / count};
    if (shares.left > 0) left << (left.tellp() > 0 ? "+" : "") << shares.left << "*c" << i;
    if (shares.right > 0) right << (right.tellp() > 0 ? "+" : "") << shares.right << "*c" << i;
  }
  av_channel_layout_uninit(&layout);
  if (left.tellp() == 0) left << "c0";
  if (right.tellp() == 0) right << "c0";
  return "pan=stereo|c0=" + left.str() + "|c1=" + right.str() +
         ",alimiter=level=false:limit=1:attack=5:release=50:latency=true";
}

}  // namespace

std::string soundFilters(const AVFrame& frame, int sampleRate, int channels) {
  std::ostringstream row;
  row << "aformat=sample_fmts=fltp|dblp|flt|dbl,";
  if (frame.ch_layout.nb_channels > 2) row << downmix(frame.ch_layout) << ',';
  row << "aresample=osr=" << sampleRate
      << ",aformat=sample_fmts=fltp:channel_layouts=" << (channels == 1 ? "mono" : "stereo");
  return row.str();
}

}  // namespace quilt::platform::ffmpeg
