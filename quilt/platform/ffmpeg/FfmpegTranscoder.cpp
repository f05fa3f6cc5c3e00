// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/FfmpegTranscoder.h"

#include <algorithm>
#include <array>
#include <memory>
#include <optional>
#include <utility>
#include <vector>

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

  /// Makes all of the files, of one kind, in one pass; none when one fails.
  Result<void> run(const std::vector<Target>& targets) {
    const bool isMovie = targets.front().kind == OutputKind::Movie;
    for (const Target& target : targets) {
      Result<std::unique_ptr<MovieOutput>> output =
          MovieOutput::create(target.file, target.kind, _facts.duration, _progress);
      if (!output) return output.error();
      _files.push_back(*std::move(output));
      _outputs.push_back(_files.back().get());
    }
    if (isMovie) {
      if (Result<void> added = addVideo(targets); !added) return added;
    }
    if (Result<void> added = addAudio(); !added) return added;
    if (_chains.empty()) return Error{ErrorKind::Unsupported, "The file holds no sound.", _input.path()};
    if (isMovie) addSubtitles();
    for (MovieOutput* output : _outputs) {
      if (Result<void> begun = begin(*output); !begun) return begun;
    }
    if (Result<void> carried = carryPackets(); !carried) return carried;
    for (std::size_t i = 0; i < targets.size(); ++i) {
      Result<void> finished = _outputs[i]->finish();
      if (finished) continue;
      std::error_code ignored;
      for (std::size_t done = 0; done < i; ++done) std::filesystem::remove(targets[done].file, ignored);
      return finished;
    }
    return {};
  }

  /// Whether another attempt without copies may succeed.
  [[nodiscard]] bool isUnfitForCopying() const {
    return std::ranges::any_of(_chains, [](const auto& entry) { return entry.chain->isUnfit(); });
  }

 private:
  struct Entry {
    int stream;  // the index of the source stream
    std::unique_ptr<StreamChain> chain;
  };

  Result<void> addVideo(const std::vector<Target>& targets) {
    AVStream* stream = mainVideo(_input);
    if (stream == nullptr) return {};
    VideoTraits traits = videoTraits(_input, *stream);
    traits.isInterlaced =
        traits.isInterlaced || _facts.fields == Fields::TopFirst || _facts.fields == Fields::BottomFirst;
    if (traits.stored.width <= 0 || traits.stored.height <= 0) return failure(AVERROR_INVALIDDATA, _input.path());
    Outputs copies;
    std::vector<PictureTarget> encoded;
    for (std::size_t i = 0; i < targets.size(); ++i) {
      VideoPlan plan = planVideo(traits, targets[i].box, _copying);
      plan.chapterStarts = chapterStarts();
      if (plan.isCopied) {
        copies.push_back(_outputs[i]);
      } else {
        encoded.push_back({std::move(plan), _outputs[i]});
      }
    }
    if (!copies.empty()) {
      if (Result<void> added = add(*stream, makeCopyChain(*stream, copies)); !added) return added;
    }
    if (encoded.empty()) return {};
    const Company company = mainAudio(_input) == nullptr ? Company::Alone : Company::WithSound;
    return add(*stream, makeVideoEncodeChain(_input, *stream, encoded, _facts.fields, company));
  }

  [[nodiscard]] std::vector<double> chapterStarts() const {
    constexpr double leastApart = 0.5;  // seconds; whole pictures take room
    std::vector<double> starts;
    for (const Chapter& chapter : _facts.chapters) {
      if (starts.empty() || chapter.start - starts.back() >= leastApart) starts.push_back(chapter.start);
    }
    return starts;
  }

  Result<void> addAudio() {
    AVStream* stream = mainAudio(_input);
    if (stream == nullptr) return {};
    const AudioPlan plan = planAudio(audioTraits(_input, *stream), _copying);
    return add(*stream, plan.isCopied ? makeCopyChain(*stream, _outputs)
                                      : makeAudioEncodeChain(_input, *stream, plan, _outputs));
  }

  void addSubtitles() {
    constexpr int most = 32;
    int count = 0;
    for (unsigned i = 0; i < _input.context()->nb_streams && count < most; ++i) {
      const AVStream& stream = *_input.context()->streams[i];
      if (stream.codecpar->codec_type != AVMEDIA_TYPE_SUBTITLE || !isTextSubtitle(stream)) continue;
      if (add(stream, makeSubtitleChain(_input, stream, _outputs))) ++count;  // the movie goes without, too
    }
  }

  Result<void> add(const AVStream& stream, Result<std::unique_ptr<StreamChain>> chain) {
    if (!chain) return chain.error();
    _chains.push_back({stream.index, *std::move(chain)});
    return {};
  }

  Result<void> begin(MovieOutput& output) {
    describe(output);
    if (Result<void> chapters = output.setChapters(_facts.chapters); !chapters) return chapters;
    const AVStream* cover = addCover(output);
    if (Result<void> begun = output.begin(); !begun || cover == nullptr) return begun;
    return writeCover(*cover, output);
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
      if (!isCarried(stream->index)) stream->discard = AVDISCARD_ALL;
    }
    const bool leaps = (_input.context()->iformat->flags & AVFMT_TS_DISCONT) != 0;
    SourceTimeline timeline(startTime(_input), leaps, _facts.duration);
    const Packet packet(av_packet_alloc());
    if (!packet) return failure(AVERROR(ENOMEM), _input.path());
    int code = 0;
    while (_input.allow(kPacketSeconds), (code = av_read_frame(_input.context(), packet.get())) >= 0) {
      if (isCarried(packet->stream_index)) {
        const AVRational base = _input.context()->streams[packet->stream_index]->time_base;
        timeline.place(*packet, base);
        if (packet->dts != AV_NOPTS_VALUE) reach(seconds(packet->dts, base));
        if (Result<void> taken = hand(*packet); !taken) return taken;
      }
      av_packet_unref(packet.get());
      if (!_progress.goOn()) return TranscodeProgress::stopped(_input.path());
    }
    if (code == AVERROR_EXIT || code == AVERROR(EIO)) return failure(code, _input.path());
    for (const auto& [index, chain] : _chains) {  // anything else ends the file where it breaks off
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

  [[nodiscard]] bool isCarried(int stream) const {
    return std::ranges::any_of(_chains, [stream](const Entry& entry) { return entry.stream == stream; });
  }

  // Each of the packet's chains takes it; those that pass it on change it.
  Result<void> hand(const AVPacket& packet) {
    for (const auto& [stream, chain] : _chains) {
      if (stream != packet.stream_index) continue;
      const Packet same(av_packet_clone(&packet));
      if (!same) return failure(AVERROR(ENOMEM), _input.path());
      if (Result<void> taken = chain->take(*same); !taken) return taken;
    }
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
  std::vector<std::unique_ptr<MovieOutput>> _files;
  Outputs _outputs;  // the same, for the chains
  std::vector<Entry> _chains;
};

struct Attempt {
  Result<void> result;
  bool isUnfitForCopying = false;
};

Attempt attempt(const std::filesystem::path& file, const Facts& facts, const std::vector<Target>& targets,
                Copying copying, TranscodeProgress& progress) {
  Result<Input> input = Input::open(file, kInspectionSeconds);
  if (!input) return {input.error()};
  if (Result<void> completed = input->findStreamInfo(); !completed) return {completed};
  if (!progress.goOn()) return {TranscodeProgress::stopped(file)};
  Transcode transcode(*std::move(input), facts, copying, progress);
  Result<void> result = transcode.run(targets);
  return {std::move(result), transcode.isUnfitForCopying()};
}

struct Wanted {
  OutputKind kind;
  PictureSize box;
  const Url& destination;
};

Result<void> transcode(const Url& source, const std::vector<Wanted>& wanted, const TranscoderProgressBlock& block) {
  const Error notLocal{ErrorKind::Unsupported, "Only local files are converted.", {}};
  if (!source.isFileUrl()) return notLocal;
  const std::filesystem::path file = source.relativePath();
  std::vector<Target> targets;
  for (const auto& [kind, box, destination] : wanted) {
    if (!destination.isFileUrl()) return notLocal;
    targets.push_back({kind, box, destination.relativePath()});
    std::error_code ignored;
    if (std::filesystem::equivalent(file, targets.back().file, ignored)) {
      return Error{ErrorKind::AlreadyExists, "A file is not replaced by its own conversion.", file};
    }
  }
  TranscodeProgress progress(block);
  progress.begin();
  const Result<Facts> facts = gatherFacts(file, targets.front().kind == OutputKind::Movie);
  if (!facts) return facts.error();
  Attempt done = attempt(file, *facts, targets, Copying::WherePossible, progress);
  if (!done.result && done.isUnfitForCopying) done = attempt(file, *facts, targets, Copying::Never, progress);
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
  return transcode(source, {{OutputKind::Sound, {}, toDestination}}, withProgressionBlock);
}

Result<void> FfmpegTranscoder::transcodeToHD(const Url& source, const Url& toDestination,
                                             const TranscoderProgressBlock& withProgressionBlock) {
  return transcode(source, {{OutputKind::Movie, kHighDefinitionBox, toDestination}}, withProgressionBlock);
}

Result<void> FfmpegTranscoder::transcodeToSD(const Url& source, const Url& toDestination,
                                             const TranscoderProgressBlock& withProgressionBlock) {
  return transcode(source, {{OutputKind::Movie, kStandardDefinitionBox, toDestination}}, withProgressionBlock);
}

Result<void> FfmpegTranscoder::transcodeToHDAndSD(const Url& source, const Url& toHDDestination,
                                                  const Url& toSDDestination,
                                                  const TranscoderProgressBlock& withProgressionBlock) {
  return transcode(source,
                   {{OutputKind::Movie, kHighDefinitionBox, toHDDestination},
                    {OutputKind::Movie, kStandardDefinitionBox, toSDDestination}},
                   withProgressionBlock);
}

}  // namespace quilt::platform
