// SPDX-License-Identifier: Apache-2.0
// The properties file of document packages from strangers.
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>

#include "quilt/platform/install.h"
#include "tests/support/RecordChecks.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const bool isInstalled = (quilt::platform::install(), true);
  static_cast<void>(isInstalled);
  const std::string problem = quilt::support::problemWithRecord({reinterpret_cast<const char*>(data), size});
  if (problem.empty()) return 0;
  std::fprintf(stderr, "%s\n", problem.c_str());
  std::abort();
}
