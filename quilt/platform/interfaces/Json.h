// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/PropertyList.h"

namespace quilt::platform {

/// Property-list values as JSON text. Any thread.
class QUILT_EXPORT JsonWriter {
 public:
  virtual ~JsonWriter() = default;

  /// One line of UTF-8 that is also safe inside a script element: "<" is never followed by "/" or "!", and the line
  /// separators of Unicode are escaped. Dates are ISO 8601 in UTC, numbers read back to the same value, data is an
  /// array of bytes; a number that JSON does not have is null.
  [[nodiscard]] virtual std::string toJSON(const Dictionary& dictionary) const = 0;
};

}  // namespace quilt::platform
