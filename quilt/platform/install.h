// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// Builds the real services and installs them for this process; the calling thread becomes the main thread. Call it
/// once, first. What this build was made without answers "none", with one warning that names it.
QUILT_EXPORT void install();

}  // namespace quilt::platform
