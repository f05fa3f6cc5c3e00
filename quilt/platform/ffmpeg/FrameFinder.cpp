// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/FrameFinder.h"

#include <algorithm>
#include <limits>
#include <thread>
#include <utility>

#include "quilt/platform/ffmpeg/Duration.h"
#include "quilt/platform/ffmpeg/Failure.h"
#include "quilt/platform/ffmpeg/Limits.h"

namespace quilt::platform::ffmpeg {

namespace {

constexpr std::int64_t kNoTime = std::numeric_limits<std::int64_t>::min();
constexpr std::size_t kLookBack = 16;  // packets; no codec reorders more
constexpr std::size_t kManyPackets = 24;
constexpr int kMostSteps = 12;  // backwards, each at least to the key frame before, and ever longer

std::int64_t presentationTime(const AVPacket& packet) {
  return packet.pts != AV_NOPTS_VALUE ? packet.pts : packet.dts;  // AV_NOPTS_VALUE when there is neither
}

// How many packets come at most before one that is shown earlier.
int reordering(const std::vector<Packet>& packets) {
  int most = 0;
  for (std::size_t i = 0; i < packets.size(); ++i) {
    int later = 0;
    for (std::size_t j = i > kLookBack ? i - kLookBack : 0; j < i; ++j) {
      if (packets[j]->pts != AV_NOPTS_VALUE && packets[i]->pts != AV_NOPTS_VALUE && packets[j]->pts > packets[i]->pts) {
        ++later;
      }
    }
    most = std::max(most, later);
  }
  return most;
}

}  // namespace

// Packets from a key frame on, in decoding order, as far as they can matter for a time.
struct FrameFinder::Stretch {
  std::vector<Packet> packets;
  std::int64_t firstKey = kNoTime;  // when its first key frame is shown
  std::int64_t wanted = kNoTime;    // when the frame to be shown starts; none when the packets do not tell
  int reordering = 0;               // how many frames the decoder has to hold back
};

FrameFinder::FrameFinder(Input& input, AVStream& stream) : _input(input), _stream(stream) {
  for (unsigned i = 0; i < input.context()->nb_streams; ++i) {
    AVStream* other = input.context()->streams[i];
    if (other != &stream) other->discard = AVDISCARD_ALL;
  }
}

bool FrameFinder::seekBackward(std::int64_t time) {
  return av_seek_frame(_input.context(), _stream.index, time, AVSEEK_FLAG_BACKWARD) >= 0;
}

// The stream's next intact packet; null at the end, on damage and when the time is over.
Packet FrameFinder::readPacket() {
  Packet packet(av_packet_alloc());
  while (packet && !_input.outOfTime() && av_read_frame(_input.context(), packet.get()) >= 0) {
    if (packet->stream_index == _stream.index && (packet->flags & AV_PKT_FLAG_CORRUPT) == 0) return packet;
    av_packet_unref(packet.get());
  }
  return nullptr;
}

std::optional<std::int64_t> FrameFinder::keyFrameAtOrBefore(std::int64_t time) {
  std::int64_t target = time;
  for (int step = 0; step < kMostSteps && seekBackward(target); ++step) {
    std::int64_t first = kNoTime;
    while (const Packet packet = readPacket()) {
      const std::int64_t shown = presentationTime(*packet);
      if (shown == AV_NOPTS_VALUE) continue;
      if (first == kNoTime) first = shown;
      if ((packet->flags & AV_PKT_FLAG_KEY) == 0) {
        if (shown > time) break;
        continue;
      }
      if (shown <= time) return shown;
      break;
    }
    if (first == kNoTime || first > target) first = target;
    const std::int64_t back = (_stream.time_base.den / std::max(1, _stream.time_base.num)) << step;
    target = std::min(first - 1, target - back / 4);
  }
  return std::nullopt;
}

FrameFinder::Stretch FrameFinder::readStretch(std::int64_t time) {
  Stretch stretch;
  std::size_t bytes = 0;
  std::size_t past = 0;
  bool areAllTimed = true;
  while (Packet packet = readPacket()) {
    const std::int64_t shown = presentationTime(*packet);
    const bool isKey = (packet->flags & AV_PKT_FLAG_KEY) != 0;
    if (isKey && stretch.firstKey == kNoTime && shown != AV_NOPTS_VALUE) stretch.firstKey = shown;
    if (packet->pts == AV_NOPTS_VALUE) areAllTimed = false;
    // Nothing is shown before it is decoded: past the time, all is later. Where packets do not say when they are shown,
    // the decoder finds out from the ones that follow. One packet is kept even when the time lies before the first.
    if (packet->dts != AV_NOPTS_VALUE && packet->dts > time && !stretch.packets.empty()) {
      if (areAllTimed || ++past > kLookBack) break;
    }
    if (packet->pts != AV_NOPTS_VALUE && packet->pts <= time) stretch.wanted = std::max(stretch.wanted, packet->pts);
    bytes += static_cast<std::size_t>(packet->size);
    stretch.packets.push_back(std::move(packet));
    if (bytes > kHeldPacketBytes) break;
  }
  stretch.reordering = reordering(stretch.packets);
  if (!areAllTimed) stretch.wanted = kNoTime;
  return stretch;
}

Result<void> FrameFinder::prepareDecoder(const Stretch& stretch) {
  // Threads take longer to start than a few frames take to decode.
  const bool isLong = stretch.packets.size() > kManyPackets;
  const int threads = isLong ? static_cast<int>(std::clamp(std::thread::hardware_concurrency(), 1U, 4U)) : 1;
  if (_decoder && _decoder->thread_count >= threads) {
    avcodec_flush_buffers(_decoder.get());
  } else {
    Result<CodecContext> opened = openDecoder(_stream, threads, _input.path());
    if (!opened) return opened.error();
    _decoder = *std::move(opened);
  }
  // Some streams do not say how far they reorder, and the decoder then drops frames until it has found out.
  if (_stream.codecpar->codec_id == AV_CODEC_ID_H264) {
    _decoder->has_b_frames = std::max(_decoder->has_b_frames, stretch.reordering);
  }
  return {};
}

// Leaves in `best` the last frame up to `time`, and in `first` the earliest frame of all.
void FrameFinder::decode(const Stretch& stretch, std::int64_t time, Skipping skipping, Frame& best, Frame& first) {
  const Frame frame(av_frame_alloc());
  const auto isFound = [&] {
    return best && stretch.wanted != kNoTime && best->best_effort_timestamp == stretch.wanted;
  };
  std::int64_t last = kNoTime;
  const auto receive = [&] {
    while (frame && !isFound() && avcodec_receive_frame(_decoder.get(), frame.get()) >= 0) {
      std::int64_t& shown = frame->best_effort_timestamp;
      // Frames come in the order in which they are shown; one without a time comes after the one before.
      if (shown == AV_NOPTS_VALUE) shown = frame->pts;
      if (shown == AV_NOPTS_VALUE) shown = last == kNoTime ? time : last + 1;
      last = shown;
      if (shown <= time && (!best || shown >= best->best_effort_timestamp)) best.reset(av_frame_clone(frame.get()));
      if (!first || shown < first->best_effort_timestamp) first.reset(av_frame_clone(frame.get()));
      av_frame_unref(frame.get());
    }
  };
  for (const Packet& packet : stretch.packets) {
    if (_input.outOfTime() || isFound()) return;
    // Frames that no other refers to need no decoding, but for the one to be shown.
    const bool isNeeded = skipping == Skipping::Nothing || packet->pts == stretch.wanted;
    _decoder->skip_frame = isNeeded ? AVDISCARD_DEFAULT : AVDISCARD_NONREF;
    avcodec_send_packet(_decoder.get(), packet.get());  // a damaged packet is one frame less
    receive();
  }
  if (isFound()) return;
  _decoder->skip_frame = AVDISCARD_DEFAULT;
  avcodec_send_packet(_decoder.get(), nullptr);
  receive();
}

Result<Frame> FrameFinder::frameAtOrBefore(std::int64_t time) {
  std::int64_t target = time;
  // Past the last key frame whose data are there, nothing decodes.
  if (const std::optional<std::int64_t> last = lastCompleteKeyFrame(_input, _stream)) target = std::min(target, *last);
  const std::int64_t second = _stream.time_base.den / std::max(1, _stream.time_base.num);
  Frame earliest;
  for (int step = 0; step < kMostSteps; ++step) {
    if (!seekBackward(target) && !seekBackward(kNoTime + 1) && step > 0) break;
    const Stretch stretch = readStretch(time);
    const std::int64_t reached = stretch.firstKey != kNoTime ? std::min(stretch.firstKey, target) : target;
    const bool isAtStart =
        step + 1 == kMostSteps || (_stream.start_time != AV_NOPTS_VALUE && reached <= _stream.start_time);
    const bool isTooLate = stretch.firstKey == kNoTime || stretch.firstKey > time;
    if (isAtStart || !isTooLate) {
      Result<Frame> best = lastFrame(stretch, time, earliest);
      if (!best || *best) return best;
      if (isAtStart) break;
    }
    target = std::min(reached - 1, target - (second << step) / 4);
  }
  if (earliest) return earliest;
  return Error{ErrorKind::Damaged, "No picture of the movie can be decoded.", _input.path()};
}

// The last frame of the stretch up to `time`, null when none decodes.
Result<Frame> FrameFinder::lastFrame(const Stretch& stretch, std::int64_t time, Frame& earliest) {
  if (Result<void> prepared = prepareDecoder(stretch); !prepared) return prepared.error();
  Frame best;
  const bool isTold = stretch.wanted != kNoTime;
  decode(stretch, time, isTold ? Skipping::FramesNobodyNeeds : Skipping::Nothing, best, earliest);
  if (isTold && (!best || best->best_effort_timestamp != stretch.wanted)) {
    // The wanted frame does not decode: the one before it may be among those that were skipped.
    avcodec_flush_buffers(_decoder.get());
    decode(stretch, time, Skipping::Nothing, best, earliest);
  }
  if (_input.outOfTime()) return failure(AVERROR_EXIT, _input.path());
  return best;
}

}  // namespace quilt::platform::ffmpeg
