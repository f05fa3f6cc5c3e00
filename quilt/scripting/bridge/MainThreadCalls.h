// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <condition_variable>
#include <deque>
#include <functional>
#include <memory>
#include <mutex>
#include <thread>

namespace quilt::scripting {

/// Runs blocks on the main thread for threads that will not wait for ever: one after another, in the order in which
/// they were asked for.
class MainThreadCalls {
 public:
  enum class Outcome {
    Done,
    NotBegun,  ///< and it will not be: the main thread was busy for too long, or this object has ended
    NotEnded,  ///< begun, but not done within the time; it goes on
  };

  MainThreadCalls();
  MainThreadCalls(const MainThreadCalls&) = delete;
  MainThreadCalls& operator=(const MainThreadCalls&) = delete;
  ~MainThreadCalls();

  /// Not on the main thread. The block may outlive the call, and throws nothing.
  Outcome perform(std::function<void()> block, std::chrono::milliseconds within);

  /// Does not wait for the block.
  void post(std::function<void()> block);

  /// Begins no further block and lets those go who wait. When the main thread calls it, it runs what other threads have
  /// queued for it meanwhile. Once.
  void end();

 private:
  enum class State { Waiting, Running, Done, Abandoned };
  struct Call {
    std::function<void()> block;
    State state = State::Waiting;
  };

  void carry();
  void run(Call& call);

  std::mutex _mutex;  // also guards the calls' states
  std::condition_variable _changed;
  std::deque<std::shared_ptr<Call>> _calls;
  bool _isEnding = false;
  bool _courierHasEnded = false;
  std::thread _courier;  // waits for the main thread, which the callers must not
};

}  // namespace quilt::scripting
