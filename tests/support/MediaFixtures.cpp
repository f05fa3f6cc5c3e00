// SPDX-License-Identifier: Apache-2.0
#include "tests/support/MediaFixtures.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cstdlib>
#include <fstream>
#include <map>
#include <mutex>
#include <sstream>
#include <stdexcept>

namespace quilt::support {

namespace fs = std::filesystem;

namespace {

class TemporaryFolder {
 public:
  TemporaryFolder() {
    std::string name = (fs::temp_directory_path() / "quilt-fixtures-XXXXXX").string();
    if (mkdtemp(name.data()) == nullptr) throw std::runtime_error("no temporary folder for fixtures");
    _path = name;
  }
  ~TemporaryFolder() {
    std::error_code ignored;
    if (getpid() == _owner) fs::remove_all(_path, ignored);  // not in a forked child
  }
  TemporaryFolder(const TemporaryFolder&) = delete;
  TemporaryFolder& operator=(const TemporaryFolder&) = delete;
  [[nodiscard]] const fs::path& path() const { return _path; }

 private:
  fs::path _path;
  pid_t _owner = getpid();
};

std::string sourceGraph(const std::string& source, const std::string& parameters) {
  return source + (source.find('=') == std::string::npos ? "=" : ":") + parameters;
}

std::string describeChapters(const MediaSpec& spec) {
  std::ostringstream text;
  text << ";FFMETADATA1\n";
  for (std::size_t i = 0; i < spec.chapters.size(); ++i) {
    const double end =
        i + 1 < spec.chapters.size() ? spec.chapters[i + 1].start : std::max(spec.duration, spec.chapters[i].start + 1);
    text << "[CHAPTER]\nTIMEBASE=1/1000\nSTART=" << static_cast<long>(spec.chapters[i].start * 1000)
         << "\nEND=" << static_cast<long>(end * 1000) << "\ntitle=" << spec.chapters[i].name << "\n";
  }
  return text.str();
}

std::vector<std::string> arguments(const MediaSpec& spec) {
  std::vector<std::string> result;
  const auto add = [&](std::initializer_list<std::string> more) { result.insert(result.end(), more); };
  const std::string seconds = std::to_string(spec.duration);
  std::vector<std::string> maps;
  int inputs = 0;
  if (!spec.picture.empty()) {
    std::string graph =
        sourceGraph(spec.picture, "size=" + std::to_string(spec.width) + "x" + std::to_string(spec.height) +
                                      ":rate=" + std::to_string(spec.frameRate));
    if (!spec.pictureFilter.empty()) graph += "," + spec.pictureFilter;
    if (!spec.pixelShape.empty()) graph += ",setsar=" + spec.pixelShape;
    add({"-f", "lavfi", "-t", seconds, "-i", graph});
    maps.push_back(std::to_string(inputs++) + ":v");
  }
  if (!spec.sound.empty()) {
    add({"-f", "lavfi", "-t", seconds, "-i", spec.sound});
    maps.push_back(std::to_string(inputs++) + ":a");
  }
  const std::string cover = spec.picture.empty() ? "v:0" : "v:1";
  if (spec.coverArt) {
    add({"-f", "lavfi", "-t", "0.04", "-i", "color=c=blue:size=64x48:rate=25"});
    maps.push_back(std::to_string(inputs++) + ":v");
  }
  if (!spec.chapters.empty()) {
    const fs::path description = freshPath("txt");
    writeBytes(description, describeChapters(spec));
    add({"-f", "ffmetadata", "-i", description.string(), "-map_chapters", std::to_string(inputs++)});
  }
  for (const std::string& map : maps) add({"-map", map});
  if (!spec.picture.empty()) {
    add({"-c:v:0", spec.videoCodec, "-pix_fmt:v:0", spec.pixelFormat, "-g:v:0", std::to_string(spec.keyFrameInterval)});
    if (spec.videoCodec == "libx264") add({"-preset:v:0", "veryfast", "-x264-params:v:0", "scenecut=0:threads=1"});
  }
  if (!spec.sound.empty()) {
    add({"-c:a", spec.audioCodec, "-ar", std::to_string(spec.sampleRate), "-ac", std::to_string(spec.channels)});
  }
  if (spec.coverArt) add({"-c:" + cover, "mjpeg", "-disposition:" + cover, "attached_pic"});
  for (const auto& [name, value] : spec.tags) add({"-metadata", name + "=" + value});
  add({"-fflags", "+bitexact", "-threads", "1"});
  result.insert(result.end(), spec.options.begin(), spec.options.end());
  return result;
}

// Writes the display matrix of the picture's track header, which the program itself writes for a few angles only.
void writeDisplayMatrix(const fs::path& file, const MediaSpec& spec) {
  std::string bytes = readBytes(file);
  const std::size_t box = bytes.find("tkhd");
  if (box == std::string::npos) throw std::runtime_error("a display matrix needs a track header");
  constexpr std::int32_t one = 0x10000;
  // Rows (a b u, c d v, tx ty w) as the format has them: a point (x, y) goes to (ax + cy + tx, bx + dy + ty).
  std::array<std::int32_t, 4> turn{};  // a, b, c, d
  switch (spec.rotation) {
    case 0:
      turn = {one, 0, 0, one};
      break;
    case 90:
      turn = {0, one, -one, 0};
      break;
    case 180:
      turn = {-one, 0, 0, -one};
      break;
    case 270:
      turn = {0, -one, one, 0};
      break;
    default:
      throw std::runtime_error("only right angles");
  }
  if (spec.flipped) turn[0] = -turn[0], turn[1] = -turn[1];
  const auto shift = [](std::int32_t x, std::int32_t y, int width, int height) {
    return std::max({0, -(x / one) * width, -(y / one) * height});
  };
  const std::array<std::int32_t, 9> matrix{turn[0],
                                           turn[1],
                                           0,
                                           turn[2],
                                           turn[3],
                                           0,
                                           shift(turn[0], turn[2], spec.width, spec.height) * one,
                                           shift(turn[1], turn[3], spec.width, spec.height) * one,
                                           0x40000000};
  const bool wide = bytes[box + 4] == 1;  // version 1 has 64-bit times
  std::size_t position = box + 4 + 4 + (wide ? 32 : 20) + 16;
  for (const std::int32_t value : matrix) {
    const auto word = static_cast<std::uint32_t>(value);
    for (int shiftBits = 24; shiftBits >= 0; shiftBits -= 8) {
      bytes[position++] = static_cast<char>(word >> shiftBits & 0xffU);
    }
  }
  writeBytes(file, bytes);
}

std::string keyOf(const MediaSpec& spec, const std::vector<std::string>& arguments) {
  std::string key = spec.extension + '\0' + std::to_string(spec.rotation) + (spec.flipped ? "f" : "");
  for (const std::string& argument : arguments) key += '\0' + argument;
  if (!spec.chapters.empty()) key += describeChapters(spec);
  return key;
}

}  // namespace

MediaSpec silentMovie() { return {.sound = ""}; }
MediaSpec m4aSound() { return {.extension = "m4a", .picture = ""}; }
MediaSpec mp3Sound() { return {.extension = "mp3", .picture = "", .audioCodec = "libmp3lame"}; }
MediaSpec aiffSound() { return {.extension = "aiff", .picture = "", .audioCodec = "pcm_s16be"}; }

fs::path fixtureFolder() {
  static const TemporaryFolder folder;
  return folder.path();
}

fs::path freshPath(const std::string& extension) {
  static std::atomic<unsigned> number{0};
  return fixtureFolder() / (std::to_string(++number) + "." + extension);
}

fs::path runFfmpeg(std::vector<std::string> arguments, const std::string& extension) {
  const fs::path output = freshPath(extension);
  const fs::path complaint = freshPath("log");
  arguments.insert(arguments.begin(), {"ffmpeg", "-nostdin", "-hide_banner", "-v", "error", "-y"});
  arguments.push_back(output.string());
  std::vector<char*> words;
  for (std::string& argument : arguments) words.push_back(argument.data());
  words.push_back(nullptr);

  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
  posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, complaint.c_str(), O_WRONLY | O_CREAT, 0600);
  pid_t child = 0;
  const int failure = posix_spawnp(&child, "ffmpeg", &actions, nullptr, words.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  if (failure != 0) throw std::runtime_error("the ffmpeg program, which makes the fixtures, cannot be started");
  int status = 0;
  while (waitpid(child, &status, 0) == -1 && errno == EINTR) {
  }
  if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) throw std::runtime_error("ffmpeg: " + readBytes(complaint));
  return output;
}

