// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "cli/Options.h"

namespace quilt::cli {

/// The manual page, in the man macros of man(7): of the program ("quilt(1)"), or of one command ("quilt-import(1)").
std::string manualPage(const CommandDescription* command);

}  // namespace quilt::cli
