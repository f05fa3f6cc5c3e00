// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/FfmpegTranscoder.h"

#include <algorithm>
#include <array>
#include <map>
#include <memory>
#include <optional>
#include <utility>

#include "quilt/platform/ffmpeg/Failure.h"
#include "quilt/platform/ffmpeg/FieldProbe.h"
#include "quilt/platform/ffmpeg/Input.h"
#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/Metadata.h"
#include "quilt/platform/ffmpeg/MovieOutput.h"
#include "quilt/platform/ffmpeg/Outline.h"
#include "quilt/platform/ffmpeg/SourceTimeline.h"
#include "quilt/platform/ffmpeg/StreamChain.h"
#include "quilt/platform/ffmpeg/TranscodePlan.h"
#include "quilt/platform/ffmpeg/TranscodeProgress.h"

namespace quilt::platform {

using namespace ffmpeg;

namespace {

constexpr AVRational kCoverTimeBase{1, 1000};

// What is known of a file before it is read through.
struct Facts {
  double duration = 0;
  std::vector<Chapter> chapters;
  Fields fields = Fields::None;
};

// Tracks that nobody sees or hears, such as chapters, may last longer than those that are converted.
double playedDuration(const Input& input, const Outline& outline) {
  double end = 0;
  for (const AVStream* stream : {outline.video, outline.audio}) {
    if (stream == nullptr) continue;
    if (!input.isMovieFamily() || stream->duration == AV_NOPTS_VALUE) return outline.duration;
    const double start = stream->start_time == AV_NOPTS_VALUE ? 0 : seconds(stream->start_time, stream->time_base);
    end = std::max(end, start - startTime(input) + seconds(stream->duration, stream->time_base));
  }
  return outline.duration > 0 && end > 0 ? std::min(end, outline.duration) : outline.duration;
}

// Looks at the file through a reading position of its own.
Result<Facts> gatherFacts(const std::filesystem::path& file, bool hasPicture) {
  Result<Input> input = Input::open(file, kInspectionSeconds);
  if (!input) return input.error();
  Result<Outline> found = outline(*input);
  if (!found) return found.error();
  Facts facts;
  facts.duration = playedDuration(*input, *found);
  facts.chapters = chapters(*input, facts.duration);
  if (hasPicture && found->video != nullptr) facts.fields = probeFields(*input, *found->video, facts.duration);
  return facts;
}

// What is to be made.
struct Target {
  OutputKind kind;
  PictureSize box;
  std::filesystem::path file;
};

class Transcode {
 public:
  Transcode(Input input, const Facts& facts, Copying copying, TranscodeProgress& progress)
      : _input(std::move(input)), _facts(facts), _copying(copying), _progress(progress) {}

  Result<void> run(const Target& target) {
    Result<std::unique_ptr<MovieOutput>> output =
        MovieOutput::create(target.file, target.kind, _facts.duration, _progress);
    if (!output) return output.error();
    if (target.kind == OutputKind::Movie) {
      if (Result<void> added = addVideo(target.box, **output); !added) return added;
    }
    if (Result<void> added = addAudio(**output); !added) return added;
    if (_chains.empty()) return Error{ErrorKind::Unsupported, "The file holds no sound.", _input.path()};
    if (target.kind == OutputKind::Movie) addSubtitles(**output);
    describe(**output);
    if (Result<void> chapters = (*output)->setChapters(_facts.chapters); !chapters) return chapters;
    const AVStream* cover = addCover(**output);
    if (Result<void> begun = (*output)->begin(); !begun) return begun;
    if (cover != nullptr) {
      if (Result<void> written = writeCover(*cover, **output); !written) return written;
    }
    if (Result<void> carried = carryPackets(); !carried) return carried;
    return (*output)->finish();
  }

  /// Whether another attempt without copies may succeed.
  [[nodiscard]] bool isUnfitForCopying() const {
    return std::ranges::any_of(_chains, [](const auto& entry) { return entry.second->isUnfit(); });
  }

