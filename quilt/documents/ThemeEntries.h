// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <vector>

#include "quilt/sources/ModelTypes.h"

namespace quilt {

/// Where a document's record holds the names of the top-level entries that its theme brought.
inline constexpr const char* kThemeEntriesKey = "ThemeEntries";

/// These names; what is no text among them is passed over.
std::vector<std::string> themeEntriesIn(const Dictionary& record);

}  // namespace quilt
