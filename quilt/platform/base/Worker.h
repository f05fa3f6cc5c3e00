// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// Runs a long job on a thread of its own while the main thread, which calls this, runs the blocks queued for it.
/// Returns when the job has ended; what the job throws is thrown to the caller. On any other thread the job runs where
/// it is.
QUILT_EXPORT void runOnWorker(const std::function<void()>& job);

}  // namespace quilt::platform
