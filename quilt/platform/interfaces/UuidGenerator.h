// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// Fresh identities. May be called on any thread.
class QUILT_EXPORT UuidGenerator {
 public:
  virtual ~UuidGenerator() = default;

  /// A random (version 4) UUID, 36 characters, letters in upper case.
  virtual std::string generateUUID() = 0;
};

/// A UUID from the installed generator.
QUILT_EXPORT std::string generateUUID();

}  // namespace quilt::platform
