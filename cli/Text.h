// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "quilt/platform/base/Date.h"

namespace quilt::cli {

/// Text safe to show on a terminal, on one line: control characters, direction overrides and bytes that are no UTF-8
/// appear as "\n", "\u202e", "\xff"; a backslash as two.
std::string escaped(std::string_view text);

/// escaped() in double quotes.
std::string inQuotes(std::string_view text);
/// What an object is called in a message: its title, or without one its identifier.
std::string inQuotes(const std::string& title, const std::string& uuid);

/// Whether the bytes can be kept as a text: UTF-8 without control characters but for line ends and tabs.
bool isText(std::string_view bytes);

/// Any bytes as UTF-8 without control characters, fit for a title: what cannot stay becomes U+FFFD or a space.
std::string asTitle(std::string_view bytes);

/// "1.2 MB": powers of 1000.
std::string sizeText(std::uint64_t bytes);

/// "0:07", "12:34", "1:02:03".
std::string durationText(double seconds);

/// "2026-03-05 14:07" in the user's time zone.
std::string dateText(platform::Date date);

/// Columns that a UTF-8 text takes, counting one for each character.
std::size_t columns(std::string_view text);

/// The text followed by spaces up to the column count.
std::string padded(std::string_view text, std::size_t width);

}  // namespace quilt::cli
