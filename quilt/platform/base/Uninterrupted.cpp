// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/Uninterrupted.h"

#include <utility>

namespace quilt::platform {

namespace {

struct Held {
  std::size_t depth = 0;
  std::exception_ptr first;
};

thread_local Held held;

}  // namespace

Uninterrupted::Uninterrupted() { ++held.depth; }

Uninterrupted::~Uninterrupted() noexcept(false) {
  if (--held.depth > 0) return;
  const std::exception_ptr first = std::exchange(held.first, nullptr);
  if (first && std::uncaught_exceptions() == _onTheirWay) std::rethrow_exception(first);
}

void Uninterrupted::hold(std::exception_ptr thrown) {
  if (!held.first) held.first = std::move(thrown);
}

Uninterrupted::Suspended::Suspended()
    : _depth(std::exchange(held.depth, 0)), _first(std::exchange(held.first, nullptr)) {}

Uninterrupted::Suspended::~Suspended() {
  held.depth = _depth;
  held.first = _first;
}

}  // namespace quilt::platform