 private:
  Result<void> addVideo(PictureSize box, MovieOutput& output) {
    AVStream* stream = mainVideo(_input);
    if (stream == nullptr) return {};
    VideoTraits traits = videoTraits(_input, *stream);
    traits.isInterlaced =
        traits.isInterlaced || _facts.fields == Fields::TopFirst || _facts.fields == Fields::BottomFirst;
    if (traits.stored.width <= 0 || traits.stored.height <= 0) return failure(AVERROR_INVALIDDATA, _input.path());
    VideoPlan plan = planVideo(traits, box, _copying);
    constexpr double leastApart = 0.5;  // seconds; whole pictures take room
    for (const Chapter& chapter : _facts.chapters) {
      if (!plan.chapterStarts.empty() && chapter.start - plan.chapterStarts.back() < leastApart) continue;
      plan.chapterStarts.push_back(chapter.start);
    }
    const Company company = mainAudio(_input) == nullptr ? Company::Alone : Company::WithSound;
    return add(*stream, plan.isCopied ? makeCopyChain(*stream, output)
                                      : makeVideoEncodeChain(_input, *stream, plan, _facts.fields, company, output));
  }

  Result<void> addAudio(MovieOutput& output) {
    AVStream* stream = mainAudio(_input);
    if (stream == nullptr) return {};
    const AudioPlan plan = planAudio(audioTraits(_input, *stream), _copying);
    return add(*stream,
               plan.isCopied ? makeCopyChain(*stream, output) : makeAudioEncodeChain(_input, *stream, plan, output));
  }

  void addSubtitles(MovieOutput& output) {
    constexpr int most = 32;
    int count = 0;
    for (unsigned i = 0; i < _input.context()->nb_streams && count < most; ++i) {
      const AVStream& stream = *_input.context()->streams[i];
      if (stream.codecpar->codec_type != AVMEDIA_TYPE_SUBTITLE || !isTextSubtitle(stream)) continue;
      if (add(stream, makeSubtitleChain(_input, stream, output))) ++count;  // the movie goes without, too
    }
  }

  Result<void> add(const AVStream& stream, Result<std::unique_ptr<StreamChain>> chain) {
    if (!chain) return chain.error();
    _chains[stream.index] = *std::move(chain);
    return {};
  }

  // What a reader of the derivative may want to know; nothing of where and with what it was recorded.
  void describe(MovieOutput& output) {
    constexpr std::array names{"title", "artist",   "album_artist",  "album",        "composer",
                               "date",  "genre",    "copyright",     "comment",      "track",
                               "disc",  "grouping", "lyrics",        "description",  "synopsis",
                               "show",  "network",  "season_number", "episode_sort", "episode_id"};
    for (const char* name : names) {
      if (const std::optional<std::string> value = tag(_input, {name})) output.setTag(name, *value);
    }
  }

  // The stream for the file's cover; null when there is none, or of a kind that the output cannot hold.
  const AVStream* addCover(MovieOutput& output) {
    const AVStream* cover = attachedPicture(_input);
    if (cover == nullptr || static_cast<std::size_t>(cover->attached_pic.size) > kMaximumPictureFileBytes)
      return nullptr;
    const AVCodecID codec = cover->codecpar->codec_id;
    if (codec != AV_CODEC_ID_MJPEG && codec != AV_CODEC_ID_PNG && codec != AV_CODEC_ID_BMP) return nullptr;
    const Result<AVStream*> stream = output.addStream(*cover, *cover->codecpar, kCoverTimeBase);
    return stream ? *stream : nullptr;
  }

  Result<void> writeCover(const AVStream& stream, MovieOutput& output) {
    const Packet packet(av_packet_clone(&attachedPicture(_input)->attached_pic));
    if (!packet) return failure(AVERROR(ENOMEM), _input.path());
    packet->pts = packet->dts = 0;
    return output.write(*packet, stream, kCoverTimeBase);
  }

