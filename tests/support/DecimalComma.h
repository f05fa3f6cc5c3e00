// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "tests/support/ScratchFolder.h"

namespace quilt::support {

/// While it lives, the process has a language that writes 1,5 for one and a half, as a host's toolkit may set one.
class DecimalComma {
 public:
  DecimalComma();
  DecimalComma(const DecimalComma&) = delete;
  DecimalComma& operator=(const DecimalComma&) = delete;
  ~DecimalComma();

  /// False when this system cannot make such a language.
  [[nodiscard]] bool isInForce() const;

 private:
  const ScratchFolder _folder;
  const std::string _before;
};

}  // namespace quilt::support
