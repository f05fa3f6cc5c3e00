// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/interfaces/FileManager.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt {

/// What copyfile_callback needs to turn bytes into a percentage.
struct CopyContext {
  std::int32_t total;      ///< bytes
  ProgressionBlock block;  ///< hears the percentage
};

/// The progress callback for FileManager::copyfile; `context` is a CopyContext. Goes on at the start and the finish,
/// quits on an error, and otherwise hands copied × 100 / total, in integer arithmetic, to the block and answers what
/// the block answers. A total of 0 counts as nothing copied.
QUILT_EXPORT platform::CopyAnswer copyfile_callback(int what, platform::CopyStage stage,
                                                    const platform::CopyState& state, const Path& source,
                                                    const Path& destination, void* context);

}  // namespace quilt
