// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/UuidGenerator.h"

namespace quilt::platform {

/// UUIDs from the system's random numbers.
class RandomUuidGenerator final : public UuidGenerator {
 public:
  std::string generateUUID() override;
};

}  // namespace quilt::platform
