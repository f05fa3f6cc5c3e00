// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/RandomUuidGenerator.h"

#include <sys/random.h>

#include <array>
#include <cstdint>
#include <cstdlib>

namespace quilt::platform {

namespace {

/// Random bytes, fetched for many UUIDs at once: loading a library makes a hundred thousand.
class Pool {
 public:
  std::uint8_t next() {
    if (_used == _bytes.size()) refill();
    return _bytes[_used++];
  }

 private:
  void refill() {
    // Up to 256 bytes come whole and without interruption; without random numbers there are no identities.
    if (::getrandom(_bytes.data(), _bytes.size(), 0) != static_cast<ssize_t>(_bytes.size())) std::abort();
    _used = 0;
  }

  std::array<std::uint8_t, 256> _bytes{};
  std::size_t _used = _bytes.size();
};

}  // namespace

std::string RandomUuidGenerator::generateUUID() {
  thread_local Pool pool;
  constexpr char hex[] = "0123456789ABCDEF";
  std::string text;
  text.reserve(36);
  for (int i = 0; i < 16; ++i) {
    if (i == 4 || i == 6 || i == 8 || i == 10) text += '-';
    unsigned byte = pool.next();
    if (i == 6) byte = 0x40U | (byte & 0x0FU);  // version 4
    if (i == 8) byte = 0x80U | (byte & 0x3FU);  // the standard variant
    text += hex[byte >> 4U];
    text += hex[byte & 15U];
  }
  return text;
}

}  // namespace quilt::platform
