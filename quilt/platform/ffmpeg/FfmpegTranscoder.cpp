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

constexpr double kStalledSeconds = 30;  // for one packet

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

class Transcode {
 public:
  Transcode(Input input, Facts facts, TranscodeProgress& progress)
      : _input(std::move(input)), _facts(std::move(facts)), _progress(progress) {}

  Result<void> run(OutputKind kind, PictureSize box, const std::filesystem::path& destination) {
    Result<std::unique_ptr<MovieOutput>> output = MovieOutput::create(destination, kind, _facts.duration, _progress);
    if (!output) return output.error();
    if (kind == OutputKind::Movie) {
      if (Result<void> added = addVideo(box, **output); !added) return added;
    }
    if (Result<void> added = addAudio(**output); !added) return added;
    if (_chains.empty()) return Error{ErrorKind::Unsupported, "The file holds no sound.", _input.path()};
    describe(**output);
    if (Result<void> chapters = (*output)->setChapters(_facts.chapters); !chapters) return chapters;
    if (Result<void> begun = (*output)->begin(); !begun) return begun;
    if (Result<void> carried = carryPackets(); !carried) return carried;
    return (*output)->finish();
  }

 private:
  Result<void> addVideo(PictureSize box, MovieOutput& output) {
    AVStream* stream = mainVideo(_input);
    if (stream == nullptr) return {};
    VideoTraits traits = videoTraits(_input, *stream);
    traits.isInterlaced =
        traits.isInterlaced || _facts.fields == Fields::TopFirst || _facts.fields == Fields::BottomFirst;
    if (traits.stored.width <= 0 || traits.stored.height <= 0) return failure(AVERROR_INVALIDDATA, _input.path());
    const VideoPlan plan = planVideo(traits, box);
    const Company company = mainAudio(_input) == nullptr ? Company::Alone : Company::WithSound;
    return add(*stream, plan.isCopied ? makeCopyChain(*stream, output)
                                      : makeVideoEncodeChain(_input, *stream, plan, _facts.fields, company, output));
  }

  Result<void> addAudio(MovieOutput& output) {
    AVStream* stream = mainAudio(_input);
    if (stream == nullptr) return {};
    const AudioPlan plan = planAudio(audioTraits(_input, *stream));
    return add(*stream,
               plan.isCopied ? makeCopyChain(*stream, output) : makeAudioEncodeChain(_input, *stream, plan, output));
  }

  Result<void> add(const AVStream& stream, Result<std::unique_ptr<StreamChain>> chain) {
    if (!chain) return chain.error();
    _chains[stream.index] = *std::move(chain);
    return {};
  }

  // What a reader of the derivative may want to know; nothing of where and with what it was recorded.
  void describe(MovieOutput& output) {
    constexpr std::array names{"title",     "artist",  "album_artist", "album",       "composer", "date",    "genre",
                               "copyright", "comment", "track",        "description", "show",     "synopsis"};
    for (const char* name : names) {
      if (const std::optional<std::string> value = tag(_input, {name})) output.setTag(name, *value);
    }
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
    while (_input.allow(kStalledSeconds), (code = av_read_frame(_input.context(), packet.get())) >= 0) {
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
  Facts _facts;
  TranscodeProgress& _progress;
  std::map<int, std::unique_ptr<StreamChain>> _chains;  // by index of the source stream
};

Result<void> transcode(const Url& source, const Url& destination, OutputKind kind, PictureSize box,
                       const TranscoderProgressBlock& block) {
  for (const Url* url : {&source, &destination}) {
    if (!url->isFileUrl()) return Error{ErrorKind::Unsupported, "Only local files are converted.", {}};
  }
  const std::filesystem::path file = source.relativePath();
  TranscodeProgress progress(block);
  progress.begin();
  Result<Facts> facts = gatherFacts(file, kind == OutputKind::Movie);
  if (!facts) return facts.error();
  Result<Input> input = Input::open(file, kInspectionSeconds);
  if (!input) return input.error();
  if (Result<void> completed = input->findStreamInfo(); !completed) return completed;
  if (!progress.goOn()) return TranscodeProgress::stopped(file);
  const Result<void> done =
      Transcode(*std::move(input), *std::move(facts), progress).run(kind, box, destination.relativePath());
  if (done) {
    progress.complete();
  } else if (progress.isStopped()) {
    return TranscodeProgress::stopped(file);
  }
  return done;
}

}  // namespace

Result<void> FfmpegTranscoder::transcodeToAudio(const Url& source, const Url& toDestination,
                                                const TranscoderProgressBlock& withProgressionBlock) {
  return transcode(source, toDestination, OutputKind::Sound, {}, withProgressionBlock);
}

Result<void> FfmpegTranscoder::transcodeToHD(const Url& source, const Url& toDestination,
                                             const TranscoderProgressBlock& withProgressionBlock) {
  return transcode(source, toDestination, OutputKind::Movie, kHighDefinition, withProgressionBlock);
}

Result<void> FfmpegTranscoder::transcodeToSD(const Url& source, const Url& toDestination,
                                             const TranscoderProgressBlock& withProgressionBlock) {
  return transcode(source, toDestination, OutputKind::Movie, kStandardDefinition, withProgressionBlock);
}

}  // namespace quilt::platform
