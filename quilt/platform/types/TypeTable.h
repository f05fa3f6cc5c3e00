// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <span>
#include <vector>

#include "quilt/platform/interfaces/TypeIdentifiers.h"

namespace quilt::platform {

/// One type: what it is called, what it is a kind of, and how to tell its files.
struct TypeRow {
  const char* identifier;
  std::vector<const char*> parents;
  std::vector<const char*> extensions;  ///< lower case, the preferred one first
  std::vector<const char*> mimeTypes;   ///< the preferred one first
};

/// The one table of types. Every parent has a row of its own.
std::span<const TypeRow> typeRows();

/// Type identifiers from the table, the file's name and its first bytes.
class TypeTable final : public TypeIdentifiers {
 public:
  [[nodiscard]] std::optional<std::string> preferredIdentifier(const std::filesystem::path& path) const override;
  [[nodiscard]] bool conformsTo(std::string_view identifier, std::string_view other) const override;
  [[nodiscard]] std::optional<std::string> mimeType(std::string_view identifier) const override;
};

}  // namespace quilt::platform
