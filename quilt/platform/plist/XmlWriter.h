// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "quilt/platform/base/PropertyList.h"

namespace quilt::platform {

/// The XML form of a property list, UTF-8 with a line for each value. Text that XML cannot hold (bytes that are no
/// UTF-8, most control characters) becomes U+FFFD, so that what is written can always be read.
std::string writeXml(const PropertyList& value);
std::string writeXml(const Dictionary& dictionary);

}  // namespace quilt::platform
