// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

namespace quilt::support {

/// Puts the bytes, whichever they are, into a package as its properties file, opens the document, reads everything that
/// it holds, saves it and opens it again. What is wrong with what comes of it, in one sentence; empty when nothing is.
/// Right is: it opens or is refused; saved and opened again it has the same record, and saves the same bytes; nothing
/// outside of the package was touched. On the installed platform, main thread.
std::string problemWithRecord(std::string_view properties);

}  // namespace quilt::support
