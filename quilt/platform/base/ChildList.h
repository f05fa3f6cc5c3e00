// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <algorithm>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/IndexSet.h"
#include "quilt/platform/base/Object.h"
#include "quilt/platform/base/RecursiveMonitor.h"
#include "quilt/platform/base/Uninterrupted.h"

namespace quilt::platform {

/// An ordered list of children with its lock, its announcements and its children's back-pointers: the one shape that
/// every list of the model has.
///
/// Each operation holds the list's recursive lock for its whole run; lock() holds it over several. A change that
/// someone observes is made on the main thread, between the will- and did-change announcements of the list's key, while
/// the calling thread keeps the lock. A change that no one observes is made where it is. An observer that throws stops
/// no change: list and back-pointer are changed, the others are told, and then the exception goes to the caller.
template <class Child, class Owner>
class ChildList {
 public:
  /// How a child is held: shared with whoever else uses it.
  using Pointer = std::shared_ptr<Child>;
  /// Sets a child's back-pointer; null for children without one.
  using SetOwner = void (Child::*)(const std::shared_ptr<Owner>&);

  /// `key` is a literal: it is kept by reference.
  ChildList(Owner& owner, std::string_view key, SetOwner setOwner = nullptr)
      : _owner(owner), _key(key), _setOwner(setOwner) {}
  ChildList(const ChildList&) = delete;
  ChildList& operator=(const ChildList&) = delete;

  /// Holds the list still for the life of what it answers. Recursive.
  [[nodiscard]] MonitorLock lock() const { return MonitorLock(_monitor); }

  /// How many children there are now; another thread may change that unless the lock is held.
  [[nodiscard]] std::size_t count() const {
    const MonitorLock guard = lock();
    return _children.size();
  }

  /// The child at the index; null when the index is not below the count.
  [[nodiscard]] Pointer at(std::size_t index) const {
    const MonitorLock guard = lock();
    return index < _children.size() ? _children[index] : nullptr;
  }

  /// The first child in list order for which the test holds, or null.
  template <class Test>
  [[nodiscard]] Pointer first(const Test& test) const {
    const MonitorLock guard = lock();
    const auto found = std::find_if(_children.begin(), _children.end(), test);
    return found == _children.end() ? nullptr : *found;
  }

  /// The children as they are now.
  [[nodiscard]] std::vector<Pointer> copy() const {
    const MonitorLock guard = lock();
    return _children;
  }

  /// Calls the block on each child in order, with the lock held; stops at the first false and answers false. Children
  /// that the block adds are visited when they lie ahead.
  template <class Block>
  bool walk(const Block& block) const {
    const MonitorLock guard = lock();
    for (std::size_t i = 0; i < _children.size(); ++i) {
      const Pointer child = _children[i];
      if (!block(child)) return false;
    }
    return true;
  }

  /// Attaches the child and inserts it. Null is ignored. An index beyond the count changes nothing and logs a critical
  /// line.
  void insert(const Pointer& child, std::size_t index) {
    if (!child) return;
    const MonitorLock guard = lock();
    if (!isBeyond(index, _children.size())) place(child, index);
  }

  /// insert() at the end.
  void append(const Pointer& child) {
    if (!child) return;
    const MonitorLock guard = lock();
    place(child, _children.size());
  }

  /// Detaches the child and removes every occurrence of it. Announces also when the list does not hold it.
  void remove(const Pointer& child) {
    if (!child) return;
    const Uninterrupted whole;
    const MonitorLock guard = lock();
    if (_setOwner) ((*child).*_setOwner)(nullptr);
    change([&] { std::erase(_children, child); });
  }

  /// Replaces the content. Neither the old nor the new children's back-pointers are touched.
  void assign(std::vector<Pointer> children) {
    const MonitorLock guard = lock();
    change([&] { _children.swap(children); });
  }

  /// Moves a group, in its order, to `target`, a position counted before the move; each moved child from before the
  /// target lowers it by one. An index outside the list changes nothing and logs a critical line.
  void move(const IndexSet& indexes, std::size_t target) {
    const MonitorLock guard = lock();
    if (!indexes.empty() && isBeyond(*indexes.rbegin() + 1, _children.size())) return;
    if (isBeyond(target, _children.size())) return;
    std::vector<Pointer> moved;
    std::vector<Pointer> rest = _children;
    for (auto index = indexes.rbegin(); index != indexes.rend(); ++index) {
      moved.push_back(rest[*index]);
      rest.erase(at(rest, *index));
      if (*index < target) --target;
    }
    for (const Pointer& child : moved) rest.insert(at(rest, target), child);
    change([&] { _children.swap(rest); });
  }

 private:
  static auto at(std::vector<Pointer>& list, std::size_t index) {
    return list.begin() + static_cast<std::ptrdiff_t>(index);
  }

  void place(const Pointer& child, std::size_t index) {
    const Uninterrupted whole;
    // Room first: nothing fails between the child's back-pointer and its place.
    if (_children.size() == _children.capacity()) _children.reserve(std::max<std::size_t>(4, 2 * _children.size()));
    if (_setOwner) ((*child).*_setOwner)(std::static_pointer_cast<Owner>(_owner.shared_from_this()));
    change([&] { _children.insert(at(_children, index), child); });
  }

  [[nodiscard]] bool isBeyond(std::size_t index, std::size_t bound) const {
    if (index <= bound) return false;
    FDYLogger::logCritical("Index %ld is beyond the %ld items of \"%@\"", index, bound, std::string(_key));
    return true;
  }

  template <class Mutation>
  void change(const Mutation& mutation) {
    _owner.changeOnMainThread(_key, std::cref(mutation));  // a copy would be on the heap
  }

  Owner& _owner;
  const std::string_view _key;
  const SetOwner _setOwner;
  mutable RecursiveMonitor _monitor;
  std::vector<Pointer> _children;
};

}  // namespace quilt::platform
