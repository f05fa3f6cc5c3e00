// SPDX-License-Identifier: Apache-2.0
#include "tests/support/FailingAllocation.h"

#include <cstdlib>
#include <new>

namespace {

// Allocations until the one that fails; 0: none does.
[[maybe_unused]] thread_local std::size_t countdown = 0;

void* allocate(std::size_t size) noexcept {
  if (countdown > 0 && --countdown == 0) return nullptr;
  return std::malloc(size > 0 ? size : 1);
}

[[maybe_unused]] void* allocateOrThrow(std::size_t size) {
  if (void* memory = allocate(size)) return memory;
  throw std::bad_alloc();
}

}  // namespace

// ThreadSanitizer's own forms cannot be replaced; the suites that run under it fail no allocation.
#if !defined(__has_feature)
#define __has_feature(feature) 0
#endif
#if !__has_feature(thread_sanitizer)
// Every form for ordinary alignment: a sanitizer brings forms of its own, which would pair with none of these.
void* operator new(std::size_t size) { return allocateOrThrow(size); }
void* operator new[](std::size_t size) { return allocateOrThrow(size); }
void* operator new(std::size_t size, const std::nothrow_t&) noexcept { return allocate(size); }
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept { return allocate(size); }
void operator delete(void* memory) noexcept { std::free(memory); }
void operator delete[](void* memory) noexcept { std::free(memory); }
void operator delete(void* memory, std::size_t) noexcept { std::free(memory); }
void operator delete[](void* memory, std::size_t) noexcept { std::free(memory); }
void operator delete(void* memory, const std::nothrow_t&) noexcept { std::free(memory); }
void operator delete[](void* memory, const std::nothrow_t&) noexcept { std::free(memory); }
#endif

namespace quilt::support {

FailingAllocation::FailingAllocation(std::size_t nth) { countdown = nth; }
FailingAllocation::~FailingAllocation() { countdown = 0; }
bool FailingAllocation::hasFailed() const { return countdown == 0; }

}  // namespace quilt::support
