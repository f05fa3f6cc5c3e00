// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <mupdf/fitz.h>

#include <array>
#include <chrono>
#include <cstddef>

namespace quilt::platform::mupdf {

/// The most memory that one document may take while it is looked at.
inline constexpr std::size_t kMaximumMemory = 256 << 20;

/// Up to this many bytes, a released block is kept for the next of its size: of these MuPDF asks for a million while it
/// reads a document, and malloc took an eighth of its time.
inline constexpr std::size_t kSmallBlock = 256;

/// The longest that one step of the work on a document may take.
inline constexpr std::chrono::seconds kMaximumTime{20};

/// The memory and the time that a document may take. Must outlive the MuPDF context that uses it, and everything made
/// with that; one thread at a time.
class Budget {
 public:
  Budget();
  Budget(const Budget&) = delete;
  Budget& operator=(const Budget&) = delete;
  ~Budget();

  /// What gives MuPDF its memory: none beyond the limit, and none once the time is up.
  const fz_alloc_context* allocator() const { return &_allocator; }

  /// What stops a page that is being drawn or read for text once the time is up.
  fz_cookie* cookie() { return &_cookie; }

  void startStep();
  /// Answers whether the step took too long.
  bool endStep();

 private:
  static void* allocate(void* budget, std::size_t size);
  static void* reallocate(void* budget, void* old, std::size_t size);
  static void release(void* budget, void* old);

  bool isOver();
  void* small(std::size_t size);
  void* large(void* old, std::size_t size);

  fz_alloc_context _allocator{this, &allocate, &reallocate, &release};
  std::size_t _used = 0;  // large blocks, and pieces for small ones

  std::array<void*, kSmallBlock / alignof(std::max_align_t) + 1> _released{};
  void* _pieces = nullptr;
  char* _next = nullptr;  // of the last piece, what no block was cut from yet
  std::size_t _left = 0;

  std::chrono::steady_clock::time_point _deadline = std::chrono::steady_clock::time_point::max();
  unsigned _count = 0;
  bool _isLate = false;
  fz_cookie _cookie{};
};

}  // namespace quilt::platform::mupdf
