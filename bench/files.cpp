// SPDX-License-Identifier: Apache-2.0
// Copies and saves beside what else one would use, in one run: `files [FOLDER]`, on the disk of that folder.
// Ratios are ours / theirs; below 1 is faster. Each figure is the best of several runs, taken in turn.
#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <functional>
#include <random>
#include <string>

#include "quilt/platform/files/PosixFileManager.h"

namespace {

namespace fs = std::filesystem;
using quilt::platform::PosixFileManager;

double milliseconds(const std::function<void()>& job) {
  const auto start = std::chrono::steady_clock::now();
  job();
  return std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start).count();
}

void compare(const char* what, int runs, const char* peer, const std::function<void()>& ours,
             const std::function<void()>& theirs, const std::function<void()>& cleanUp) {
  double best = 1e12;
  double bestOfPeer = 1e12;
  for (int run = 0; run < runs; ++run) {
    best = std::min(best, milliseconds(ours));
    cleanUp();
    bestOfPeer = std::min(bestOfPeer, milliseconds(theirs));
    cleanUp();
  }
  std::printf("%-34s ours %9.3f ms  %-15s %9.3f ms  ratio %.2f\n", what, best, peer, bestOfPeer, best / bestOfPeer);
}

void runProgramCp(const fs::path& from, const fs::path& to) {
  std::string words[] = {"cp", from.string(), to.string()};
  char* pointers[] = {words[0].data(), words[1].data(), words[2].data(), nullptr};
  pid_t child = 0;
  if (posix_spawnp(&child, "cp", nullptr, nullptr, pointers, environ) == 0) waitpid(child, nullptr, 0);
}

// The least that a safe save does: write beside, sync, rename, sync the folder.
void saveByHand(const fs::path& path, const std::string& bytes) {
  const std::string temporary = path.string() + ".new";
  const int file = open(temporary.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0666);
  if (write(file, bytes.data(), bytes.size()) != static_cast<ssize_t>(bytes.size())) std::perror("write");
  fsync(file);
  close(file);
  if (std::rename(temporary.c_str(), path.c_str()) != 0) std::perror("rename");
  const int folder = open(path.parent_path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  fsync(folder);
  close(folder);
}

}  // namespace

int main(int argumentCount, char** arguments) {
  const fs::path base = argumentCount > 1 ? fs::path(arguments[1]) : fs::temp_directory_path();
  std::string pattern = (base / "quilt-bench-XXXXXX").string();
  if (mkdtemp(pattern.data()) == nullptr) return 1;
  const fs::path folder = pattern;
  PosixFileManager files;

  {
    std::mt19937_64 random(1);
    std::string block(1 << 20, '\0');
    std::ofstream big(folder / "big", std::ios::binary);
    for (int i = 0; i < 477; ++i) {
      for (std::size_t at = 0; at < block.size(); at += 8) {
        const auto word = random();
        std::copy_n(reinterpret_cast<const char*>(&word), 8, block.data() + at);
      }
      big << block;
    }
  }
  compare(
      "copy a file of 500 MB", 5, "cp", [&] { files.copyfile(folder / "big", folder / "copy", nullptr, nullptr); },
      [&] { runProgramCp(folder / "big", folder / "copy"); }, [&] { fs::remove(folder / "copy"); });
  fs::remove(folder / "big");
  sync();

  const std::string record(69000, 'r');
  constexpr int saves = 100;
  compare(
      "save a record of 69 KB, 100 times", 5, "by hand, synced",
      [&] {
        for (int i = 0; i < saves; ++i)
          if (!files.writeAtomically(folder / "record", record)) std::printf("not saved\n");
      },
      [&] {
        for (int i = 0; i < saves; ++i) saveByHand(folder / "record", record);
      },
      [] {});
  fs::remove_all(folder);
  return 0;
}
