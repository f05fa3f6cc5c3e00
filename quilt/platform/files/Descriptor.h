// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <unistd.h>

#include <utility>

namespace quilt::platform {

/// Owns a file descriptor.
class Descriptor {
 public:
  explicit Descriptor(int number = -1) : _number(number) {}
  Descriptor(Descriptor&& other) noexcept : _number(other.release()) {}
  Descriptor& operator=(Descriptor&& other) noexcept {
    std::swap(_number, other._number);
    return *this;
  }
  ~Descriptor() {
    if (_number >= 0) ::close(_number);
  }

  [[nodiscard]] int number() const { return _number; }
  explicit operator bool() const { return _number >= 0; }
  int release() { return std::exchange(_number, -1); }

 private:
  int _number;
};

}  // namespace quilt::platform
