// SPDX-License-Identifier: Apache-2.0
#pragma once

namespace quilt::platform {

/// How the main thread waits inside RecursiveMonitor: as MainThread::waitAndRunQueuedBlocks() and signal(), but apart
/// from the loop's, so that waiting for a lock loses no signal to the loop.
void waitForFreedMonitor();
void signalFreedMonitor();

}  // namespace quilt::platform
