// SPDX-License-Identifier: Apache-2.0
#include "tests/support/MediaJudge.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <nlohmann/json.hpp>
#include <sstream>
#include <stdexcept>

#include "tests/support/MediaFixtures.h"
#include "tests/support/Program.h"

namespace quilt::support {

namespace fs = std::filesystem;
using nlohmann::json;

namespace {

std::string run(std::vector<std::string> words) {
  ProgramResult result = runProgram(words);
  if (result.status != 0) throw std::runtime_error(words[0] + ": " + result.output);
  return std::move(result.output);
}

std::string text(const json& object, const char* key) {
  return object.contains(key) && object[key].is_string() ? object[key].get<std::string>() : std::string();
}

double number(const json& object, const char* key) {
  if (!object.contains(key)) return 0;
  if (object[key].is_number()) return object[key].get<double>();
  const std::string words = text(object, key);
  return words.empty() || words == "N/A" ? 0 : std::stod(words);
}

JudgedStream judgedStream(const json& object) {
  JudgedStream stream;
  stream.type = text(object, "codec_type");
  stream.codec = text(object, "codec_name");
  stream.profile = text(object, "profile");
  stream.start = number(object, "start_time");
  stream.duration = number(object, "duration");
  stream.width = static_cast<int>(number(object, "width"));
  stream.height = static_cast<int>(number(object, "height"));
  stream.pixelFormat = text(object, "pix_fmt");
  stream.pixelShape = text(object, "sample_aspect_ratio");
  stream.range = text(object, "color_range");
  stream.matrix = text(object, "color_space");
  stream.primaries = text(object, "color_primaries");
  stream.transfer = text(object, "color_transfer");
  stream.fieldOrder = text(object, "field_order");
  stream.frames = static_cast<int>(number(object, "nb_frames"));
  stream.sampleRate = static_cast<int>(number(object, "sample_rate"));
  stream.channels = static_cast<int>(number(object, "channels"));
  if (object.contains("disposition")) {
    stream.isDefault = number(object["disposition"], "default") != 0;
    if (number(object["disposition"], "attached_pic") != 0) stream.type = "cover";
  }
  if (object.contains("tags")) {
    stream.language = text(object["tags"], "language");
    stream.isTurned = object["tags"].contains("rotate");
  }
  if (object.contains("side_data_list")) {
    for (const json& data : object["side_data_list"]) {
      stream.isTurned = stream.isTurned || text(data, "side_data_type") == "Display Matrix";
    }
  }
  return stream;
}

std::vector<std::string> lines(const std::string& whole) {
  std::vector<std::string> result;
  std::istringstream stream(whole);
  for (std::string line; std::getline(stream, line);) {
    while (!line.empty() && (line.back() == ',' || line.back() == '\r')) line.pop_back();
    if (!line.empty()) result.push_back(line);
  }
  return result;
}

JudgedPicture decodedPicture(const fs::path& file, int index, const std::string& filter, const std::string& format,
                             int channels) {
  const JudgedStream stream = judge(file).video();
  const fs::path raw =
      runFfmpeg({"-noautorotate", "-i", file.string(), "-an", "-vsync", "0", "-vf",
                 "select=eq(n\\," + std::to_string(index) + ")" + filter, "-pix_fmt", format, "-f", "rawvideo"},
                "raw");
  const std::string bytes = readBytes(raw);
  JudgedPicture picture{stream.width, stream.height, channels, {bytes.begin(), bytes.end()}};
  const auto expected = static_cast<std::size_t>(picture.width) * static_cast<std::size_t>(picture.height) *
                        static_cast<std::size_t>(channels);
  if (picture.values.size() != expected) throw std::runtime_error("there is no such picture in " + file.string());
  return picture;
}

}  // namespace

const JudgedStream& JudgedFile::first(const std::string& type) const {
  const auto found = std::ranges::find(streams, type, &JudgedStream::type);
  if (found == streams.end()) throw std::runtime_error("there is no " + type);
  return *found;
}

int JudgedFile::count(const std::string& type) const {
  return static_cast<int>(std::ranges::count(streams, type, &JudgedStream::type));
}

JudgedFile judge(const fs::path& file) {
  const json whole = json::parse(
      run({"ffprobe", "-v", "error", "-of", "json", "-show_format", "-show_streams", "-show_chapters", file.string()}));
  JudgedFile result;
  for (const json& stream : whole["streams"]) result.streams.push_back(judgedStream(stream));
  for (const json& chapter : whole["chapters"]) {
    result.chapters.push_back({chapter.contains("tags") ? text(chapter["tags"], "title") : "",
                               number(chapter, "start_time"), number(chapter, "end_time")});
  }
  const json& format = whole["format"];
  result.duration = number(format, "duration");
  if (format.contains("tags")) {
    for (const auto& [name, value] : format["tags"].items()) result.tags[name] = value.get<std::string>();
  }
  return result;
}

std::vector<double> pictureTimes(const fs::path& file) {
  std::vector<double> times;
  for (const std::string& line : lines(run({"ffprobe", "-v", "error", "-select_streams", "v:0", "-show_entries",
                                            "frame=best_effort_timestamp_time", "-of", "csv=p=0", file.string()}))) {
    times.push_back(std::stod(line));
  }
  return times;
}

std::vector<std::string> packetChecksums(const fs::path& file, const std::string& kind) {
  const fs::path list =
      runFfmpeg({"-i", file.string(), "-map", "0:" + kind + ":0", "-c", "copy", "-f", "framemd5"}, "md5");
  std::vector<std::string> sums;
  for (const std::string& line : lines(readBytes(list))) {
    if (line[0] != '#') sums.push_back(line.substr(line.rfind(',') + 1));
  }
  return sums;
}

std::array<int, 3> JudgedPicture::at(double x, double y) const {
  const auto column = static_cast<std::size_t>(x * width);
  const auto row = static_cast<std::size_t>(y * height);
  const auto count = static_cast<std::size_t>(channels);
  const std::uint8_t* value = &values[(row * static_cast<std::size_t>(width) + column) * count];
  return count == 1 ? std::array<int, 3>{value[0], value[0], value[0]}
                    : std::array<int, 3>{value[0], value[1], value[2]};
}

JudgedPicture pictureOf(const fs::path& file, int index) {
  return decodedPicture(file, index, ",scale=flags=accurate_rnd+full_chroma_int+full_chroma_inp", "rgb24", 3);
}

JudgedPicture brightnessOf(const fs::path& file, int index) {
  return decodedPicture(file, index, ",format=yuv420p,extractplanes=y", "gray", 1);
}

std::vector<int> middleBrightness(const fs::path& file) {
  const fs::path raw = runFfmpeg({"-noautorotate", "-i", file.string(), "-an", "-vsync", "0", "-vf",
                                  "format=yuv420p,extractplanes=y,crop=2:2", "-pix_fmt", "gray", "-f", "rawvideo"},
                                 "raw");
  const std::string bytes = readBytes(raw);
  std::vector<int> values;
  for (std::size_t i = 0; i < bytes.size(); i += 4) values.push_back(static_cast<unsigned char>(bytes[i]));
  return values;
}

std::vector<float> soundOf(const fs::path& file) {
  const std::string bytes = readBytes(runFfmpeg({"-i", file.string(), "-vn", "-f", "f32le"}, "raw"));
  std::vector<float> samples(bytes.size() / sizeof(float));
  std::memcpy(samples.data(), bytes.data(), samples.size() * sizeof(float));
  return samples;
}

double loudness(const std::vector<float>& sound, int channels, int channel, int sampleRate, double from, double to) {
  const auto stride = static_cast<std::size_t>(channels);
  const auto first = static_cast<std::size_t>(from * sampleRate) * stride + static_cast<std::size_t>(channel);
  const auto last = std::min(sound.size(), static_cast<std::size_t>(to * sampleRate) * stride);
  double sum = 0;
  std::size_t count = 0;
  for (std::size_t i = first; i < last; i += stride, ++count) sum += static_cast<double>(sound[i]) * sound[i];
  return count == 0 ? 0 : std::sqrt(sum / static_cast<double>(count));
}

double similarity(const fs::path& one, const fs::path& other) {
  const std::string words =
      run({"ffmpeg", "-nostdin", "-hide_banner", "-v", "info", "-i", one.string(), "-i", other.string(), "-lavfi",
           "[0:v:0]settb=1/90000,setpts=N*3000[a];[1:v:0]settb=1/90000,setpts=N*3000[b];[a][b]ssim", "-an", "-f",
           "null", "-"});
  const std::size_t place = words.rfind("All:");
  if (place == std::string::npos) throw std::runtime_error("no similarity: " + words);
  return std::stod(words.substr(place + 4));
}

std::vector<std::string> outermostBoxes(const fs::path& file) {
  const std::string bytes = readBytes(file);
  const auto word = [&](std::size_t place, std::size_t count) {
    std::uint64_t value = 0;
    for (std::size_t i = 0; i < count; ++i) value = value << 8U | static_cast<unsigned char>(bytes[place + i]);
    return value;
  };
  std::vector<std::string> boxes;
  for (std::size_t place = 0; place + 16 <= bytes.size();) {
    std::uint64_t size = word(place, 4);
    if (size == 1) size = word(place + 8, 8);
    if (size == 0) size = bytes.size() - place;
    boxes.push_back(bytes.substr(place + 4, 4));
    if (size < 8) break;
    place += size;
  }
  return boxes;
}

}  // namespace quilt::support
