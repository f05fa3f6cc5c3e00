// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/mupdf/Budget.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <utility>

namespace quilt::platform::mupdf {

namespace {

#if defined(__SANITIZE_ADDRESS__)
#define QUILT_CHECKS_ADDRESSES 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer)
#define QUILT_CHECKS_ADDRESSES 1
#endif
#endif

// AddressSanitizer must see each block, to see what is done to it once it is released.
#ifdef QUILT_CHECKS_ADDRESSES
constexpr bool kKeepsSmallBlocks = false;
#else
constexpr bool kKeepsSmallBlocks = true;
#endif

// Before each block: how large it is, at the alignment that malloc keeps.
constexpr std::size_t kPrefix = alignof(std::max_align_t);
constexpr std::size_t kPiece = 64 << 10;

bool isSmall(std::size_t size) { return kKeepsSmallBlocks && size > 0 && size <= kSmallBlock; }

// In which list of released blocks one of this size belongs.
std::size_t stepsOf(std::size_t size) { return (size + kPrefix - 1) / kPrefix; }

std::size_t& sizeOf(void* block) { return *reinterpret_cast<std::size_t*>(static_cast<char*>(block) - kPrefix); }

// What follows in a list of pieces or of released blocks.
void*& nextOf(void* start) { return *static_cast<void**>(start); }

}  // namespace

Budget::Budget() = default;

Budget::~Budget() {
  while (_pieces) std::free(std::exchange(_pieces, nextOf(_pieces)));
}

void Budget::startStep() {
  _deadline = std::chrono::steady_clock::now() + kMaximumTime;
  _cookie = {};
}

bool Budget::endStep() {
  _deadline = std::chrono::steady_clock::time_point::max();
  return std::exchange(_isLate, false);
}

// MuPDF asks for memory wherever it works, so that is where its time is watched.
bool Budget::isOver() {
  constexpr unsigned kCallsBetweenLooks = 64;
  if (!_isLate && ++_count % kCallsBetweenLooks == 0 && std::chrono::steady_clock::now() > _deadline) {
    _isLate = true;
    _cookie.abort = 1;
  }
  return _isLate;
}

void* Budget::small(std::size_t size) {
  const std::size_t steps = stepsOf(size);
  if (void*& first = _released[steps]) {
    void* const block = std::exchange(first, nextOf(first));
    sizeOf(block) = size;
    return block;
  }
  const std::size_t needed = kPrefix + steps * kPrefix;
  if (_left < needed) {
    if (_used + kPiece > kMaximumMemory) return nullptr;
    void* const piece = std::malloc(kPiece);
    if (!piece) return nullptr;
    _used += kPiece;
    nextOf(piece) = std::exchange(_pieces, piece);
    _next = static_cast<char*>(piece) + kPrefix;
    _left = kPiece - kPrefix;
  }
  void* const block = _next + kPrefix;
  _next += needed;
  _left -= needed;
  sizeOf(block) = size;
  return block;
}

void* Budget::large(void* old, std::size_t size) {
  const std::size_t before = old ? sizeOf(old) : 0;
  if (size > kMaximumMemory || _used - before + size > kMaximumMemory) return nullptr;
  void* const start = std::realloc(old ? static_cast<char*>(old) - kPrefix : nullptr, size + kPrefix);
  if (!start) return nullptr;
  _used += size - before;
  void* const block = static_cast<char*>(start) + kPrefix;
  sizeOf(block) = size;
  return block;
}

void* Budget::allocate(void* budget, std::size_t size) {
  Budget& self = *static_cast<Budget*>(budget);
  if (self.isOver()) return nullptr;
  return isSmall(size) ? self.small(size) : self.large(nullptr, size);
}

void* Budget::reallocate(void* budget, void* old, std::size_t size) {
  Budget& self = *static_cast<Budget*>(budget);
  if (self.isOver()) return nullptr;
  if (old && !isSmall(sizeOf(old)) && !isSmall(size)) return self.large(old, size);
  void* const block = isSmall(size) ? self.small(size) : self.large(nullptr, size);
  if (old && block) {
    std::memcpy(block, old, std::min(size, sizeOf(old)));
    release(budget, old);
  }
  return block;
}

void Budget::release(void* budget, void* old) {
  if (!old) return;
  Budget& self = *static_cast<Budget*>(budget);
  const std::size_t size = sizeOf(old);
  if (isSmall(size)) {
    void*& first = self._released[stepsOf(size)];
    nextOf(old) = std::exchange(first, old);
  } else {
    self._used -= size;
    std::free(static_cast<char*>(old) - kPrefix);
  }
}

}  // namespace quilt::platform::mupdf
