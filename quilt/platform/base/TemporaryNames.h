// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// The name under which an item is made before it takes the place `name` beside it: ".NAME.LETTERS.tmp", at most 255
/// bytes long, with eight letters that differ at each call.
QUILT_EXPORT std::string hiddenNameBeside(std::string_view name);

/// Whether hiddenNameBeside could have answered this name.
QUILT_EXPORT bool isHiddenTemporaryName(std::string_view name);

}  // namespace quilt::platform
