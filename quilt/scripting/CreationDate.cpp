// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/CreationDate.h"

#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::scripting {

std::optional<std::string> creationDateOf(const std::string& uuid, const std::optional<platform::Date>& date) {
  std::optional<std::string> text;
  if (date) text = platform::services().dates->format(*date, "MMMM d, yyyy");
  platform::FDYLogger::logDebug("Conveyor is getting collection \"%@\" date \"%@\"", uuid, text);
  return text;
}

}  // namespace quilt::scripting
