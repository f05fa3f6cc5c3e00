// SPDX-License-Identifier: Apache-2.0
// Conversion beside the ffmpeg program, in one run: `transcode FOLDER_OF_MEDIA [PART_OF_A_NAME]`.
// The program makes the same size with x264 at -preset medium -crf 22 and 160 kbit/s of AAC. Both are compared with the
// source, scaled by the program. Ratios are ours / theirs; below 1 is faster or smaller. Times are the best of the
// runs, which take turns.
#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <sstream>
#include <string>
#include <vector>

#include "quilt/platform/ffmpeg/FfmpegTranscoder.h"
#include "quilt/platform/ffmpeg/Outline.h"
#include "quilt/platform/ffmpeg/TranscodePlan.h"

namespace {

namespace fs = std::filesystem;
using namespace quilt::platform;
using namespace quilt::platform::ffmpeg;

double seconds(const std::function<void()>& job) {
  const auto start = std::chrono::steady_clock::now();
  job();
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

// Runs a program; answers what it says on its error stream.
std::string run(std::vector<std::string> words, const fs::path& folder) {
  const fs::path said = folder / "said.txt";
  std::vector<char*> pointers;
  for (std::string& word : words) pointers.push_back(word.data());
  pointers.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
  posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, said.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
  pid_t child = 0;
  if (posix_spawnp(&child, pointers[0], &actions, nullptr, pointers.data(), environ) == 0) waitpid(child, nullptr, 0);
  posix_spawn_file_actions_destroy(&actions);
  std::ostringstream text;
  text << std::ifstream(said).rdbuf();
  return std::move(text).str();
}

// The structural similarity of brightness to the source.
double similarity(const fs::path& made, const fs::path& source, const std::string& scaling, const fs::path& folder) {
  const std::string words =
      run({"ffmpeg", "-nostdin", "-hide_banner", "-i", made.string(), "-i", source.string(), "-an", "-lavfi",
           "[0:v:0]settb=1/90000,setpts=N*3000[a];[1:v:0]" + scaling +
               ",format=yuv420p,settb=1/90000,setpts=N*3000[b];[a][b]ssim",
           "-vsync", "0", "-f", "null", "-"},
          folder);
  const std::size_t place = words.rfind("SSIM Y:");
  return place == std::string::npos ? 0 : std::strtod(words.c_str() + place + 7, nullptr);
}

bool isStandardDefinition(const AVStream& stream) {
  const AVCodecParameters& parameters = *stream.codecpar;
  if (parameters.color_space != AVCOL_SPC_UNSPECIFIED) return parameters.color_space != AVCOL_SPC_BT709;
  return parameters.height <= 576;
}

struct Job {
  std::string name;
  bool isHigh;
  int runs;
};

void compare(const fs::path& source, const Job& job, const fs::path& folder) {
  Result<Input> input = Input::open(source, 15);
  if (!input) return;
  const Result<Outline> found = outline(*input);
  if (!found || found->video == nullptr) return;
  const VideoPlan plan =
      planVideo(videoTraits(*input, *found->video), job.isHigh ? kHighDefinition : kStandardDefinition);
  const std::string scaling =
      "scale=" + std::to_string(plan.size.width) + ":" + std::to_string(plan.size.height) + ",setsar=1";
  const fs::path ours = folder / "ours.m4v";
  const fs::path theirs = folder / "theirs.m4v";
  std::vector<std::string> program{"ffmpeg", "-nostdin", "-y",   "-i",    source.string(),
                                   "-map",   "0:V:0",    "-map", "0:a:0?"};
  if (plan.isCopied) {
    program.insert(program.end(), {"-c:v", "copy"});
  } else {
    program.insert(program.end(), {"-vf", scaling + ",format=yuv420p", "-vsync", "vfr", "-c:v", "libx264", "-preset",
                                   "medium", "-crf", "22", "-profile:v", "high"});
  }
  const bool copiesSound = found->audio != nullptr && planAudio(audioTraits(*input, *found->audio)).isCopied;
  program.insert(program.end(), {"-c:a", copiesSound ? "copy" : "aac"});
  if (!copiesSound) program.insert(program.end(), {"-b:a", "160k", "-ac", "2"});
  program.insert(program.end(), {"-movflags", "+faststart", "-f", "mp4", theirs.string()});

  double ourTime = 1e9;
  double theirTime = 1e9;
  bool isMade = true;
  for (int i = 0; i < job.runs; ++i) {
    theirTime = std::min(theirTime, seconds([&] { run(program, folder); }));
    ourTime = std::min(ourTime, seconds([&] {
                         FfmpegTranscoder transcoder;
                         const Url from = Url::fileUrl(source);
                         const Url to = Url::fileUrl(ours);
                         const Result<void> done = job.isHigh ? transcoder.transcodeToHD(from, to, {})
                                                              : transcoder.transcodeToSD(from, to, {});
                         if (!done) std::printf("%s: %s\n", job.name.c_str(), done.error().text.c_str());
                         isMade = isMade && done;
                       }));
  }
  if (!isMade || !fs::exists(theirs)) return;
  const auto size = static_cast<double>(fs::file_size(ours)) / static_cast<double>(fs::file_size(theirs));
  std::printf("%-34s %s %4dx%-4d %8.2f %8.2f | %5.2f %6.3f |", job.name.c_str(), job.isHigh ? "HD" : "SD",
              plan.size.width, plan.size.height, ourTime, theirTime, ourTime / theirTime, size);
  if (plan.isCopied) {
    std::printf(" copied\n");
  } else {
    // The program leaves the colours as they are; ours are BT.709.
    const std::string converting =
        isStandardDefinition(*found->video) ? ",scale=in_color_matrix=bt601:out_color_matrix=bt709" : "";
    std::printf(" %.4f %.4f\n", similarity(ours, source, scaling + converting, folder),
                similarity(theirs, source, scaling, folder));
  }
  std::fflush(stdout);
}

}  // namespace

int main(int argumentCount, char** arguments) {
  if (argumentCount < 2 || argumentCount > 3) {
    std::fprintf(stderr, "usage: %s FOLDER_OF_MEDIA [PART_OF_A_NAME]\n", arguments[0]);
    return 2;
  }
  std::string pattern = (fs::temp_directory_path() / "quilt-bench-XXXXXX").string();
  if (mkdtemp(pattern.data()) == nullptr) return 1;
  const fs::path folder = pattern;
  std::printf("%-34s %2s %9s %8s %8s | %5s %6s | %6s %6s\n", "movie", "", "", "ours s", "ffmpeg s", "time", "size",
              "SSIM", "ffmpeg");
  for (const char* name :
       {"h264-aac-1080p-phone.mp4", "h264-noaudio-1080p-rot180.mp4", "h264-aac51-480p-bbb-30s.mp4",
        "h264-aac51-720p-bbb.mp4", "h264-aac-960x540-flower.mp4", "vp8-vorbis-720p-30s.webm", "vp9-noaudio-800x640.mp4",
        "av1-aac-1080x720.mp4", "mpeg4p2-mp3-960x400.avi", "mpeg2-mp2-640x480.mpeg", "h264-mp3-640x480.mp4",
        "h264-aac-720p.mp4", "h264-noaudio-768x432-2min.mp4"}) {
    const fs::path source = fs::path(arguments[1]) / name;
    if (!fs::exists(source) || (argumentCount == 3 && std::string(name).find(arguments[2]) == std::string::npos))
      continue;
    for (const bool isHigh : {true, false}) compare(source, {name, isHigh, 3}, folder);
  }
  rusage usage{};
  getrusage(RUSAGE_SELF, &usage);
  rusage children{};
  getrusage(RUSAGE_CHILDREN, &children);
  std::printf("most memory: ours %ld MiB, ffmpeg %ld MiB\n", usage.ru_maxrss / 1024, children.ru_maxrss / 1024);
  fs::remove_all(folder);
  return 0;
}
