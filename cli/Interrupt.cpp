// SPDX-License-Identifier: Apache-2.0
#include "cli/Interrupt.h"

#include <unistd.h>

#include <atomic>
#include <csignal>

namespace quilt::cli {

namespace {

std::atomic<int> received{0};
static_assert(std::atomic<int>::is_always_lock_free, "a signal handler may touch it");

void handle(int signal) {
  int none = 0;
  if (!received.compare_exchange_strong(none, signal)) _exit(128 + signal);
}

}  // namespace

void Interrupt::listen() {
  struct sigaction action = {};
  action.sa_handler = handle;  // without SA_RESTART: reading a list from a terminal ends, too
  sigemptyset(&action.sa_mask);
  sigaction(SIGINT, &action, nullptr);
  sigaction(SIGTERM, &action, nullptr);
  struct sigaction previous = {};
  sigaction(SIGHUP, nullptr, &previous);
  if (previous.sa_handler != SIG_IGN) sigaction(SIGHUP, &action, nullptr);
}

bool Interrupt::isRequested() { return received != 0; }

ExitCode Interrupt::exitCode() {
  switch (received) {
    case SIGTERM:
      return ExitCode::Terminated;
    case SIGHUP:
      return ExitCode::HungUp;
  }
  return ExitCode::Interrupted;
}

Failure Interrupt::failure(const std::string& whatIsLeft) { return {exitCode(), "Stopped. " + whatIsLeft}; }

}  // namespace quilt::cli
