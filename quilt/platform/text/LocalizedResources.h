// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <map>

#include "quilt/platform/interfaces/Resources.h"

namespace quilt::platform {

/// The compiled-in strings in one language, and the artwork.
class LocalizedResources final : public Resources {
 public:
  /// The user's language, from the environment: LC_ALL, else LC_MESSAGES, else LANG.
  LocalizedResources();
  /// "de", "pt_BR" …; a language without a table of its own reads the English one.
  explicit LocalizedResources(std::string_view language);

  [[nodiscard]] std::string localizedString(std::string_view key, std::string_view fallback) const override;
  [[nodiscard]] std::span<const unsigned char> artwork(std::string_view name, std::string_view type) const override;

 private:
  std::map<std::string, std::string, std::less<>> _strings;
};

/// Reads a table of lines `"key" = "value";`, with comments between /* and */ or behind //. Lines of another form are
/// passed over.
std::map<std::string, std::string, std::less<>> parseStrings(std::string_view text);

}  // namespace quilt::platform
