// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

namespace quilt::cli {

/// Scripts that teach a shell to complete the words of this program: commands, their options, the choices of both.
/// Where any value may stand, the shell offers files.
std::string bashCompletion();
std::string zshCompletion();
std::string fishCompletion();

}  // namespace quilt::cli
