// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/Object.h"

#include <algorithm>
#include <string>

#include "quilt/platform/base/MainThread.h"
#include "quilt/platform/base/RecursiveMonitor.h"
#include "quilt/platform/base/Uninterrupted.h"

namespace quilt::platform {

struct Observation::Entry {
  Entry(std::string_view observedKey, ChangeObserver changeObserver, ObservationOptions observationOptions)
      : key(observedKey), observer(std::move(changeObserver)), options(observationOptions) {}

  /// Runs the observer, unless the observation has ended.
  void tell(const ChangeNotice& notice);
  /// After this the observer runs on no other thread, and never again.
  void end();

  const std::string key;
  const ChangeObserver observer;
  const ObservationOptions options;

 private:
  // Each run holds a monitor of its own. One for all of them would be a lock around foreign code: a thread that waits
  // for it with a list's lock, and an observer that wants this list, would wait for each other.
  std::mutex _mutex;
  std::vector<std::shared_ptr<RecursiveMonitor>> _runs;
  bool _active = true;
};

struct Observation::Registry {
  std::mutex mutex;
  std::vector<std::shared_ptr<Entry>> entries;
};

void Observation::Entry::tell(const ChangeNotice& notice) {
  const auto run = std::make_shared<RecursiveMonitor>();
  const MonitorLock running(*run);
  {
    const std::lock_guard guard(_mutex);
    if (!_active) return;
    _runs.push_back(run);
  }
  struct Leave {
    ~Leave() {
      const std::lock_guard guard(entry._mutex);
      std::erase(entry._runs, run);
    }
    Entry& entry;
    const std::shared_ptr<RecursiveMonitor>& run;
  };
  const Leave leave{*this, run};
  observer(notice);
}

void Observation::Entry::end() {
  std::vector<std::shared_ptr<RecursiveMonitor>> runs;
  {
    const std::lock_guard guard(_mutex);
    _active = false;
    runs = _runs;
  }
  for (const auto& run : runs) const MonitorLock untilItHasEnded(*run);
}

Observation::Observation(std::weak_ptr<Registry> registry, std::shared_ptr<Entry> entry)
    : _registry(std::move(registry)), _entry(std::move(entry)) {}

Observation& Observation::operator=(Observation&& other) noexcept {
  reset();
  _registry = std::move(other._registry);
  _entry = std::move(other._entry);
  return *this;
}

void Observation::reset() {
  const std::shared_ptr<Entry> entry = std::move(_entry);
  if (!entry) return;
  if (const auto registry = _registry.lock()) {
    const std::lock_guard guard(registry->mutex);
    std::erase(registry->entries, entry);
  }
  entry->end();
}

Observation Object::observe(std::string_view key, ChangeObserver observer, ObservationOptions options) {
  auto entry = std::make_shared<Observation::Entry>(key, std::move(observer), options);
  std::shared_ptr<Observation::Registry> registry;
  {
    const std::lock_guard guard(_mutex);
    if (!_registry) {
      _registry = std::make_shared<Observation::Registry>();
      _observers = _registry.get();
    }
    registry = _registry;
  }
  const std::lock_guard guard(registry->mutex);
  registry->entries.push_back(entry);
  return {registry, std::move(entry)};
}

bool Object::isObserved(std::string_view key) const {
  if (!hasObservers()) return false;
  const std::vector<std::string_view> dependents = keysDependingOn(key);
  Observation::Registry& registry = *_observers;
  const std::lock_guard guard(registry.mutex);
  return std::any_of(registry.entries.begin(), registry.entries.end(), [&](const auto& entry) {
    return entry->key == key || std::find(dependents.begin(), dependents.end(), entry->key) != dependents.end();
  });
}

void Object::changeOnMainThread(std::string_view key, const std::function<void()>& mutation) {
  if (!isObserved(key)) {
    mutation();
    return;
  }
  const Uninterrupted whole;
  try {
    MainThread::performBlock([&] {
      const Uninterrupted change;
      willChangeValueForKey(key);
      mutation();
      didChangeValueForKey(key);
    });
  } catch (...) {
    // On its way here from the main thread: the observers' own, after the change.
    Uninterrupted::hold(std::current_exception());
  }
}

void Object::performBlockOnMainThread(const std::function<void()>& block) { MainThread::performBlock(block); }

std::vector<std::string_view> Object::keysDependingOn(std::string_view) const { return {}; }

void Object::announce(std::string_view key, ChangePhase phase) {
  const Uninterrupted whole;
  notify(key, phase);
  for (const std::string_view dependent : keysDependingOn(key)) notify(dependent, phase);
}

void Object::notify(std::string_view key, ChangePhase phase) {
  Observation::Registry& registry = *_observers;
  std::vector<std::shared_ptr<Observation::Entry>> listeners;
  {
    const std::lock_guard guard(registry.mutex);
    for (const auto& entry : registry.entries)
      if (entry->key == key && (phase == ChangePhase::Did || entry->options == ObservationOptions::Prior))
        listeners.push_back(entry);
  }
  for (const auto& entry : listeners) {
    try {
      const Uninterrupted::Suspended anew;
      entry->tell(ChangeNotice{*this, key, phase});
    } catch (...) {
      Uninterrupted::hold(std::current_exception());
    }
  }
}

}  // namespace quilt::platform
