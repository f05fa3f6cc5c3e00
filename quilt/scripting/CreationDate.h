// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>

#include "quilt/platform/base/Date.h"

namespace quilt::scripting {

/// The day in the user's language ("March 5, 2024"), none without a date, and the debug line that tells it. Collections
/// and documents share the line, which calls both a collection.
std::optional<std::string> creationDateOf(const std::string& uuid, const std::optional<platform::Date>& date);

}  // namespace quilt::scripting
