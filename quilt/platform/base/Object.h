// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <mutex>
#include <string_view>
#include <vector>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Observation.h"

namespace quilt::platform {

/// The root of every model class: shared ownership, guarded properties and change announcements by key.
///
/// Properties (see Property) may be read and set on any thread. Observers of a key hear of each change, also when the
/// new value equals the old.
/// Whoever calls an operation keeps the object alive until it returns; an observer may drop its own hold meanwhile.
class QUILT_EXPORT Object : public std::enable_shared_from_this<Object> {
 public:
  Object() = default;
  Object(const Object&) = delete;
  Object& operator=(const Object&) = delete;
  virtual ~Object() = default;

  /// Observes one key. The observer runs with no lock of this object held.
  Observation observe(std::string_view key, ChangeObserver observer,
                      ObservationOptions options = ObservationOptions::None);

  /// @{
  /// Announces a change of `key`, and of every key that depends on it, to their observers.
  void willChangeValueForKey(std::string_view key) {
    if (hasObservers()) announce(key, ChangePhase::Will);
  }
  void didChangeValueForKey(std::string_view key) {
    if (hasObservers()) announce(key, ChangePhase::Did);
  }
  /// @}

  /// Whether anyone observes the key or a key that depends on it.
  [[nodiscard]] bool isObserved(std::string_view key) const;

  /// Makes a change that observers see on the main thread: will-change, the mutation, did-change. When no one observes
  /// the key, the mutation is made at once where it is. What an observer throws is thrown here, after the change; so is
  /// what the mutation throws.
  void changeOnMainThread(std::string_view key, const std::function<void()>& mutation);

  /// Runs the block on the main thread and returns after it has run; at once when called there.
  static void performBlockOnMainThread(const std::function<void()>& block);

 protected:
  /// The keys whose values are computed from that of `key`.
  [[nodiscard]] virtual std::vector<std::string_view> keysDependingOn(std::string_view key) const;

  /// A shared pointer to this object, for its own operations to hand on. Not in constructors.
  template <class T>
  [[nodiscard]] std::shared_ptr<T> shared(T* self) {
    return std::static_pointer_cast<T>(self->shared_from_this());
  }

 private:
  template <class T>
  friend class Property;

  /// Most objects never have any, and each change asks: so this is a look, without the mutex.
  [[nodiscard]] bool hasObservers() const { return _observers != nullptr; }
  void announce(std::string_view key, ChangePhase phase);
  void notify(std::string_view key, ChangePhase phase);

  mutable std::mutex _mutex;                         // guards the values of all properties
  std::shared_ptr<Observation::Registry> _registry;  // made, under the mutex, by the first observer, and then kept
  std::atomic<Observation::Registry*> _observers = nullptr;  // the registry, once it is there
};

}  // namespace quilt::platform
