// SPDX-License-Identifier: Apache-2.0
// Movies and sound files from strangers. Seed it with small real files.
#include <cstddef>
#include <cstdint>

#include "tests/support/InspectBytes.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  constexpr std::size_t most = 1U << 20U;
  if (size <= most) quilt::support::inspectBytes({data, size});
  return 0;
}
