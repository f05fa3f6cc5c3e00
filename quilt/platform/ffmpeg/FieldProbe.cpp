// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/FieldProbe.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <optional>
#include <span>
#include <utility>

#include "quilt/platform/ffmpeg/FilterChain.h"
#include "quilt/platform/ffmpeg/Limits.h"

namespace quilt::platform::ffmpeg {

namespace {

// How many pictures looked like what.
struct Counts {
  int topFirst = 0;
  int bottomFirst = 0;
  int progressive = 0;
  int flagged = 0;
};

bool hasRowsOfInterlacedVideo(const AVStream& stream) {
  constexpr std::array rows{480, 486, 512, 576, 608, 1080, 1088};
  return std::ranges::find(rows, stream.codecpar->height) != rows.end();
}

int tagNumber(const AVFrame& frame, const char* name) {
  const AVDictionaryEntry* entry = av_dict_get(frame.metadata, name, nullptr, 0);
  return entry == nullptr ? 0 : static_cast<int>(std::strtod(entry->value, nullptr));
}

// Looks at consecutive pictures from the current position.
void lookAt(Input& input, const AVStream& stream, int pictures, Counts& counts) {
  const Result<CodecContext> decoder = openDecoder(stream, 1, input.path());
  if (!decoder) return;
  const Packet packet(av_packet_alloc());
  const Frame frame(av_frame_alloc());
  const Frame judged(av_frame_alloc());
  std::optional<FilterChain> detector;
  Counts last;
  const auto pull = [&] {
    while (detector->pull(*judged) >= 0) {  // the detector counts on from picture to picture
      last.topFirst = tagNumber(*judged, "lavfi.idet.single.tff");
      last.bottomFirst = tagNumber(*judged, "lavfi.idet.single.bff");
      last.progressive = tagNumber(*judged, "lavfi.idet.single.progressive");
      av_frame_unref(judged.get());
    }
  };
  int seen = 0;
  while (seen < pictures && !input.outOfTime() && av_read_frame(input.context(), packet.get()) >= 0) {
    if (packet->stream_index == stream.index) avcodec_send_packet(decoder->get(), packet.get());
    av_packet_unref(packet.get());
    while (seen < pictures && avcodec_receive_frame(decoder->get(), frame.get()) >= 0) {
      ++seen;
      counts.flagged += frame->interlaced_frame != 0 ? 1 : 0;
      if (!detector) {
        Result<FilterChain> made = FilterChain::create(*frame, stream.time_base, "idet", input.path());
        if (!made) return;
        detector.emplace(*std::move(made));
      }
      if (detector->fits(*frame) && detector->push(frame.get()) >= 0) pull();
      av_frame_unref(frame.get());
    }
  }
  if (detector) {
    detector->push(nullptr);
    pull();
  }
  counts.topFirst += last.topFirst;
  counts.bottomFirst += last.bottomFirst;
  counts.progressive += last.progressive;
}

}  // namespace

Fields probeFields(Input& input, AVStream& stream, double duration) {
  const AVFieldOrder order = stream.codecpar->field_order;
  const bool isFlagged = order != AV_FIELD_UNKNOWN && order != AV_FIELD_PROGRESSIVE;
  if (!isFlagged && !hasRowsOfInterlacedVideo(stream)) return Fields::AsFlagged;
  for (unsigned i = 0; i < input.context()->nb_streams; ++i) {
    if (input.context()->streams[i] != &stream) input.context()->streams[i]->discard = AVDISCARD_ALL;
  }
  // Of a short file one place tells enough; there, each picture looked at would be a large part of the work.
  constexpr std::array severalPlaces{0.5, 0.1, 0.9};
  constexpr double isShort = 10;  // seconds
  const std::span<const double> places(severalPlaces.data(), duration > isShort ? severalPlaces.size() : 1);
  constexpr int picturesAtEach = 6;
  constexpr double secondsForAll = 10;
  input.allow(secondsForAll);
  Counts counts;
  for (const double place : places) {
    const auto target = static_cast<std::int64_t>((startTime(input) + duration * place) * AV_TIME_BASE);
    if (duration > 0) av_seek_frame(input.context(), -1, target, AVSEEK_FLAG_BACKWARD);
    lookAt(input, stream, picturesAtEach, counts);
    if (duration <= 0) break;
  }
  const int combed = counts.topFirst + counts.bottomFirst;
  const int most = std::max(counts.topFirst, counts.bottomFirst);
  constexpr int enough = 3;
  const bool isFlaggedThere = isFlagged || counts.flagged > 0;
  if (isFlaggedThere) {
    // Whole pictures are often stored as if they were two halves.
    return combed == 0 && counts.progressive >= enough ? Fields::None : Fields::AsFlagged;
  }
  const bool isSure = combed >= enough && most * 4 >= combed * 3 && combed * 4 >= counts.progressive;
  if (!isSure) return Fields::AsFlagged;
  return counts.topFirst > counts.bottomFirst ? Fields::TopFirst : Fields::BottomFirst;
}

}  // namespace quilt::platform::ffmpeg
