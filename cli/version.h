// SPDX-License-Identifier: Apache-2.0
#pragma once

namespace quilt::cli {

/// "0.1.0".
const char* version();

}  // namespace quilt::cli
