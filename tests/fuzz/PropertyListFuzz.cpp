// SPDX-License-Identifier: Apache-2.0
// Property lists from strangers, in both forms.
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>

#include "tests/support/PropertyListChecks.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string problem = quilt::support::problemWhenReading({reinterpret_cast<const char*>(data), size});
  if (problem.empty()) return 0;
  std::fprintf(stderr, "%s\n", problem.c_str());
  std::abort();
}