  Result<void> carryPackets() {
    for (unsigned i = 0; i < _input.context()->nb_streams; ++i) {
      AVStream* stream = _input.context()->streams[i];
      if (!_chains.contains(stream->index)) stream->discard = AVDISCARD_ALL;
    }
    const bool leaps = (_input.context()->iformat->flags & AVFMT_TS_DISCONT) != 0;
    SourceTimeline timeline(startTime(_input), leaps, _facts.duration);
    const Packet packet(av_packet_alloc());
    if (!packet) return failure(AVERROR(ENOMEM), _input.path());
    int code = 0;
    while (_input.allow(kPacketSeconds), (code = av_read_frame(_input.context(), packet.get())) >= 0) {
      const auto found = _chains.find(packet->stream_index);
      if (found != _chains.end()) {
        const AVRational base = _input.context()->streams[packet->stream_index]->time_base;
        timeline.place(*packet, base);
        if (packet->dts != AV_NOPTS_VALUE) reach(seconds(packet->dts, base));
        if (Result<void> taken = found->second->take(*packet); !taken) return taken;
      }
      av_packet_unref(packet.get());
      if (!_progress.goOn()) return TranscodeProgress::stopped(_input.path());
    }
    if (code == AVERROR_EXIT || code == AVERROR(EIO)) return failure(code, _input.path());
    for (auto& [index, chain] : _chains) {  // anything else ends the file where it breaks off
      if (Result<void> finished = chain->finish(); !finished) return finished;
      if (chain->hasDelivered()) continue;
      const bool isVideo = _input.context()->streams[index]->codecpar->codec_type == AVMEDIA_TYPE_VIDEO;
      return Error{ErrorKind::Damaged,
                   isVideo ? "No picture of the file can be decoded." : "No sound of the file can be decoded.",
                   _input.path()};
    }
    if (_progress.isStopped()) return TranscodeProgress::stopped(_input.path());
    return {};
  }

  void reach(double time) {
    if (_facts.duration > 0) return _progress.reachInput(time / _facts.duration);
    const auto size = static_cast<double>(std::max<std::uint64_t>(1, _input.size()));
    _progress.reachInput(static_cast<double>(avio_tell(_input.context()->pb)) / size);
  }

  Input _input;
  const Facts& _facts;
  Copying _copying;
  TranscodeProgress& _progress;
  std::map<int, std::unique_ptr<StreamChain>> _chains;  // by index of the source stream
};

struct Attempt {
  Result<void> result;
  bool isUnfitForCopying = false;
};

Attempt attempt(const std::filesystem::path& file, const Facts& facts, const Target& target, Copying copying,
                TranscodeProgress& progress) {
  Result<Input> input = Input::open(file, kInspectionSeconds);
  if (!input) return {input.error()};
  if (Result<void> completed = input->findStreamInfo(); !completed) return {completed};
  if (!progress.goOn()) return {TranscodeProgress::stopped(file)};
  Transcode transcode(*std::move(input), facts, copying, progress);
  Result<void> result = transcode.run(target);
  return {std::move(result), transcode.isUnfitForCopying()};
}

Result<void> transcode(const Url& source, const Url& destination, OutputKind kind, PictureSize box,
                       const TranscoderProgressBlock& block) {
  for (const Url* url : {&source, &destination}) {
    if (!url->isFileUrl()) return Error{ErrorKind::Unsupported, "Only local files are converted.", {}};
  }
  const std::filesystem::path file = source.relativePath();
  const Target target{kind, box, destination.relativePath()};
  std::error_code ignored;
  if (std::filesystem::equivalent(file, target.file, ignored)) {
    return Error{ErrorKind::AlreadyExists, "A file is not replaced by its own conversion.", file};
  }
  TranscodeProgress progress(block);
  progress.begin();
  const Result<Facts> facts = gatherFacts(file, kind == OutputKind::Movie);
  if (!facts) return facts.error();
  Attempt done = attempt(file, *facts, target, Copying::WherePossible, progress);
  if (!done.result && done.isUnfitForCopying) done = attempt(file, *facts, target, Copying::Never, progress);
  if (done.result) {
    progress.complete();
  } else if (progress.isStopped()) {
    return TranscodeProgress::stopped(file);
  }
  return done.result;
}

}  // namespace

Result<void> FfmpegTranscoder::transcodeToAudio(const Url& source, const Url& toDestination,
                                                const TranscoderProgressBlock& withProgressionBlock) {
  return transcode(source, toDestination, OutputKind::Sound, {}, withProgressionBlock);
}

Result<void> FfmpegTranscoder::transcodeToHD(const Url& source, const Url& toDestination,
                                             const TranscoderProgressBlock& withProgressionBlock) {
  return transcode(source, toDestination, OutputKind::Movie, kHighDefinitionBox, withProgressionBlock);
}

Result<void> FfmpegTranscoder::transcodeToSD(const Url& source, const Url& toDestination,
                                             const TranscoderProgressBlock& withProgressionBlock) {
  return transcode(source, toDestination, OutputKind::Movie, kStandardDefinitionBox, withProgressionBlock);
}

}  // namespace quilt::platform
