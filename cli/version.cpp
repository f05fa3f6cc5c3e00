// SPDX-License-Identifier: Apache-2.0
#include "cli/version.h"

#include "quilt/version.h"

namespace quilt::cli {

const char* version() { return QUILT_VERSION; }

}  // namespace quilt::cli
