// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "quilt/platform/base/Object.h"
#include "quilt/scripting/bridge/ChangedAccessors.h"

namespace quilt::scripting {

/// What one client holds of the model: handles on objects, and the changes of those objects that it has not been told
/// of. A handle does not keep its object alive. Any thread.
class Session {
 public:
  using Clock = std::chrono::steady_clock;
  using Handle = std::uint64_t;

  /// One object of which accessors answer otherwise now; several changes of it are one.
  struct Change {
    Handle handle = 0;
    std::set<std::string_view> accessors;
  };

  explicit Session(std::size_t maximumObjects) : _maximumObjects(maximumObjects) {}
  Session(const Session&) = delete;
  Session& operator=(const Session&) = delete;

  /// The handle of an object of an exposed class, always the same one; from the first time on its changes are noted.
  /// None when the session holds as many as it may.
  std::optional<Handle> handleOf(const std::shared_ptr<platform::Object>& object);
  /// Null when there is no such handle, or no such object any more.
  [[nodiscard]] std::shared_ptr<platform::Object> object(Handle handle) const;

  /// Waits until there are changes and takes them; after the time there may be none. None when the session is closed.
  std::optional<std::vector<Change>> takeChanges(std::chrono::milliseconds within);

  /// The one stream of changes that a session has. False when there is one already.
  bool beginStream() { return !_isStreaming.exchange(true); }

  void close();
  void touch() { _lastUse = Clock::now(); }
  [[nodiscard]] bool isListening() const { return _isStreaming; }
  [[nodiscard]] Clock::time_point lastUse() const { return _lastUse; }
  /// Neither used nor listening for this long.
  [[nodiscard]] bool isIdle(std::chrono::milliseconds forThisLong) const {
    return !_isStreaming && Clock::now() - _lastUse.load() > forThisLong;
  }

 private:
  // Shared with the observers, which must not reach for the session: they may be the last to know of its end.
  struct Changes {
    void add(Handle handle, const ChangedAccessors& changed);

    std::mutex mutex;
    std::condition_variable arrived;
    std::map<Handle, Change> pending;
    bool isClosed = false;
  };
  struct Held {
    std::weak_ptr<platform::Object> object;
    const platform::Object* address = nullptr;
    std::vector<platform::Observation> observations;
  };

  void forgetTheDead();

  const std::size_t _maximumObjects;
  mutable std::mutex _mutex;
  std::unordered_map<Handle, Held> _held;
  std::unordered_map<const platform::Object*, Handle> _handles;
  Handle _last = 0;
  std::shared_ptr<Changes> _changes = std::make_shared<Changes>();
  std::atomic<bool> _isStreaming{false};
  std::atomic<Clock::time_point> _lastUse{Clock::now()};
};

/// The sessions by their unguessable identities. Any thread.
class Sessions {
 public:
  Sessions(std::size_t maximum, std::size_t maximumObjects, std::chrono::milliseconds idle)
      : _maximum(maximum), _maximumObjects(maximumObjects), _idle(idle) {}

  /// The identity of a new one. When there are as many as may be, the one that listens for nothing and was used longest
  /// ago gives way; none when all of them listen.
  std::optional<std::string> open();
  /// Null when there is none. Counts as a use.
  std::shared_ptr<Session> find(std::string_view identity) const;
  void close(std::string_view identity);
  void closeAll();
  /// Closes those that were left alone for too long.
  void expire();
  [[nodiscard]] std::size_t count() const;

 private:
  const std::size_t _maximum;
  const std::size_t _maximumObjects;
  const std::chrono::milliseconds _idle;
  mutable std::mutex _mutex;
  std::map<std::string, std::shared_ptr<Session>, std::less<>> _sessions;
};

}  // namespace quilt::scripting
