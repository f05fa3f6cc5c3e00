// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string_view>

#include "quilt/platform/base/PropertyList.h"

namespace quilt::platform {

/// The text without XML's white space at its ends.
std::string_view trimmed(std::string_view text);

/// Whether an element of this name holds an integer, a real, a date or data.
bool isScalarElement(std::string_view name);

/// The value that the text of such an element stands for; none when it cannot be read, or for any other name.
std::optional<PropertyList> scalarFrom(std::string_view name, std::string_view text);

}  // namespace quilt::platform
