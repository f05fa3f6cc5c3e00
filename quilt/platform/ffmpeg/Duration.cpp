// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/Duration.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <string_view>
#include <utility>

#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/Streams.h"

namespace quilt::platform::ffmpeg {

namespace {

bool isSane(double duration) { return std::isfinite(duration) && duration > 0 && duration <= kMaximumDuration; }

// What the header says, 0 when nothing.
double claimedDuration(const Input& input) {
  const double origin = startTime(input);
  double streams = 0;
  for (const AVStream* stream : {mainVideo(input), mainAudio(input)}) {
    if (stream == nullptr || stream->duration == AV_NOPTS_VALUE) continue;
    const double start = stream->start_time != AV_NOPTS_VALUE ? seconds(stream->start_time, stream->time_base) : origin;
    streams = std::max(streams, start + seconds(stream->duration, stream->time_base) - origin);
  }
  const std::int64_t whole = input.context()->duration;
  const double container = whole == AV_NOPTS_VALUE ? 0 : static_cast<double>(whole) / AV_TIME_BASE;
  // Tracks that nobody sees or hears, such as hints, may last longer than those that count.
  constexpr double tolerance = 1.5;
  constexpr double grace = 5;
  if (isSane(container) && (streams <= 0 || container <= streams * tolerance + grace)) return container;
  return isSane(streams) ? streams : 0;
}

bool isInFile(const Input& input, const AVIndexEntry& entry) {
  return entry.pos >= 0 && static_cast<std::uint64_t>(entry.pos) + static_cast<unsigned>(entry.size) <= input.size();
}

struct IndexedExtent {
  bool isWhole = true;  // every packet's bytes are in the file
  double duration = 0;  // of the packets that are there
};

IndexedExtent indexedExtent(const Input& input, AVStream& stream) {
  const int count = avformat_index_get_entries_count(&stream);
  IndexedExtent result;
  std::int64_t first = 0;
  std::int64_t last = 0;
  int present = 0;
  for (int i = 0; i < count; ++i) {
    const AVIndexEntry& entry = *avformat_index_get_entry(&stream, i);
    if (!isInFile(input, entry)) {
      result.isWhole = false;
      continue;
    }
    if (present++ == 0) first = entry.timestamp;
    last = entry.timestamp;
  }
  if (present > 1) {
    const double span = seconds(last - first, stream.time_base);
    result.duration = span * present / (present - 1);
  } else if (present == 1 && stream.duration != AV_NOPTS_VALUE) {
    result.duration = seconds(stream.duration, stream.time_base) / count;
  }
  return result;
}

double indexedDuration(const Input& input, double claimed) {
  bool isWhole = true;
  double present = 0;
  for (AVStream* stream : {mainVideo(input), mainAudio(input)}) {
    if (stream == nullptr) continue;
    const IndexedExtent extent = indexedExtent(input, *stream);
    isWhole = isWhole && extent.isWhole;
    present = std::max(present, extent.duration);
  }
  if (isWhole && claimed > 0) return claimed;
  return isSane(present) ? present : 0;
}

// How long the file is by its own outermost chunk; 0 when it does not say.
std::uint64_t declaredSize(const Input& input) {
  std::array<unsigned char, 256> head{};
  const std::size_t length = input.readAt(0, head.data(), head.size());
  const auto number = [&](std::size_t position, std::size_t bytes, bool isLittleEndian) {
    std::uint64_t value = 0;
    for (std::size_t i = 0; i < bytes && position + bytes <= length; ++i) {
      value = value << 8U | head[position + (isLittleEndian ? bytes - 1 - i : i)];
    }
    return value;
  };
  const std::string_view kind(reinterpret_cast<const char*>(head.data()), 4);
  constexpr std::uint64_t unknown32 = 0xffffffff;
  if (kind == "RIFF" || kind == "FORM") {
    const std::uint64_t size = number(4, 4, kind == "RIFF");
    return size == 0 || size == unknown32 ? 0 : size + 8;
  }
  if (kind == "\x1a\x45\xdf\xa3") {  // EBML: a header element, then one segment; sizes are of variable length
    const auto element = [&](std::size_t position) -> std::pair<std::size_t, std::uint64_t> {
      const unsigned char first = position < length ? head[position] : 0;
      if (first == 0) return {0, 0};
      const auto bytes = static_cast<std::size_t>(std::countl_zero(first)) + 1;
      const std::uint64_t mask = (std::uint64_t{1} << (7 * bytes)) - 1;
      const std::uint64_t size = number(position, bytes, false) & mask;
      return {bytes, size == mask ? 0 : size};
    };
    const auto [headerBytes, headerSize] = element(4);
    if (headerBytes == 0 || headerSize > length) return 0;
    const std::size_t segment = 4 + headerBytes + static_cast<std::size_t>(headerSize);
    const auto [segmentBytes, segmentSize] = element(segment + 4);
    return segmentSize == 0 ? 0 : segment + 4 + segmentBytes + segmentSize;
  }
  return 0;
}

// Reads packets from the current position to the end of the file.
class PacketClock {
 public:
  explicit PacketClock(Input& input) : _input(input) {}

