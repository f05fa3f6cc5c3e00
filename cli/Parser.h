// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "cli/Request.h"

namespace quilt::cli {

/// Reads the words after the program's name. Throws a Failure with the code Usage when they are no command.
Request parse(const std::vector<std::string>& arguments);

/// Whether the words ask for JSON, told without parsing them, so that a failure to parse is JSON too.
bool asksForJson(const std::vector<std::string>& arguments);

}  // namespace quilt::cli
