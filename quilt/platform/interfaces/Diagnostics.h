// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <vector>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// One decoder, encoder, renderer or library, as the program's `doctor` lists it.
struct Capability {
  std::string name;      ///< "H.264 decoder"
  bool present = false;  ///< whether this build on this machine has it
  std::string version;   ///< of the library behind it; empty when absent
  std::string remedy;    ///< what to do when it is absent; empty when present
};

/// What this build and this machine can do.
class QUILT_EXPORT Diagnostics {
 public:
  virtual ~Diagnostics() = default;
  /// Looks each time: what is installed may change while the process runs.
  [[nodiscard]] virtual std::vector<Capability> capabilities() const = 0;
};

}  // namespace quilt::platform
