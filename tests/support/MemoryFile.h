// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <sys/mman.h>
#include <unistd.h>

#include <cstdint>
#include <filesystem>
#include <span>
#include <stdexcept>
#include <string>

namespace quilt::support {

/// Bytes under a path, without a disk.
class MemoryFile {
 public:
  explicit MemoryFile(std::span<const std::uint8_t> bytes) : _descriptor(memfd_create("bytes", MFD_CLOEXEC)) {
    if (_descriptor < 0 || write(_descriptor, bytes.data(), bytes.size()) != static_cast<ssize_t>(bytes.size())) {
      throw std::runtime_error("no file in memory");
    }
  }
  MemoryFile(const MemoryFile&) = delete;
  MemoryFile& operator=(const MemoryFile&) = delete;
  ~MemoryFile() { close(_descriptor); }
  [[nodiscard]] std::filesystem::path path() const { return "/proc/self/fd/" + std::to_string(_descriptor); }

 private:
  int _descriptor;
};

}  // namespace quilt::support
