// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "quilt/platform/base/PropertyList.h"
#include "quilt/platform/base/Result.h"

namespace quilt::platform {

/// Reads the XML form, using up the buffer. Damaged, naming the place, when it is no property list or nests deeper than
/// kDeepestNesting. No entity but XML's own is expanded and nothing outside the buffer is read.
Result<PropertyList> readXml(std::string& buffer);

inline constexpr std::size_t kDeepestNesting = 128;

/// Keeps the last of the values that share a key, each key in its first place.
void dropRepeatedKeys(Dictionary& dictionary);

}  // namespace quilt::platform
