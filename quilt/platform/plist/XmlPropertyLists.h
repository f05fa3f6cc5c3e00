// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/PropertyLists.h"

namespace quilt::platform {

/// Property lists in their XML form, on the installed files; reads the binary form too. What memory does not suffice
/// for is an error, but for serialize, which throws as any text may.
class XmlPropertyLists final : public PropertyLists {
 public:
  [[nodiscard]] Result<PropertyList> parse(std::string_view bytes) const override;
  [[nodiscard]] std::string serialize(const PropertyList& value) const override;
  [[nodiscard]] Result<Dictionary> readDictionary(const std::filesystem::path& path) const override;
  Result<void> writeDictionary(const Dictionary& dictionary, const std::filesystem::path& path) override;
  Result<FileIdentity> replaceDictionary(const Dictionary& dictionary, const std::filesystem::path& path,
                                         const FileIdentity& replaced) override;
};

}  // namespace quilt::platform
