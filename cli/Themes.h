// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "quilt/themes/QuiltTheme.h"

namespace quilt::cli {

/// The valid themes of the user, the system and the application, in that order.
std::vector<std::shared_ptr<QuiltTheme>> installedThemes();

/// The theme with this identifier, or in the bundle at this path. Throws a Failure, NotFound or Invalid.
std::shared_ptr<QuiltTheme> findTheme(const std::string& name);

}  // namespace quilt::cli
