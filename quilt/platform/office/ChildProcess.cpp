// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/office/ChildProcess.h"

#include <fcntl.h>
#include <sched.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <optional>
#include <thread>

namespace quilt::platform::office {

namespace {

constexpr rlim_t kMaximumMemory = rlim_t{4} << 30;
constexpr rlim_t kMaximumFile = rlim_t{1} << 30;
constexpr int kNotStarted = 127;
constexpr auto kPause = std::chrono::milliseconds(5);

// What the child needs after the fork, when it may neither allocate nor lock.
struct Prepared {
  std::vector<char*> arguments;
  std::vector<char*> environment;
  std::string userMap;
  std::string groupMap;
  rlim_t seconds;
  pid_t parent;
};

std::vector<char*> pointers(const std::vector<std::string>& texts) {
  std::vector<char*> list;
  list.reserve(texts.size() + 1);
  for (const std::string& text : texts) list.push_back(const_cast<char*>(text.c_str()));
  list.push_back(nullptr);
  return list;
}

void writeSmallFile(const char* path, const char* text) {
  const int file = open(path, O_WRONLY | O_CLOEXEC);
  if (file < 0) return;
  [[maybe_unused]] const ssize_t ignored = write(file, text, strlen(text));
  close(file);
}

void limit(__rlimit_resource resource, rlim_t value) {
  const rlimit both{value, value};
  setrlimit(resource, &both);
}

// In the child. Only calls that are safe after a fork of a process with threads.
[[noreturn]] void become(const Prepared& prepared) {
  setpgid(0, 0);
  prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0);
  if (unshare(CLONE_NEWUSER | CLONE_NEWNET) == 0) {
    writeSmallFile("/proc/self/setgroups", "deny");
    writeSmallFile("/proc/self/uid_map", prepared.userMap.c_str());
    writeSmallFile("/proc/self/gid_map", prepared.groupMap.c_str());
  }
  prctl(PR_SET_PDEATHSIG, SIGKILL);  // only now: a change of user makes the system forget it
  if (getppid() != prepared.parent) _exit(kNotStarted);
  const int null = open("/dev/null", O_RDWR);
  for (int descriptor = 0; descriptor < 3; ++descriptor) dup2(null, descriptor);
  syscall(SYS_close_range, 3U, ~0U, 0U);
  limit(RLIMIT_AS, kMaximumMemory);
  limit(RLIMIT_FSIZE, kMaximumFile);
  limit(RLIMIT_CORE, 0);
  limit(RLIMIT_CPU, prepared.seconds);
  sigset_t none;
  sigemptyset(&none);
  sigprocmask(SIG_SETMASK, &none, nullptr);
  execve(prepared.arguments[0], prepared.arguments.data(), prepared.environment.data());
  _exit(kNotStarted);
}

// The child's status, or none when the time is over or the caller wants no more.
std::optional<int> wait(pid_t child, std::chrono::steady_clock::time_point deadline, bool& isCancelled,
                        const ContinueBlock& goesOn) {
  for (int status = 0;;) {
    const pid_t ended = waitpid(child, &status, WNOHANG);
    if (ended == child) return status;
    // A host that ignores its children's ends never hears of them; what the child made tells then.
    if (ended < 0 && errno != EINTR) return 0;
    isCancelled = goesOn && !goesOn();
    if (isCancelled || std::chrono::steady_clock::now() > deadline) return std::nullopt;
    std::this_thread::sleep_for(kPause);
  }
}

}  // namespace

ChildResult runChild(const std::filesystem::path& program, const std::vector<std::string>& arguments,
                     const std::vector<std::string>& environment, std::chrono::milliseconds timeout,
                     const ContinueBlock& goesOn) {
  std::vector<std::string> all{program.native()};
  all.insert(all.end(), arguments.begin(), arguments.end());
  const std::string user = std::to_string(geteuid());
  const std::string group = std::to_string(getegid());
  const auto seconds = static_cast<rlim_t>(std::chrono::ceil<std::chrono::seconds>(timeout).count());
  const Prepared prepared{pointers(all),
                          pointers(environment),
                          user + " " + user + " 1",
                          group + " " + group + " 1",
                          seconds * std::max(1U, std::thread::hardware_concurrency()) + 1,
                          getpid()};

  const pid_t child = fork();
  if (child < 0) return {ChildEnd::NotStarted, errno};
  if (child == 0) become(prepared);
  setpgid(child, child);  // here as well: whichever comes first

  bool isCancelled = false;
  const std::optional<int> status = wait(child, std::chrono::steady_clock::now() + timeout, isCancelled, goesOn);
  kill(-child, SIGKILL);
  if (!status) {
    waitpid(child, nullptr, 0);
    return {isCancelled ? ChildEnd::Cancelled : ChildEnd::TimedOut, 0};
  }
  if (!WIFEXITED(*status)) return {ChildEnd::Killed, 0};
  if (WEXITSTATUS(*status) == kNotStarted) return {ChildEnd::NotStarted, 0};
  return {ChildEnd::Exited, WEXITSTATUS(*status)};
}

}  // namespace quilt::platform::office
