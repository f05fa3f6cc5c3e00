// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/MainThreadCalls.h"

#include <utility>

#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/MainThread.h"

namespace quilt::scripting {

using platform::MainThread;

MainThreadCalls::MainThreadCalls() {
  _courier = std::thread([this] { carry(); });
}

MainThreadCalls::~MainThreadCalls() {
  if (_courier.joinable()) end();
}

MainThreadCalls::Outcome MainThreadCalls::perform(std::function<void()> block, std::chrono::milliseconds within) {
  const auto call = std::make_shared<Call>(Call{std::move(block)});
  std::unique_lock lock(_mutex);
  if (_isEnding) return Outcome::NotBegun;
  _calls.push_back(call);
  _changed.notify_all();
  _changed.wait_for(lock, within,
                    [&] { return call->state == State::Done || call->state == State::Abandoned || _isEnding; });
  if (call->state == State::Done) return Outcome::Done;
  if (call->state == State::Running) return Outcome::NotEnded;
  call->state = State::Abandoned;
  return Outcome::NotBegun;
}

void MainThreadCalls::post(std::function<void()> block) {
  {
    const std::lock_guard guard(_mutex);
    if (_isEnding) return;
    _calls.push_back(std::make_shared<Call>(Call{std::move(block)}));
  }
  _changed.notify_all();
}

void MainThreadCalls::run(Call& call) {
  {
    const std::lock_guard guard(_mutex);
    if (call.state != State::Waiting || _isEnding) return;
    call.state = State::Running;
  }
  try {
    std::exchange(call.block, nullptr)();  // what it holds goes before the caller learns that it is done
  } catch (...) {
    // A block that has someone to tell catches by itself; the courier has no one.
    platform::FDYLogger::logCritical("Something unexpected happened on the main thread");
  }
  {
    const std::lock_guard guard(_mutex);
    call.state = State::Done;
  }
  _changed.notify_all();
}

void MainThreadCalls::carry() {
  std::unique_lock lock(_mutex);
  for (;;) {
    _changed.wait(lock, [this] { return _isEnding || !_calls.empty(); });
    if (_isEnding) break;
    const std::shared_ptr<Call> call = std::move(_calls.front());
    _calls.pop_front();
    lock.unlock();
    MainThread::performBlock([&] { run(*call); });
    lock.lock();
  }
  _courierHasEnded = true;
  lock.unlock();
  MainThread::signal();
}

void MainThreadCalls::end() {
  {
    const std::lock_guard guard(_mutex);
    _isEnding = true;
  }
  _changed.notify_all();
  const auto courierHasEnded = [this] {
    const std::lock_guard guard(_mutex);
    return _courierHasEnded;
  };
  // The courier may be waiting for this very thread.
  if (MainThread::isCurrent())
    while (!courierHasEnded()) MainThread::waitAndRunQueuedBlocks();
  _courier.join();
}

}  // namespace quilt::scripting
