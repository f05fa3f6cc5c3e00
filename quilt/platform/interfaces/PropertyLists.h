// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <string>
#include <string_view>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/PropertyList.h"
#include "quilt/platform/base/Result.h"
#include "quilt/platform/interfaces/FileManager.h"

namespace quilt::platform {

/// Property lists as text and as files. Every operation may be called on any thread.
class QUILT_EXPORT PropertyLists {
 public:
  virtual ~PropertyLists() = default;

  /// Reads the XML or the binary form. Damaged, with the place, for anything else, for nesting deeper than 128 levels
  /// and for more than 256 MiB.
  [[nodiscard]] virtual Result<PropertyList> parse(std::string_view bytes) const = 0;

  /// The standard XML form, UTF-8, keys in the order of their dictionary.
  [[nodiscard]] virtual std::string serialize(const PropertyList& value) const = 0;

  /// The dictionary that is the root of the file.
  [[nodiscard]] virtual Result<Dictionary> readDictionary(const std::filesystem::path& path) const = 0;

  /// Replaces the file atomically.
  virtual Result<void> writeDictionary(const Dictionary& dictionary, const std::filesystem::path& path) = 0;

  /// The same if the file is still in the state `replaced`; Changed when it is not. Answers the new state. As
  /// FileManager::replaceAtomically.
  virtual Result<FileIdentity> replaceDictionary(const Dictionary& dictionary, const std::filesystem::path& path,
                                                 const FileIdentity& replaced);
};

}  // namespace quilt::platform
