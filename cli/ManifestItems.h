// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <vector>

#include "cli/Failure.h"
#include "cli/Items.h"
#include "cli/Manifest.h"

namespace quilt::cli {

/// The items of a manifest, their files looked at: the library takes them, and each item's sources make the category
/// that it has. What is wrong is added to the problems, with its place; the items are complete when nothing was added
/// and the block, which gets 0 to 100, never answered false.
std::vector<NewItem> lookAtItems(const Manifest& manifest, std::vector<Failure>& problems,
                                 const ProgressionBlock& block);

}  // namespace quilt::cli
