// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

namespace quilt::support {

/// docs/accessors.md, made from the table of accessors.
std::string accessorsPage();

/// The interfaces of the six classes as conveyor.d.ts declares them, made from the same table.
std::string accessorDeclarations();

}  // namespace quilt::support
