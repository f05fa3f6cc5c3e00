// SPDX-License-Identifier: Apache-2.0
// Conversion beside the ffmpeg program and, where it is installed, HandBrakeCLI, in one run:
// `transcode FOLDER_OF_MEDIA [PART_OF_A_ROW [RUNS]]`.
// The ffmpeg program makes the same size and colours with x264 at -preset medium -crf 22 and 160 kbit/s of AAC, with
// its own scaler where the colours stay and with zscale where they are converted to BT.709; HandBrakeCLI uses its
// "Fast" presets for these sizes. Ratios are ours / theirs; below 1 is faster or smaller. Each job has a process of its
// own, whose memory is compared. Times are the best of the runs, which take turns. SSIM is that of brightness, to the
// source as the ffmpeg program scales and converts it.
#include <fcntl.h>
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
#include <thread>
#include <vector>

#include "quilt/platform/ffmpeg/FfmpegTranscoder.h"
#include "quilt/platform/ffmpeg/Outline.h"
#include "quilt/platform/ffmpeg/ToneMap.h"
#include "quilt/platform/ffmpeg/TranscodePlan.h"

namespace {

namespace fs = std::filesystem;
using namespace quilt::platform;
using namespace quilt::platform::ffmpeg;
using Words = std::vector<std::string>;

struct Cost {
  double seconds = 1e9;
  double mebibytes = 1e9;
  bool isPaid = false;  ///< the job succeeded

