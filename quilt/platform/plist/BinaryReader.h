// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>

#include "quilt/platform/base/PropertyList.h"
#include "quilt/platform/base/Result.h"

namespace quilt::platform {

inline constexpr std::string_view kBinaryMagic = "bplist00";

/// Reads the binary form: "bplist00", objects, a table of their offsets and a trailer of 32 bytes. Damaged when an
/// offset or reference leads nowhere, objects nest deeper than kDeepestNesting (and so when they contain themselves),
/// or shared objects would unfold to more than kMostObjects values or kMostUnfolded bytes.
///
/// Numbers out of range, repeated keys and texts that XML cannot hold are read as in readXml.
Result<PropertyList> readBinary(std::string_view bytes);

}  // namespace quilt::platform
