// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <vector>

namespace quilt::cli {

/// The whole program: reads the words after its name, carries the command out, reports. The exit code. Main thread; the
/// platform is installed.
int run(const std::vector<std::string>& arguments);

}  // namespace quilt::cli
