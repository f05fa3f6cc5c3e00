// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "cli/Catalogue.h"

namespace quilt::cli {

/// Throws a Failure, Usage, when finalizing would delete files at the top of the package that no theme brought:
/// `cannot` says what is not done, the Failure names the files and --force.
void checkForeignEntries(const DocumentEntry& document, const std::string& cannot);

}  // namespace quilt::cli
