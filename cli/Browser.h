// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <sys/types.h>

#include <string>

#include "cli/Catalogue.h"

namespace quilt::cli {

/// Opens an address in the user's browser, through a page of the user's own that leads there: other users can see the
/// words that a program is started with, and the address is a secret. The page goes with this object.
class Browser {
 public:
  explicit Browser(const std::string& address);
  Browser(const Browser&) = delete;
  Browser& operator=(const Browser&) = delete;
  ~Browser();

  /// Whether "xdg-open" was there to be started.
  [[nodiscard]] bool hasStarted() const { return _process > 0; }

 private:
  Path _folder;
  pid_t _process = 0;
};

}  // namespace quilt::cli
