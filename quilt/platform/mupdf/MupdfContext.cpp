// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/mupdf/MupdfContext.h"

#include <cstdlib>
#include <exception>
#include <utility>

namespace quilt::platform::mupdf {

namespace {

constexpr std::size_t kStoreSize = 32 << 20;

// Before each block: how large it is, at the alignment that malloc keeps.
constexpr std::size_t kPrefix = alignof(std::max_align_t);

void ignoreLine(void*, const char*) {}

std::size_t& sizeOf(void* start) { return *static_cast<std::size_t*>(start); }

}  // namespace

// MuPDF asks for memory wherever it works, so that is where its time is watched.
bool MupdfContext::Budget::isOver() {
  constexpr unsigned kCallsBetweenLooks = 64;
  if (!isLate && ++count % kCallsBetweenLooks == 0 && std::chrono::steady_clock::now() > deadline) {
    isLate = true;
    cookie.abort = 1;
  }
  return isLate;
}

void* MupdfContext::allocate(void* user, std::size_t size) { return reallocate(user, nullptr, size); }

void* MupdfContext::reallocate(void* user, void* old, std::size_t size) {
  Budget& budget = *static_cast<Budget*>(user);
  void* start = old ? static_cast<char*>(old) - kPrefix : nullptr;
  const std::size_t before = start ? sizeOf(start) : 0;
  if (budget.isOver() || size > kMaximumMemory || budget.used - before + size > kMaximumMemory) return nullptr;
  start = std::realloc(start, size + kPrefix);
  if (!start) return nullptr;
  sizeOf(start) = size;
  budget.used += size - before;
  return static_cast<char*>(start) + kPrefix;
}

void MupdfContext::release(void* user, void* old) {
  if (!old) return;
  void* start = static_cast<char*>(old) - kPrefix;
  static_cast<Budget*>(user)->used -= sizeOf(start);
  std::free(start);
}

MupdfContext::MupdfContext()
    : _allocator{&_budget, &MupdfContext::allocate, &MupdfContext::reallocate, &MupdfContext::release},
      _context(fz_new_context(&_allocator, nullptr, kStoreSize)) {
  if (!_context) return;
  fz_set_warning_callback(_context, ignoreLine, nullptr);
  fz_set_error_callback(_context, ignoreLine, nullptr);
}

MupdfContext::~MupdfContext() { fz_drop_context(_context); }

Result<void> MupdfContext::run(std::string_view sentence, const std::filesystem::path& file,
                               const std::function<void(fz_context*)>& body) {
  const auto error = [&](const char* words) {
    return Error{ErrorKind::Damaged, std::string(sentence) + " (" + words + ").", file};
  };
  if (!_context) return error("no memory");
  bool isOutOfMemory = false;
  const char* words = nullptr;
  fz_var(isOutOfMemory);
  fz_var(words);
  _budget.deadline = std::chrono::steady_clock::now() + kMaximumTime;
  _budget.cookie = {};
  fz_try(_context) {
    // An exception must not pass MuPDF's own frames.
    try {
      body(_context);
    } catch (const std::exception&) {
      isOutOfMemory = true;
    }
  }
  fz_catch(_context) { words = fz_caught_message(_context); }
  _budget.deadline = kNever;
  if (std::exchange(_budget.isLate, false)) return error("it takes too long");
  if (isOutOfMemory) return error("no memory");
  if (words) return error(words);
  return {};
}

}  // namespace quilt::platform::mupdf
