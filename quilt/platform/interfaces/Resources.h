// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <span>
#include <string>
#include <string_view>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// The library's own bundle: the strings of the table "Localizable" and the artwork used in drawing, compiled in.
/// May be called on any thread.
class QUILT_EXPORT Resources {
 public:
  virtual ~Resources() = default;

  /// The text for `key` in the user's language, or `fallback`.
  [[nodiscard]] virtual std::string localizedString(std::string_view key, std::string_view fallback) const = 0;

  /// The bytes of the artwork `name` of type `type` ("AudioPreview" "png", …); empty when there is none. They live as
  /// long as the process.
  [[nodiscard]] virtual std::span<const unsigned char> artwork(std::string_view name, std::string_view type) const = 0;
};

}  // namespace quilt::platform
