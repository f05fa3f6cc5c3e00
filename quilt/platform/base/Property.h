// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <mutex>
#include <string_view>
#include <utility>

#include "quilt/platform/base/Object.h"
#include "quilt/platform/base/Uninterrupted.h"

namespace quilt::platform {

/// One observable value of an object. Each get and each set is indivisible; every set announces its key, before and
/// after, on the setting thread and with no lock held, also when the value stays the same. An observer that throws
/// stops neither the change nor the other observers; what it throws comes out of the set, when the value is set.
template <class T>
class Property {
 public:
  /// `key` is a literal: it is kept by reference.
  Property(Object& owner, std::string_view key, T value = T{}) : _owner(owner), _key(key), _value(std::move(value)) {}
  Property(const Property&) = delete;
  Property& operator=(const Property&) = delete;

  /// A copy of the value.
  [[nodiscard]] T get() const {
    const std::lock_guard guard(_owner._mutex);
    return _value;
  }

  /// What `use` answers for the value, without a copy. It runs with the object's mutex held, so it calls nothing that
  /// could come back to the object.
  template <class Use>
  [[nodiscard]] auto with(const Use& use) const {
    const std::lock_guard guard(_owner._mutex);
    return use(_value);
  }

  /// Sets the value between its announcements.
  void set(T value) {
    const Uninterrupted whole;
    _owner.willChangeValueForKey(_key);
    store(std::move(value));
    _owner.didChangeValueForKey(_key);
  }

  /// Sets the value, with its announcements, and answers the old one; no other set comes between.
  T exchange(T value) {
    const Uninterrupted whole;
    _owner.willChangeValueForKey(_key);
    {
      const std::lock_guard guard(_owner._mutex);
      std::swap(_value, value);
    }
    _owner.didChangeValueForKey(_key);
    return value;
  }

  /// Gives the value to an object that is being made, which no one else knows yet: without an announcement and without
  /// the lock, which a document's record would take a thousand times.
  void initialize(T value) { _value = std::move(value); }

  /// Sets the value without an announcement, for a cache that fills itself.
  void store(T value) {
    // The old value, now in the parameter, dies after the guard: its destructor may announce.
    const std::lock_guard guard(_owner._mutex);
    std::swap(_value, value);
  }

 private:
  Object& _owner;
  const std::string_view _key;
  T _value;
};

/// A back-pointer that never keeps its owner alive.
template <class T>
class WeakProperty {
 public:
  /// `key` is a literal: it is kept by reference. Null at first.
  WeakProperty(Object& owner, std::string_view key) : _reference(owner, key) {}

  /// The owner, kept alive while the answer is held; null when there is none, or none any more.
  [[nodiscard]] std::shared_ptr<T> get() const {
    return _reference.with([](const std::weak_ptr<T>& reference) { return reference.lock(); });
  }
  /// Property::initialize.
  void initialize(const std::shared_ptr<T>& value) { _reference.initialize(value); }
  /// Points to an owner, or with null to none; announced as Property::set announces.
  void set(const std::shared_ptr<T>& value) { _reference.set(value); }

 private:
  Property<std::weak_ptr<T>> _reference;
};

}  // namespace quilt::platform
