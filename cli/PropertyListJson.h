// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "cli/Failure.h"
#include "quilt/platform/base/PropertyList.h"

namespace quilt::cli {

/// A property list as JSON: dates as ISO 8601 text, data as base64 text, everything else as it is.
Json toJson(const platform::PropertyList& value);
Json toJson(const platform::Dictionary& dictionary);

}  // namespace quilt::cli
