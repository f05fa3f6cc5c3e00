// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string_view>

#include "quilt/platform/base/PropertyList.h"

namespace quilt::platform {

/// Reads the XML form as programs write it: UTF-8, tags without attributes or space in them, no comments, sections or
/// numbered characters. That takes one pass and no tree, less than half of the time. None for everything else, damaged
/// or not, which readXml reads with a full XML parser; what both read they read alike.
std::optional<PropertyList> readPlainXml(std::string_view text);

}  // namespace quilt::platform
