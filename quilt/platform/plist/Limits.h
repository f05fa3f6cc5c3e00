// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>

namespace quilt::platform {

// What a property list may ask of its reader. The record of a thousand media items stays below a hundredth of each.
inline constexpr std::uint64_t kLongestPropertyList = std::uint64_t{256} << 20U;  ///< bytes, in either form
inline constexpr std::size_t kDeepestNesting = 128;     ///< values inside values, the root included
inline constexpr std::size_t kMostTags = 16'000'000;    ///< "<" and "=" of the XML form; a key with a value takes four
inline constexpr std::size_t kMostObjects = 4'000'000;  ///< values of the binary form, a shared one each time anew
inline constexpr std::uint64_t kMostUnfolded = kLongestPropertyList;  ///< bytes of text and data, likewise

}  // namespace quilt::platform
