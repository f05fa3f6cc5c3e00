// SPDX-License-Identifier: Apache-2.0
#include "tests/support/QuiltProgram.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <fstream>
#include <sstream>
#include <thread>

namespace quilt::support {

namespace {

std::string contentOf(const std::filesystem::path& file) {
  std::ifstream in(file, std::ios::binary);
  std::ostringstream text;
  text << in.rdbuf();
  return text.str();
}

std::vector<char*> pointers(std::vector<std::string>& words) {
  std::vector<char*> all;
  for (std::string& word : words) all.push_back(word.data());
  all.push_back(nullptr);
  return all;
}

}  // namespace

nlohmann::json Ended::json() const {
  nlohmann::json document = nlohmann::json::parse(out, nullptr, false);
  if (document.is_discarded()) {
    ADD_FAILURE() << "stdout is not one JSON document:\n" << out << "\nstderr:\n" << err;
    return nullptr;
  }
  return document;
}

RunningProgram::RunningProgram(const std::vector<std::string>& arguments,
                               const std::map<std::string, std::string>& environment, const std::string& input) {
  std::ofstream(_folder / "in", std::ios::binary) << input;
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, (_folder / "in").c_str(), O_RDONLY, 0);
  constexpr int kNew = O_WRONLY | O_CREAT | O_TRUNC;
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, (_folder / "out").c_str(), kNew, 0600);
  posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, (_folder / "err").c_str(), kNew, 0600);
  // A test run in the background ignores Ctrl-C; the program under test must not inherit that.
  posix_spawnattr_t attributes;
  posix_spawnattr_init(&attributes);
  sigset_t signals;
  sigemptyset(&signals);
  for (const int number : {SIGINT, SIGTERM, SIGHUP, SIGPIPE}) sigaddset(&signals, number);
  posix_spawnattr_setsigdefault(&attributes, &signals);
  posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSIGDEF);

  std::vector<std::string> words{QUILT_PROGRAM};
  words.insert(words.end(), arguments.begin(), arguments.end());
  std::vector<std::string> variables;
  for (const auto& [name, value] : environment) variables.push_back(name + "=" + value);
  const int error =
      posix_spawn(&_process, QUILT_PROGRAM, &actions, &attributes, pointers(words).data(), pointers(variables).data());
  posix_spawn_file_actions_destroy(&actions);
  posix_spawnattr_destroy(&attributes);
  if (error == 0) return;
  ADD_FAILURE() << "The program does not start: " << QUILT_PROGRAM;
  _ended = true;
  _status = -1;
}

RunningProgram::~RunningProgram() {
  if (hasEnded()) return;
  kill(_process, SIGCONT);
  kill(_process, SIGKILL);
  waitpid(_process, &_status, 0);
}

void RunningProgram::signal(int number) const { kill(_process, number); }

bool RunningProgram::hasEnded() {
  if (!_ended) _ended = waitpid(_process, &_status, WNOHANG) == _process;
  return _ended;
}

std::string RunningProgram::outputSoFar() const { return contentOf(_folder / "out"); }

std::string RunningProgram::errorsSoFar() const { return contentOf(_folder / "err"); }

Ended RunningProgram::wait() {
  if (!waitUntil([this] { return hasEnded(); }, 60)) {
    ADD_FAILURE() << "The program does not end";
    kill(_process, SIGKILL);
    waitpid(_process, &_status, 0);
    _ended = true;
  }
  Ended run;
  run.exit = WIFEXITED(_status) ? WEXITSTATUS(_status) : -WTERMSIG(_status);
  run.out = contentOf(_folder / "out");
  run.err = contentOf(_folder / "err");
  return run;
}

std::unique_ptr<RunningProgram> QuiltProgramTest::start(const Arguments& arguments, const std::string& input) const {
  Arguments all{"--library", library()};
  all.insert(all.end(), arguments.begin(), arguments.end());
  return std::make_unique<RunningProgram>(all, environment, input);
}

Ended QuiltProgramTest::quilt(const Arguments& arguments, const std::string& input) const {
  return start(arguments, input)->wait();
}

nlohmann::json QuiltProgramTest::quiltJson(const Arguments& arguments, int expectedExit) const {
  Arguments all{"--json"};
  all.insert(all.end(), arguments.begin(), arguments.end());
  const Ended run = quilt(all);
  EXPECT_EQ(expectedExit, run.exit) << run.out << run.err;
  nlohmann::json document = run.json();
  EXPECT_EQ(1, document["schema"]);
  EXPECT_EQ(expectedExit == 0, document["ok"]);
  EXPECT_EQ(expectedExit != 0, document.contains("error"));
  return document;
}

QuiltProgramTest::Snapshot QuiltProgramTest::snapshot(const std::filesystem::path& folder) {
  Snapshot entries;
  if (!std::filesystem::exists(folder)) return entries;
  const auto add = [&](const std::filesystem::path& path) {
    struct stat status {};
    EXPECT_EQ(0, lstat(path.c_str(), &status));
    std::ostringstream text;
    text << status.st_mode << ' ' << status.st_ino << ' ' << status.st_mtim.tv_sec << '.' << status.st_mtim.tv_nsec
         << ' ';
    if (S_ISREG(status.st_mode)) text << contentOf(path);
    entries[path.lexically_relative(folder)] = text.str();
  };
  add(folder);
  for (const auto& entry : std::filesystem::recursive_directory_iterator(folder)) add(entry.path());
  return entries;
}

void QuiltProgramTest::write(const std::filesystem::path& file, const std::string& bytes) {
  std::filesystem::create_directories(file.parent_path());
  std::ofstream(file, std::ios::binary) << bytes;
}

std::string QuiltProgramTest::read(const std::filesystem::path& file) { return contentOf(file); }

bool waitUntil(const std::function<bool()>& condition, double seconds) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
  while (!condition()) {
    if (std::chrono::steady_clock::now() > end) return false;
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  return true;
}

}  // namespace quilt::support
