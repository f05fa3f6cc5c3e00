// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/copyfile_callback.h"

namespace quilt {

using platform::CopyAnswer;
using platform::CopyStage;

CopyAnswer copyfile_callback(int /*what*/, CopyStage stage, const platform::CopyState& state, const Path& /*source*/,
                             const Path& /*destination*/, void* context) {
  switch (stage) {
    case CopyStage::Start:
    case CopyStage::Finish:
      return CopyAnswer::Continue;
    case CopyStage::Error:
      return CopyAnswer::Quit;
    case CopyStage::Progress:
      break;
  }
  const auto& copy = *static_cast<const CopyContext*>(context);
  const std::int64_t percentage = copy.total == 0 ? 0 : state.copiedBytes * 100 / copy.total;
  return platform::report(copy.block, static_cast<double>(percentage)) ? CopyAnswer::Continue : CopyAnswer::Quit;
}

}  // namespace quilt