  void improve(const Cost& other) {
    isPaid = isPaid || other.isPaid;
    if (!other.isPaid) return;
    seconds = std::min(seconds, other.seconds);
    mebibytes = std::min(mebibytes, other.mebibytes);
  }
};

// Runs the job in a process of its own.
Cost costOf(const std::function<bool()>& job) {
  std::fflush(stdout);
  const auto start = std::chrono::steady_clock::now();
  const pid_t child = fork();
  if (child == 0) _exit(job() ? 0 : 1);
  int status = 1;
  rusage usage{};
  if (child < 0 || wait4(child, &status, 0, &usage) != child) return {};
  return {std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count(),
          static_cast<double>(usage.ru_maxrss) / 1024, status == 0};
}

// The same for a program; what it says goes to `said`.
Cost costOf(const Words& words, const fs::path& said) {
  return costOf([&] {
    const int out = open(said.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    dup2(out, STDOUT_FILENO);
    dup2(out, STDERR_FILENO);
    std::vector<char*> pointers;
    for (const std::string& word : words) pointers.push_back(const_cast<char*>(word.c_str()));
    pointers.push_back(nullptr);
    execvp(pointers[0], pointers.data());
    return false;
  });
}

using Operation = Result<void> (FfmpegTranscoder::*)(const Url&, const Url&, const TranscoderProgressBlock&);

bool convert(Operation operation, const fs::path& source, const fs::path& destination) {
  FfmpegTranscoder transcoder;
  const Result<void> done = (transcoder.*operation)(Url::fileUrl(source), Url::fileUrl(destination), {});
  if (!done) std::printf("%s: %s\n", source.c_str(), done.error().text.c_str());
  return static_cast<bool>(done);
}

struct Grade {
  const char* name;
  PictureSize box;
  Operation operation;
  const char* rivalPreset;
};
constexpr Grade kGrades[]{{"HD", kHighDefinitionBox, &FfmpegTranscoder::transcodeToHD, "Fast 720p30"},
                          {"SD", kStandardDefinitionBox, &FfmpegTranscoder::transcodeToSD, "Fast 480p30"}};

class Bench {
 public:
  Bench(fs::path media, fs::path folder, std::string filter, int runs)
      : _media(std::move(media)), _folder(std::move(folder)), _filter(std::move(filter)), _runs(runs) {}

  // Each grade of a movie.
  void movie(const std::string& name) {
    const fs::path source = _media / name;
    if (!fs::exists(source)) return;
    for (const Grade& grade : kGrades) {
      if (isWanted(name + " " + grade.name)) compare(source, grade);
    }
  }

  // Both grades: ours in one pass, theirs with a run for each.
  void bothGrades(const std::string& name) {
    const fs::path source = _media / name;
    const std::string row = name + " both grades";
    if (!fs::exists(source) || !isWanted(row)) return;
    Cost ours;
    Cost theirs;
    for (int i = 0; i < _runs; ++i) {
      theirs.improve(costOf([&] {
        return std::ranges::all_of(kGrades, [&](const Grade& grade) {
          return costOf(programFor(source, grade, file("theirs.m4v")), file("said.txt")).isPaid;
        });
      }));
      ours.improve(costOf([&] {
        return static_cast<bool>(FfmpegTranscoder().transcodeToHDAndSD(
            Url::fileUrl(source), Url::fileUrl(file("ours.m4v")), Url::fileUrl(file("ours too.m4v")), {}));
      }));
    }
    printTimes(row, ours, theirs);
    std::printf("\n");
  }

  // Three minutes of sound, alone and two at once.
  void sound() {
    const fs::path source = file("sound.wav");
    if (!isWanted("sound to AAC")) return;
    costOf({"ffmpeg", "-nostdin", "-y", "-f", "lavfi", "-i",
            "aevalsrc='0.4*sin(2*PI*(200+t)*t)+0.1*random(0)|0.4*sin(2*PI*330*t)+0.1*random(1)':d=180:s=48000", "-c:a",
            "pcm_s16le", source.string()},
           file("said.txt"));
    Cost ours;
    Cost theirs;
    Cost two;
    for (int i = 0; i < _runs; ++i) {
      theirs.improve(costOf({"ffmpeg", "-nostdin", "-y", "-i", source.string(), "-c:a", "aac", "-b:a", "160k",
                             "-movflags", "+faststart", file("theirs.m4a").string()},
                            file("said.txt")));
      ours.improve(costOf([&] { return convert(&FfmpegTranscoder::transcodeToAudio, source, file("ours.m4a")); }));
      two.improve(costOf([&] {
        std::thread other([&] { convert(&FfmpegTranscoder::transcodeToAudio, source, file("other.m4a")); });
        const bool done = convert(&FfmpegTranscoder::transcodeToAudio, source, file("ours.m4a"));
        other.join();
        return done;
      }));
    }
    printTimes("sound to AAC, 3 min", ours, theirs);
    std::printf(" %6.3f\n", sizeOf("ours.m4a") / sizeOf("theirs.m4a"));
    two.seconds /= 2;
    printTimes("the same, two at once, each", two, theirs);
    std::printf("\n");
  }

 private:
  [[nodiscard]] bool isWanted(const std::string& row) const { return row.find(_filter) != std::string::npos; }
  [[nodiscard]] fs::path file(const char* name) const { return _folder / name; }
  [[nodiscard]] double sizeOf(const char* name) const { return static_cast<double>(fs::file_size(file(name))); }

  static void printTimes(const std::string& row, const Cost& ours, const Cost& theirs) {
    std::printf("%-38s %7.2f %7.2f %5.2f | %5.0f %5.0f %5.2f |", row.c_str(), ours.seconds, theirs.seconds,
                ours.seconds / theirs.seconds, ours.mebibytes, theirs.mebibytes, ours.mebibytes / theirs.mebibytes);
    std::fflush(stdout);
  }

  struct Plan {
    VideoPlan video;
    bool copiesSound = false;
    std::string conversion;  ///< the colours that ours are made of, for zscale; empty when they stay
  };
  static Plan planFor(const fs::path& source, const Grade& grade) {
    Plan plan;
    Result<Input> input = Input::open(source, 15);
    if (!input || !input->findStreamInfo()) return plan;
    const Result<Outline> found = outline(*input);
    if (!found || found->video == nullptr) return plan;
    plan.video = planVideo(videoTraits(*input, *found->video), grade.box);
    plan.copiesSound = found->audio != nullptr && planAudio(audioTraits(*input, *found->audio)).isCopied;
    const AVCodecParameters& parameters = *found->video->codecpar;
    const bool isOfTelevision =
        parameters.color_primaries == AVCOL_PRI_SMPTE170M || parameters.color_primaries == AVCOL_PRI_BT470BG;
    const int primaries = isOfTelevision ? parameters.color_primaries : AVCOL_PRI_BT709;
    const int usual = parameters.height <= kTallestStandardDefinition ? AVCOL_SPC_SMPTE170M : AVCOL_SPC_BT709;
    int matrix = parameters.color_space != AVCOL_SPC_UNSPECIFIED ? parameters.color_space : usual;
    if (parameters.codec_id == AV_CODEC_ID_VP8) matrix = AVCOL_SPC_BT470BG;  // always, says its decoder
    if (matrix != AVCOL_SPC_BT709 || primaries != AVCOL_PRI_BT709) {
      plan.conversion = "min=" + std::to_string(matrix) + ":pin=" + std::to_string(primaries) + ":tin=709:rin=limited";
    }
    return plan;
  }

  static std::string scaling(const Plan& plan) {
    return "scale=" + std::to_string(plan.video.size.width) + ":" + std::to_string(plan.video.size.height) +
           ",setsar=1";
  }

  // The filters that make the picture of the plan's size, in BT.709.
  static std::string picture(const Plan& plan) {
    if (plan.conversion.empty()) return scaling(plan);
    return "zscale=w=" + std::to_string(plan.video.size.width) + ":h=" + std::to_string(plan.video.size.height) +
           ":filter=bicubic:param_a=0:param_b=0.6:" + plan.conversion + ":m=709:p=709:t=709:r=limited,setsar=1";
  }

  static Words programFor(const fs::path& source, const Grade& grade, const fs::path& destination) {
    const Plan plan = planFor(source, grade);
    Words words{"ffmpeg", "-nostdin", "-y", "-i", source.string(), "-map", "0:V:0", "-map", "0:a:0?"};
    if (plan.video.isCopied) {
      words.insert(words.end(), {"-c:v", "copy"});
    } else {
      words.insert(words.end(), {"-vf", picture(plan) + ",format=yuv420p", "-vsync", "vfr", "-c:v", "libx264",
                                 "-preset", "medium", "-crf", "22", "-profile:v", "high"});
    }
    words.insert(words.end(), {"-c:a", plan.copiesSound ? "copy" : "aac"});
    if (!plan.copiesSound) words.insert(words.end(), {"-b:a", "160k", "-ac", "2"});
    words.insert(words.end(), {"-movflags", "+faststart", "-f", "mp4", destination.string()});
    return words;
  }

  // To the source, picture by picture.
  double similarity(const char* made, const fs::path& source, const std::string& scale) const {
    costOf({"ffmpeg", "-nostdin", "-hide_banner", "-i", file(made).string(), "-i", source.string(), "-an", "-lavfi",
            "[0:v:0]settb=1/90000,setpts=N*3000[a];[1:v:0]" + scale +
                ",format=yuv420p,settb=1/90000,setpts=N*3000[b];[a][b]ssim",
            "-vsync", "0", "-f", "null", "-"},
           file("said.txt"));
    std::ostringstream text;
    text << std::ifstream(file("said.txt")).rdbuf();
    const std::string words = std::move(text).str();
    const std::size_t place = words.rfind("SSIM Y:");
    return place == std::string::npos ? 0 : std::strtod(words.c_str() + place + 7, nullptr);
  }

  void compare(const fs::path& source, const Grade& grade) {
    const Plan plan = planFor(source, grade);
    Cost ours;
    Cost theirs;
    Cost rival;
    for (int i = 0; i < _runs; ++i) {
      theirs.improve(costOf(programFor(source, grade, file("theirs.m4v")), file("said.txt")));
      ours.improve(costOf([&] { return convert(grade.operation, source, file("ours.m4v")); }));
      if (plan.video.isCopied) continue;
      rival.improve(costOf(
          {"HandBrakeCLI", "--preset", grade.rivalPreset, "-i", source.string(), "-o", file("rival.mp4").string()},
          file("said.txt")));
    }
    printTimes(source.filename().string() + " " + grade.name, ours, theirs);
    if (!ours.isPaid || !theirs.isPaid) {
      std::printf(" failed\n");
      return;
    }
    std::printf(" %6.3f |", sizeOf("ours.m4v") / sizeOf("theirs.m4v"));
    if (plan.video.isCopied) {
      std::printf(" copied\n");
      return;
    }
    std::printf(" %.4f %.4f |", similarity("ours.m4v", source, picture(plan)),
                similarity("theirs.m4v", source, picture(plan)));
    if (rival.isPaid) {
      std::printf(" %7.2f %5.2f %6.3f %.4f", rival.seconds, ours.seconds / rival.seconds,
                  sizeOf("ours.m4v") / sizeOf("rival.mp4"), similarity("rival.mp4", source, scaling(plan)));
    }
    std::printf("\n");
    std::fflush(stdout);
  }

  fs::path _media;
  fs::path _folder;
  std::string _filter;
  int _runs;
};

}  // namespace

int main(int argumentCount, char** arguments) {
  if (argumentCount < 2 || argumentCount > 4) {
    std::fprintf(stderr, "usage: %s FOLDER_OF_MEDIA [PART_OF_A_ROW [RUNS]]\n", arguments[0]);
    return 2;
  }
  std::string pattern = (fs::temp_directory_path() / "quilt-bench-XXXXXX").string();
  if (mkdtemp(pattern.data()) == nullptr) return 1;
  const int runs = argumentCount > 3 ? std::max(1, std::atoi(arguments[3])) : 3;
  Bench bench(arguments[1], pattern, argumentCount > 2 ? arguments[2] : "", runs);
  std::printf("%-38s %7s %7s %5s | %5s %5s %5s | %6s | %6s %6s | %7s %5s %6s %6s\n", "", "ours s", "ffmpeg", "ratio",
              "MiB", "ffmpeg", "ratio", "size", "SSIM", "ffmpeg", "HandBr.", "ratio", "size", "SSIM");
  for (const char* name :
       {"h264-aac-1080p-phone.mp4", "h264-noaudio-1080p-rot180.mp4", "h264-aac51-480p-bbb-30s.mp4",
        "h264-aac51-720p-bbb.mp4", "h264-aac-960x540-flower.mp4", "vp8-vorbis-720p-30s.webm", "vp9-noaudio-800x640.mp4",
        "av1-aac-1080x720.mp4", "mpeg4p2-mp3-960x400.avi", "mpeg2-mp2-640x480.mpeg", "h264-mp3-640x480.mp4",
        "h264-aac-720p.mp4", "h264-noaudio-768x432-2min.mp4"}) {
    bench.movie(name);
  }
  bench.bothGrades("h264-aac-1080p-phone.mp4");
  bench.bothGrades("h264-aac-1080p-6min.mp4");
  bench.bothGrades("vp8-vorbis-720p-30s.webm");
  bench.sound();
  fs::remove_all(pattern);
  return 0;
}
