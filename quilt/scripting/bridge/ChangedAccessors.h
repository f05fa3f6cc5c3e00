// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <span>
#include <string_view>

namespace quilt::scripting {

/// Which accessors of a class answer otherwise after a change of one observed key.
struct ChangedAccessors {
  std::string_view className;
  std::string_view key;
  std::span<const std::string_view> accessors;
};

/// Every key whose change scripts are told of. A test sees to it that each accessor that answers something is here, but
/// for those that never change.
std::span<const ChangedAccessors> changedAccessors();

}  // namespace quilt::scripting
