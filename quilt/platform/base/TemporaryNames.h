// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

namespace quilt::platform {

/// The name under which an item is made before it takes the place `name` beside it: ".NAME.LETTERS.tmp", at most 255
/// bytes long, with eight letters that differ at each call.
std::string hiddenNameBeside(std::string_view name);

/// Whether hiddenNameBeside could have answered this name.
bool isHiddenTemporaryName(std::string_view name);

}  // namespace quilt::platform
