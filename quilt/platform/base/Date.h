// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

namespace quilt::platform {

using Date = std::chrono::system_clock::time_point;

/// "2026-03-05T14:07:09Z": UTC, whole seconds (fractions are dropped, toward the past).
/// The clock holds the years 1678 to 2262; what lies outside is clamped when it is read.
std::string formatIso8601(Date date);

/// Reads exactly the form that formatIso8601 writes; none for anything else or for a day that does not exist.
std::optional<Date> parseIso8601(std::string_view text);

}  // namespace quilt::platform
