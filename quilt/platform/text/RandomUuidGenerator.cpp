// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/RandomUuidGenerator.h"

#include <sys/random.h>
#include <unistd.h>

#include <array>
#include <cstdint>
#include <cstdlib>

namespace quilt::platform {

namespace {

using Bytes = std::array<std::uint8_t, 16>;

/// Random bytes, fetched for many UUIDs at once: loading a library makes a hundred thousand.
class Pool {
 public:
  const Bytes& next() {
    // A process made by fork must not go on with its parent's bytes.
    const pid_t process = ::getpid();
    if (process != _process || _used == _uuids.size()) refill();
    _process = process;
    return _uuids[_used++];
  }

 private:
  void refill() {
    // Up to 256 bytes come whole and without interruption; without random numbers there are no identities.
    if (::getrandom(_uuids.data(), sizeof _uuids, 0) != static_cast<ssize_t>(sizeof _uuids)) std::abort();
    _used = 0;
  }

  std::array<Bytes, 16> _uuids{};
  std::size_t _used = _uuids.size();
  pid_t _process = 0;
};

}  // namespace

std::string RandomUuidGenerator::generateUUID() {
  thread_local Pool pool;
  constexpr char hex[] = "0123456789ABCDEF";
  Bytes bytes = pool.next();
  bytes[6] = static_cast<std::uint8_t>(0x40U | (bytes[6] & 0x0FU));  // version 4
  bytes[8] = static_cast<std::uint8_t>(0x80U | (bytes[8] & 0x3FU));  // the standard variant
  std::string text(36, '-');
  char* out = text.data();
  for (std::size_t i = 0; i < bytes.size(); ++i) {
    if (i == 4 || i == 6 || i == 8 || i == 10) ++out;
    *out++ = hex[bytes[i] >> 4U];
    *out++ = hex[bytes[i] & 15U];
  }
  return text;
}

}  // namespace quilt::platform
