// SPDX-License-Identifier: Apache-2.0
#include "cli/Browser.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>

extern char** environ;

namespace quilt::cli {

namespace {

// A fresh folder that only the user can look into; empty when none can be made.
Path privateFolder() {
  const char* own = std::getenv("XDG_RUNTIME_DIR");
  std::error_code none;
  for (const Path& parent : {Path(own ? own : ""), std::filesystem::temp_directory_path(none)}) {
    std::string pattern = (parent / "quilt-serve-XXXXXX").native();
    if (parent.is_absolute() && mkdtemp(pattern.data())) return pattern;
  }
  return {};
}

pid_t start(std::string program, std::string argument) {
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  for (const int stream : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO})
    posix_spawn_file_actions_addopen(&actions, stream, "/dev/null", O_RDWR, 0);
  // A session of its own: Ctrl-C stops this program, and not a browser that came up with it.
  posix_spawnattr_t attributes;
  posix_spawnattr_init(&attributes);
  posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSID);
  char* words[] = {program.data(), argument.data(), nullptr};
  pid_t process = 0;
  if (posix_spawnp(&process, program.c_str(), &actions, &attributes, words, environ) != 0) process = 0;
  posix_spawnattr_destroy(&attributes);
  posix_spawn_file_actions_destroy(&actions);
  return process;
}

}  // namespace

Browser::Browser(const std::string& address) : _folder(privateFolder()) {
  if (_folder.empty()) return;
  const Path page = _folder / "open.html";
  std::ofstream(page) << "<!DOCTYPE html><meta charset=\"utf-8\"><meta name=\"referrer\" content=\"no-referrer\">"
                         "<meta http-equiv=\"refresh\" content=\"0; url="
                      << address << "\"><a href=\"" << address << "\">Open the document</a>\n";
  _process = start("xdg-open", page.native());
}

Browser::~Browser() {
  std::error_code stillInUse;
  if (!_folder.empty()) std::filesystem::remove_all(_folder, stillInUse);
  if (_process > 0) waitpid(_process, nullptr, WNOHANG);
}

}  // namespace quilt::cli
