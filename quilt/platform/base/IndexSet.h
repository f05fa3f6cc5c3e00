// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <set>

namespace quilt::platform {

/// Positions in a list, each once, in ascending order.
using IndexSet = std::set<std::size_t>;

}  // namespace quilt::platform
