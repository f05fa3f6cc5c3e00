// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "quilt/platform/base/PropertyList.h"

namespace quilt::platform {

std::string encodeBase64(const Data& data);

/// White space is skipped. None for other characters or a wrong length.
std::optional<Data> decodeBase64(std::string_view text);

}  // namespace quilt::platform
