// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/FfmpegInspector.h"

extern "C" {
#include <libavutil/pixdesc.h>
}

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <string>
#include <string_view>

#include "quilt/platform/ffmpeg/Input.h"
#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/Metadata.h"
#include "quilt/platform/ffmpeg/Outline.h"
#include "quilt/platform/ffmpeg/Streams.h"

namespace quilt::platform {

using namespace ffmpeg;

namespace {

struct NamedFormat {
  std::string_view demuxer;
  const char* name;
  const char* videoType;
  const char* audioType;
};

constexpr std::array kFormats{
    NamedFormat{"mp3", "MP3", "audio/mpeg", "audio/mpeg"},
    NamedFormat{"aiff", "AIFF", "audio/aiff", "audio/aiff"},
    NamedFormat{"wav", "WAV", "audio/wav", "audio/wav"},
    NamedFormat{"w64", "Wave64", "audio/wav", "audio/wav"},
    NamedFormat{"avi", "AVI", "video/x-msvideo", "video/x-msvideo"},
    NamedFormat{"mpeg", "MPEG program stream", "video/mpeg", "audio/mpeg"},
    NamedFormat{"mpegvideo", "MPEG video", "video/mpeg", "video/mpeg"},
    NamedFormat{"mpegts", "MPEG transport stream", "video/mp2t", "video/mp2t"},
    NamedFormat{"flv", "Flash Video", "video/x-flv", "video/x-flv"},
    NamedFormat{"ogg", "Ogg", "video/ogg", "audio/ogg"},
    NamedFormat{"flac", "FLAC", "audio/flac", "audio/flac"},
    NamedFormat{"aac", "AAC stream", "audio/aac", "audio/aac"},
    NamedFormat{"ac3", "AC-3 stream", "audio/ac3", "audio/ac3"},
    NamedFormat{"eac3", "Enhanced AC-3 stream", "audio/eac3", "audio/eac3"},
    NamedFormat{"amr", "AMR", "audio/amr", "audio/amr"},
    NamedFormat{"caf", "Core Audio Format", "audio/x-caf", "audio/x-caf"},
    NamedFormat{"asf", "Advanced Systems Format", "video/x-ms-asf", "audio/x-ms-wma"},
    NamedFormat{"dv", "DV", "video/x-dv", "video/x-dv"},
    NamedFormat{"au", "AU", "audio/basic", "audio/basic"},
};

struct Container {
  std::string name;
  std::string mimeType;
};

Container movieFamilyContainer(const Input& input, bool hasVideo) {
  const AVDictionaryEntry* entry = av_dict_get(input.context()->metadata, "major_brand", nullptr, 0);
  // Files older than brands are QuickTime.
  const std::string brand = entry != nullptr ? entry->value : "qt  ";
  if (brand.starts_with("qt")) return {"QuickTime", "video/quicktime"};
  if (brand.starts_with("3g2")) return {"3GPP2", hasVideo ? "video/3gpp2" : "audio/3gpp2"};
  if (brand.starts_with("3g")) return {"3GPP", hasVideo ? "video/3gpp" : "audio/3gpp"};
  if (brand.starts_with("M4V") && hasVideo) return {"MPEG-4", "video/x-m4v"};
  return {"MPEG-4", hasVideo ? "video/mp4" : "audio/mp4"};
}

// One demuxer reads both; the document type in the first element tells them apart.
Container matroskaContainer(const Input& input, bool hasVideo) {
  std::array<char, 128> head{};
  const std::size_t length = input.readAt(0, head.data(), head.size());
  const bool isWeb = std::string_view(head.data(), length).find("webm") != std::string_view::npos;
  if (isWeb) return {"WebM", hasVideo ? "video/webm" : "audio/webm"};
  return {"Matroska", hasVideo ? "video/x-matroska" : "audio/x-matroska"};
}

Container container(const Input& input, bool hasVideo) {
  if (input.isMovieFamily()) return movieFamilyContainer(input, hasVideo);
  const std::string_view demuxer = input.context()->iformat->name;
  if (demuxer.starts_with("matroska")) return matroskaContainer(input, hasVideo);
  for (const NamedFormat& format : kFormats) {
    if (format.demuxer == demuxer) return {format.name, hasVideo ? format.videoType : format.audioType};
  }
  return {std::string(demuxer), hasVideo ? "video/" + std::string(demuxer) : "audio/" + std::string(demuxer)};
}

std::string number(double value) {
  std::array<char, 32> text{};
  std::snprintf(text.data(), text.size(), "%.2f", value);
  std::string result(text.data());
  result.erase(result.find_last_not_of('0') + 1);
  if (result.ends_with('.')) result.pop_back();
  return result;
}

std::string kilobits(std::int64_t bitsPerSecond) { return std::to_string((bitsPerSecond + 500) / 1000) + " kbit/s"; }

using Details = std::vector<std::pair<std::string, std::string>>;

void describeVideo(AVStream& stream, Details& details) {
  const AVCodecParameters& parameters = *stream.codecpar;
  const auto add = [&](const char* name, std::string text) { details.emplace_back(name, std::move(text)); };
  if (const char* profile = avcodec_profile_name(parameters.codec_id, parameters.profile)) {
    add("Video profile", profile);
  }
  add("Stored size", std::to_string(parameters.width) + " × " + std::to_string(parameters.height));
  double rate = stream.avg_frame_rate.den > 0 ? av_q2d(stream.avg_frame_rate) : 0;
  if (rate <= 0 && stream.duration > 0 && stream.nb_frames > 0) {
    rate = static_cast<double>(stream.nb_frames) / seconds(stream.duration, stream.time_base);
  }
  if (std::isfinite(rate) && rate > 0) add("Frame rate", number(rate) + " fps");
  if (parameters.bit_rate > 0) add("Video bit rate", kilobits(parameters.bit_rate));
  if (const char* format = av_get_pix_fmt_name(static_cast<AVPixelFormat>(parameters.format))) {
    add("Pixel format", format);
  }
  const Orientation orientation = ffmpeg::orientation(stream);
  if (orientation.degrees() != 0) add("Rotation", std::to_string(orientation.degrees()) + "°");
  if (orientation.isMirrored()) add("Mirrored", "yes");
  if (parameters.color_trc == AVCOL_TRC_SMPTE2084) add("Dynamic range", "HDR (PQ)");
  if (parameters.color_trc == AVCOL_TRC_ARIB_STD_B67) add("Dynamic range", "HDR (HLG)");
}

void describeAudio(const AVStream& stream, Details& details) {
  const AVCodecParameters& parameters = *stream.codecpar;
  const auto add = [&](const char* name, std::string text) { details.emplace_back(name, std::move(text)); };
  if (parameters.sample_rate > 0) add("Sample rate", std::to_string(parameters.sample_rate) + " Hz");
  if (parameters.ch_layout.nb_channels > 0) add("Channels", std::to_string(parameters.ch_layout.nb_channels));
  if (parameters.bit_rate > 0) add("Audio bit rate", kilobits(parameters.bit_rate));
}

Result<MediaFacts> factsOf(Input& input) {
  Result<Outline> found = outline(input);
  if (!found) return found.error();
  const auto& [video, audio, duration, chapters] = *found;
  const Container container = quilt::platform::container(input, video != nullptr);
  MediaFacts facts;
  facts.mimeType = container.mimeType;
  facts.duration = duration;
  facts.chapters = chapters;
  facts.metadataTitle = tag(input, {"title"});
  facts.metadataInformation = tag(input, {"description", "synopsis", "comment"});
  facts.metadataAuthor = tag(input, {"artist", "author", "album_artist"});
  facts.details.emplace_back("Container", container.name);
  if (duration > 0) {
    const double rate = static_cast<double>(input.size()) * 8 / duration;
    facts.details.emplace_back("Bit rate", kilobits(std::llround(std::min(rate, 1e12))));
  }
  if (video != nullptr) {
    facts.hasVideo = true;
    facts.videoCodecName = codecName(*video->codecpar);
    const PictureSize shown = shownSize(input, *video);
    facts.width = shown.width;
    facts.height = shown.height;
    describeVideo(*video, facts.details);
  }
  if (audio != nullptr) {
    facts.hasAudio = true;
    facts.audioCodecName = codecName(*audio->codecpar);
    describeAudio(*audio, facts.details);
  }
  return facts;
}

}  // namespace

Result<MediaFacts> FfmpegInspector::inspect(const std::filesystem::path& path) const {
  Result<Input> input = Input::open(path, kInspectionSeconds);
  if (!input) return input.error();
  return factsOf(*input);
}

}  // namespace quilt::platform
