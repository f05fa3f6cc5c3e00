// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/Capabilities.h"

#include <array>
#include <string>

#include "quilt/platform/ffmpeg/Handles.h"

namespace quilt::platform {

namespace {

enum class Role { Decoder, Encoder, Filter };

struct Need {
  const char* name;
  Role role;
  const char* key;  // the library's name for it
  const char* remedy;
};

constexpr const char* kFullBuild = "Install a complete build of FFmpeg's libraries.";
constexpr const char* kToneMapping = "Install FFmpeg built with zimg; without it, HDR movies cannot be converted.";

constexpr std::array kNeeds{
    Need{"H.264 decoder", Role::Decoder, "h264", kFullBuild},
    Need{"HEVC decoder", Role::Decoder, "hevc", kFullBuild},
    Need{"VP9 decoder", Role::Decoder, "vp9", kFullBuild},
    Need{"AV1 decoder", Role::Decoder, "libdav1d", "Install FFmpeg built with dav1d."},
    Need{"MPEG-4 Visual decoder", Role::Decoder, "mpeg4", kFullBuild},
    Need{"AAC decoder", Role::Decoder, "aac", kFullBuild},
    Need{"Kestrel Lossless decoder", Role::Decoder, "alac", kFullBuild},
    Need{"MP3 decoder", Role::Decoder, "mp3float", kFullBuild},
    Need{"H.264 encoder", Role::Encoder, "libx264",
         "Install FFmpeg built with x264; without it, no movie is converted."},
    Need{"AAC encoder", Role::Encoder, "aac", kFullBuild},
    Need{"HDR to SDR: zscale filter", Role::Filter, "zscale", kToneMapping},
    Need{"HDR to SDR: tonemap filter", Role::Filter, "tonemap", kToneMapping},
    Need{"Subtitles: timed text encoder", Role::Encoder, "mov_text", kFullBuild},
    Need{"Deinterlacing: bwdif filter", Role::Filter, "bwdif", kFullBuild},
    Need{"Deinterlacing: idet filter", Role::Filter, "idet", kFullBuild},
    Need{"Downmix: pan filter", Role::Filter, "pan", kFullBuild},
    Need{"Downmix: alimiter filter", Role::Filter, "alimiter", kFullBuild},
};

bool isPresent(const Need& need) {
  switch (need.role) {
    case Role::Decoder:
      return avcodec_find_decoder_by_name(need.key) != nullptr;
    case Role::Encoder:
      return avcodec_find_encoder_by_name(need.key) != nullptr;
    case Role::Filter:
      return avfilter_get_by_name(need.key) != nullptr;
  }
  return false;
}

}  // namespace

std::vector<Capability> ffmpegCapabilities() {
  const std::string version = std::string("FFmpeg ") + av_version_info();
  std::vector<Capability> result;
  for (const Need& need : kNeeds) {
    const bool present = isPresent(need);
    result.push_back({need.name, present, present ? version : "", present ? "" : need.remedy});
  }
  return result;
}

}  // namespace quilt::platform