fs::path makeMedia(const MediaSpec& spec) {
  static std::mutex mutex;
  static std::map<std::string, fs::path> made;
  const std::lock_guard lock(mutex);
  std::vector<std::string> words = arguments(spec);
  MediaSpec plain = spec;
  plain.chapters.clear();  // their description has a fresh name each time
  const std::string key = keyOf(spec, arguments(plain));
  if (const auto found = made.find(key); found != made.end()) return found->second;
  const fs::path file = runFfmpeg(std::move(words), spec.extension);
  if (spec.rotation != 0 || spec.flipped) writeDisplayMatrix(file, spec);
  return made[key] = file;
}

fs::path makeWav(const std::vector<std::int16_t>& samples, int channels, int sampleRate) {
  std::string bytes;
  const auto number = [&](std::uint32_t value, int size) {
    for (int i = 0; i < size; ++i) bytes += static_cast<char>(value >> (8 * i) & 0xffU);
  };
  const auto size = static_cast<std::uint32_t>(samples.size() * 2);
  const auto rate = static_cast<std::uint32_t>(sampleRate);
  const auto count = static_cast<std::uint32_t>(channels);
  bytes += "RIFF";
  number(36 + size, 4);
  bytes += "WAVEfmt ";
  number(16, 4);
  number(1, 2);
  number(count, 2);
  number(rate, 4);
  number(rate * count * 2, 4);
  number(count * 2, 2);
  number(16, 2);
  bytes += "data";
  number(size, 4);
  for (const std::int16_t sample : samples) number(static_cast<std::uint16_t>(sample), 2);
  const fs::path file = freshPath("wav");
  writeBytes(file, bytes);
  return file;
}

fs::path copyOf(const fs::path& file) {
  const fs::path copy = freshPath(file.extension().string().empty() ? "bin" : file.extension().string().substr(1));
  fs::copy_file(file, copy);
  fs::permissions(copy, fs::perms::owner_read | fs::perms::owner_write);
  return copy;
}

void writeBytes(const fs::path& file, const std::string& bytes) {
  std::ofstream stream(file, std::ios::binary | std::ios::trunc);
  stream.write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
  if (!stream.flush()) throw std::runtime_error("cannot write the fixture " + file.string());
}

std::string readBytes(const fs::path& file) {
  std::ifstream stream(file, std::ios::binary);
  std::ostringstream text;
  text << stream.rdbuf();
  return std::move(text).str();
}

fs::path corpusFile(const std::string& name) {
  const fs::path file = fs::path(QUILT_MEDIA_FOLDER) / name;
  return fs::exists(file) ? file : fs::path();
}

}  // namespace quilt::support
