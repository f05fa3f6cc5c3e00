// SPDX-License-Identifier: Apache-2.0
// Inspection, samples and frames beside what else one would use, in one run: `media FOLDER_OF_MEDIA`.
// Ratios are ours / theirs; below 1 is faster. Each figure is the best of several runs.
#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "quilt/platform/ffmpeg/FfmpegAudioPreview.h"
#include "quilt/platform/ffmpeg/FfmpegInspector.h"
#include "quilt/platform/ffmpeg/FfmpegMovieToolkit.h"
#include "quilt/platform/ffmpeg/Handles.h"
#include "quilt/platform/ffmpeg/Input.h"
#include "quilt/platform/ffmpeg/Streams.h"
#include "quilt/platform/install.h"

namespace {

namespace fs = std::filesystem;
using namespace quilt::platform;
using namespace quilt::platform::ffmpeg;

double bestMilliseconds(int runs, const std::function<void()>& job) {
  double best = 1e12;
  for (int i = 0; i < runs; ++i) {
    const auto start = std::chrono::steady_clock::now();
    job();
    best = std::min(best, std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start).count());
  }
  return best;
}

void runProgram(std::vector<std::string> words) {
  std::vector<char*> pointers;
  for (std::string& word : words) pointers.push_back(word.data());
  pointers.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  for (const int descriptor : {STDOUT_FILENO, STDERR_FILENO}) {
    posix_spawn_file_actions_addopen(&actions, descriptor, "/dev/null", O_WRONLY, 0);
  }
  pid_t child = 0;
  if (posix_spawnp(&child, pointers[0], &actions, nullptr, pointers.data(), environ) == 0) waitpid(child, nullptr, 0);
  posix_spawn_file_actions_destroy(&actions);
}

void openOnly(const fs::path& file, bool findsInfo) {
  AVFormatContext* opened = nullptr;
  if (avformat_open_input(&opened, file.c_str(), nullptr, nullptr) < 0) return;
  const FormatContext context(opened);
  if (findsInfo) avformat_find_stream_info(context.get(), nullptr);
}

// Decodes a whole stream and throws the result away.
void decodeOnly(const fs::path& file) {
  Result<Input> input = Input::open(file, 60);
  if (!input || !completeStreams(*input)) return;
  const AVStream* stream = mainAudio(*input);
  if (stream == nullptr) return;
  for (unsigned i = 0; i < input->context()->nb_streams; ++i) {
    if (input->context()->streams[i] != stream) input->context()->streams[i]->discard = AVDISCARD_ALL;
  }
  const Result<CodecContext> decoder = openDecoder(*stream, 1, file);
  if (!decoder) return;
  const Packet packet(av_packet_alloc());
  const Frame frame(av_frame_alloc());
  while (av_read_frame(input->context(), packet.get()) >= 0) {
    if (packet->stream_index == stream->index) avcodec_send_packet(decoder->get(), packet.get());
    av_packet_unref(packet.get());
    while (avcodec_receive_frame(decoder->get(), frame.get()) >= 0) av_frame_unref(frame.get());
  }
}

void compareInspection(const fs::path& folder) {
  std::printf("\n%-40s %9s %9s %9s %9s | ratios to\n", "inspect (ms)", "ours", "ffprobe", "info", "header");
  for (const char* name :
       {"h264-aac-1080p-phone.mp4", "h264-aac-1080p-6min.mp4", "h264-aac-640x360.m4v", "h264-aac-640x480.mov",
        "aac-voice-memo.m4a", "alac-11s.m4a", "h264-aac-fragmented.mp4", "h264-mp3-640x480.mp4",
        "mpeg4p2-mp3-960x400.avi", "vp8-vorbis-720p-30s.webm", "mpeg2-mp2-640x480.mpeg", "mp3-long-5min.mp3"}) {
    const fs::path file = folder / name;
    if (!fs::exists(file)) continue;
    constexpr int runs = 15;
    const double ours = bestMilliseconds(runs, [&] { static_cast<void>(FfmpegInspector().inspect(file)); });
    const double probe = bestMilliseconds(3, [&] {
      runProgram({"ffprobe", "-show_format", "-show_streams", file.string()});
    });
    const double info = bestMilliseconds(runs, [&] { openOnly(file, true); });
    const double header = bestMilliseconds(runs, [&] { openOnly(file, false); });
    std::printf("%-40s %9.2f %9.2f %9.2f %9.2f | %.3f %.2f %.2f\n", name, ours, probe, info, header, ours / probe,
                ours / info, ours / header);
  }
}

void compareSamples(const fs::path& folder, const fs::path& output) {
  std::printf("\n%-40s %9s %9s | ratio\n", "samples (ms)", "ours", "decode");
  for (const char* name : {"mp3-long-5min.mp3", "h264-aac-1080p-6min.mp4", "h264-aac51-480p-bbb-30s.mp4"}) {
    const fs::path file = folder / name;
    if (!fs::exists(file)) continue;
    const double ours = bestMilliseconds(5, [&] {
      static_cast<void>(FfmpegAudioPreview().extractAudioSamplesFromAssetURL(Url::fileUrl(file),
                                                                             Url::fileUrl(output / "samples.asc"), {}));
    });
    const double decode = bestMilliseconds(5, [&] { decodeOnly(file); });
    std::printf("%-40s %9.2f %9.2f | %.2f\n", name, ours, decode, ours / decode);
  }
}

void compareFrames(const fs::path& folder, const fs::path& output) {
  std::printf("\n%-40s %9s %9s | ratio\n", "frame at 10 s as JPEG (ms)", "ours", "ffmpeg");
  for (const char* name : {"h264-aac-1080p-6min.mp4", "h264-aac51-480p-bbb-30s.mp4", "h264-noaudio-768x432-2min.mp4",
                           "vp8-vorbis-720p-30s.webm"}) {
    const fs::path file = folder / name;
    if (!fs::exists(file)) continue;
    const std::string picture = (output / "frame.jpg").string();
    const double ours = bestMilliseconds(7, [&] {
      const Result<std::unique_ptr<Movie>> movie = FfmpegMovieToolkit().openMovie(file);
      if (!movie) return;
      const Result<std::shared_ptr<ImageWrapper>> image = (*movie)->frameAtTime(10);
      if (image && !(*image)->saveAsJPGAtPath(picture)) std::printf("not saved: ");
    });
    const double program = bestMilliseconds(5, [&] {
      runProgram({"ffmpeg", "-y", "-ss", "10", "-i", file.string(), "-frames:v", "1", "-q:v", "3", picture});
    });
    std::printf("%-40s %9.2f %9.2f | %.2f\n", name, ours, program, ours / program);
  }
}

}  // namespace

int main(int argumentCount, char** arguments) {
  if (argumentCount != 2) {
    std::fprintf(stderr, "usage: %s FOLDER_OF_MEDIA\n", arguments[0]);
    return 2;
  }
  install();
  av_log_set_level(AV_LOG_QUIET);
  std::string pattern = (fs::temp_directory_path() / "quilt-bench-XXXXXX").string();
  if (mkdtemp(pattern.data()) == nullptr) return 1;
  const fs::path output = pattern;
  compareInspection(arguments[1]);
  compareSamples(arguments[1], output);
  compareFrames(arguments[1], output);
  fs::remove_all(output);
  return 0;
}
