// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <exception>
#include <functional>
#include <optional>
#include <type_traits>
#include <utility>

#include "quilt/platform/base/Property.h"
#include "quilt/platform/base/Uninterrupted.h"

namespace quilt::platform {

/// What an operation does when a host's block or observer throws in the middle of it: it takes away what it has half
/// made, gives up its flags and locks, and lets the exception go on to the host.

/// Runs its function when the scope is left by an exception, and only then; what the function throws is dropped,
/// because another exception is on its way. Outlived by what the function refers to.
class OnException {
 public:
  /// What to do then.
  explicit OnException(std::function<void()> cleanUp) : _cleanUp(std::move(cleanUp)) {}
  OnException(const OnException&) = delete;
  OnException& operator=(const OnException&) = delete;
  ~OnException() {
    if (std::uncaught_exceptions() <= _onTheirWay) return;
    try {
      const Uninterrupted whole;
      _cleanUp();
    } catch (...) {  // NOLINT(bugprone-empty-catch): the first exception goes on
    }
  }

 private:
  const std::function<void()> _cleanUp;
  const int _onTheirWay = std::uncaught_exceptions();
};

/// Answers what `work` answers, after `last`, which runs also when `work` throws. An exception of `work` goes on to the
/// caller, rather than one of `last`.
template <class Work, class Last>
auto withCleanUp(const Work& work, const Last& last) -> std::invoke_result_t<const Work&> {
  const auto working = [&]() -> std::invoke_result_t<const Work&> {
    const OnException onException(last);
    return work();
  };
  const auto ending = [&] {
    const Uninterrupted whole;
    last();
  };
  if constexpr (std::is_void_v<std::invoke_result_t<const Work&>>) {
    working();
    ending();
  } else {
    auto answer = working();
    ending();
    return answer;
  }
}

/// Runs `work` with the flag set, and clears the flag afterwards, also when `work` throws. None, without running it,
/// when the flag is set already.
template <class Work>
auto whileSet(Property<bool>& flag, const Work& work) -> std::optional<std::invoke_result_t<const Work&>> {
  using Answer = std::optional<std::invoke_result_t<const Work&>>;
  if (flag.get()) return std::nullopt;  // one that is refused announces nothing
  bool isOurs = false;
  return withCleanUp(
      [&]() -> Answer {
        {
          const Uninterrupted whole;
          isOurs = !flag.exchange(true);  // which lets one of two threads pass
        }
        return isOurs ? Answer(work()) : std::nullopt;
      },
      [&] {
        if (isOurs) flag.set(false);
      });
}

/// A host's block on its way through a service, whose library may be one that exceptions must not pass: what the block
/// throws is kept, the service is told to stop, and rethrow() throws it when the service has returned.
class CarriedException {
 public:
  /// What `block` answers; false from its first exception on.
  template <class Block>
  bool ask(const Block& block) {
    if (_thrown) return false;
    try {
      return block();
    } catch (...) {
      _thrown = std::current_exception();
      return false;
    }
  }
  /// Throws what was kept, if anything.
  void rethrow() {
    if (_thrown) std::rethrow_exception(std::exchange(_thrown, nullptr));
  }

 private:
  std::exception_ptr _thrown;
};

}  // namespace quilt::platform
