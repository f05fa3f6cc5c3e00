// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

#include "quilt/platform/base/PropertyList.h"
#include "quilt/platform/base/Result.h"

namespace quilt::platform {

/// Reads the XML form, in UTF-8, UTF-16 or UTF-32, using up the buffer. Damaged, naming the place, when it is no
/// property list or exceeds a limit. No entity but XML's own is expanded and nothing outside the buffer is read.
///
/// An integer beyond 64 signed bits becomes the nearest real. Of the values that share a key the last counts. What
/// is no UTF-8 and what XML cannot hold becomes U+FFFD: every text that is read is the same once written and read
/// again.
Result<PropertyList> readXml(std::string& buffer);

/// Whether readXml would refuse these bytes for their length or for the number of their values.
bool exceedsLimits(std::string_view buffer);

/// Keeps the last of the values that share a key, each key in its first place.
void dropRepeatedKeys(Dictionary& dictionary);

}  // namespace quilt::platform
