// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// A point in time, to the nanosecond.
using Date = std::chrono::system_clock::time_point;

/// @{
/// The days that the clock holds in full; what lies outside is clamped when it is read.
inline constexpr std::chrono::sys_days kEarliestDay{std::chrono::year{1678} / 1 / 1};
inline constexpr std::chrono::sys_days kLatestDay{std::chrono::year{2262} / 1 / 1};
/// @}

/// "2026-03-05T14:07:09Z": UTC, whole seconds (fractions are dropped, toward the past).
QUILT_EXPORT std::string formatIso8601(Date date);

/// Reads exactly the form that formatIso8601 writes; none for anything else or for a day that does not exist.
QUILT_EXPORT std::optional<Date> parseIso8601(std::string_view text);

}  // namespace quilt::platform
