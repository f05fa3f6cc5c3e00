// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

namespace quilt::scripting {

/// A package's page as the bridge serves it: conveyor.js comes before the page's own scripts, and the content security
/// policy that the page carries for readers on disk, which bars all connections, is left out; the server sends its own.
std::string withConveyor(std::string page);

}  // namespace quilt::scripting