  // False when the time was over before the file.
  bool readToEnd() {
    const Packet packet(av_packet_alloc());
    while (packet && !_input.outOfTime() && av_read_frame(_input.context(), packet.get()) >= 0) {
      const AVStream& stream = *_input.context()->streams[packet->stream_index];
      const AVMediaType kind = stream.codecpar->codec_type;
      const bool counts = kind == AVMEDIA_TYPE_VIDEO || kind == AVMEDIA_TYPE_AUDIO;
      if (counts && !isAttachedPicture(stream)) note(*packet, stream);
      av_packet_unref(packet.get());
    }
    return !_input.outOfTime();
  }

  /// Of the packets read, in seconds of the file's time; end < start when there were none.
  [[nodiscard]] double start() const { return _start; }
  [[nodiscard]] double end() const { return _end; }

 private:
  void note(const AVPacket& packet, const AVStream& stream) {
    const std::int64_t stamp = packet.pts != AV_NOPTS_VALUE ? packet.pts : packet.dts;
    if (stamp == AV_NOPTS_VALUE) return;
    const double end = seconds(stamp, stream.time_base) + seconds(packet.duration, stream.time_base);
    if (!isSane(end)) return;
    _end = std::max(_end, end);
    _start = std::min(_start, seconds(stamp, stream.time_base));
  }

  Input& _input;
  double _start = kMaximumDuration;
  double _end = 0;
};

bool reachesItsEnd(Input& input, double claimed) {
  constexpr double lead = 1;
  const double slack = std::max(lead, claimed / 50);
  const double origin = startTime(input);
  const auto target = static_cast<std::int64_t>((origin + std::max(0.0, claimed - lead)) * AV_TIME_BASE);
  if (av_seek_frame(input.context(), -1, target, AVSEEK_FLAG_BACKWARD) < 0) return false;
  PacketClock clock(input);
  return clock.readToEnd() && clock.end() >= origin + claimed - slack;
}

double measuredDuration(const std::filesystem::path& path, double claimed) {
  Result<Input> input = Input::open(path, kMeasuringSeconds);  // afresh: seeking back is not exact in every format
  if (!input) return 0;
  PacketClock clock(*input);
  if (clock.readToEnd()) return std::max(0.0, clock.end() - clock.start());
  constexpr double leastBitRate = 2000;
  const bool isPlausible = static_cast<double>(input->size()) * 8 >= claimed * leastBitRate;
  return isPlausible ? claimed : clock.end() - clock.start();
}

}  // namespace

double trustedDuration(Input& input) {
  AVStream* video = mainVideo(input);
  AVStream* audio = mainAudio(input);
  // Packets of fragments are indexed as they are met, but not counted in the header.
  const auto isIndexed = [](AVStream* stream) {
    return stream == nullptr || (stream->nb_frames > 0 && avformat_index_get_entries_count(stream) > 0);
  };
  const double claimed = claimedDuration(input);
  if (input.isMovieFamily()) {
    if (isIndexed(video) && isIndexed(audio)) return indexedDuration(input, claimed);
  } else if (claimed > 0) {
    switch (input.context()->duration_estimation_method) {
      case AVFMT_DURATION_FROM_PTS:
        return claimed;  // of the last packets
      case AVFMT_DURATION_FROM_BITRATE:
        break;
      case AVFMT_DURATION_FROM_STREAM:
        if (const std::uint64_t declared = declaredSize(input); declared > 0) {
          if (declared <= input.size()) return claimed;
        } else if (reachesItsEnd(input, claimed)) {
          return claimed;
        }
        break;
    }
  }
  return measuredDuration(input.path(), claimed);
}

bool endsBeforeItsMedia(const Input& input) {
  if (!input.isMovieFamily()) return false;
  bool isIndexed = false;
  for (AVStream* stream : {mainVideo(input), mainAudio(input)}) {
    if (stream == nullptr) continue;
    const int count = avformat_index_get_entries_count(stream);
    for (int i = 0; i < count; ++i) {
      if (isInFile(input, *avformat_index_get_entry(stream, i))) return false;
    }
    isIndexed = isIndexed || count > 0;
  }
  return isIndexed;
}

std::optional<std::int64_t> lastCompleteKeyFrame(const Input& input, AVStream& stream) {
  for (int i = avformat_index_get_entries_count(&stream) - 1; i >= 0; --i) {
    const AVIndexEntry& entry = *avformat_index_get_entry(&stream, i);
    if ((entry.flags & AVINDEX_KEYFRAME) != 0 && isInFile(input, entry)) return entry.timestamp;
  }
  return std::nullopt;
}

}  // namespace quilt::platform::ffmpeg
