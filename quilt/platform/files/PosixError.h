// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>

#include "quilt/platform/base/Error.h"

namespace quilt::platform {

/// Words an error number of the operating system.
Error posixError(int number, const std::filesystem::path& file);

}  // namespace quilt::platform
