// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>

#include "quilt/platform/base/Result.h"

namespace quilt::cli {

/// What the disk refused lately. The library answers that something failed, and its lines do not always tell why; a
/// command that failed while the disk refused something failed because of that. Any thread.
class DiskTrouble {
 public:
  /// Has the installed file manager remember what fails, from now on.
  static void listen();
  /// Forgets what came before.
  static void forget();
  /// The first error since then with which the disk refused a change; none when there was none.
  static std::optional<platform::Error> first();
};

}  // namespace quilt::cli
