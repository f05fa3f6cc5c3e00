// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

#include "quilt/platform/base/PropertyList.h"
#include "quilt/platform/base/Result.h"

namespace quilt::support {

/// What is wrong with a value that a reader answered, in one sentence; empty when nothing is. Right is: texts and keys
/// can be written, no key stands twice, dates are in the clock's range, at most 128 levels, and writing, reading and
/// writing it anew gives the same bytes.
std::string problemWith(const platform::PropertyList& value);

/// Reads the bytes, whichever they are, and judges what comes of it: a right value, the same of both readers of XML, or
/// an error that says something. Empty when it is one of both.
std::string problemWhenReading(std::string_view bytes);

}  // namespace quilt::support
