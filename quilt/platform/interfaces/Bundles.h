// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <memory>
#include <string_view>
#include <vector>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/PropertyList.h"

namespace quilt::platform {

/// A folder with metadata ("Info.plist") and resources. The metadata lies in the folder or in its "Contents"; resources
/// lie in "Resources" beside the metadata, else beside the metadata itself.
class QUILT_EXPORT Bundle {
 public:
  virtual ~Bundle() = default;

  /// The folder that was opened.
  [[nodiscard]] virtual const std::filesystem::path& path() const = 0;
  /// A metadata value, read from disk by each call. None when the file cannot be read or lacks the key.
  [[nodiscard]] virtual std::optional<PropertyList> infoDictionaryNoCacheValueForKey(std::string_view key) const = 0;
  /// The resource `name` with the extension `type` (none when empty); empty when nothing is there.
  [[nodiscard]] virtual std::filesystem::path pathForResource(std::string_view name, std::string_view ofType) const = 0;
};

/// Opens and finds bundles. Any thread.
class QUILT_EXPORT Bundles {
 public:
  virtual ~Bundles() = default;

  /// Null when there is no folder at the path.
  [[nodiscard]] virtual std::shared_ptr<Bundle> bundleWithPath(const std::filesystem::path& path) const = 0;
  /// The application's own resource folder; empty when it has none.
  [[nodiscard]] virtual std::filesystem::path mainBundleResourcePath() const = 0;

  /// Every bundle with the extension in the folders named `withSearchPath` of the library folders: the user's, then the
  /// system's, then the application's own resources when asked. Sorted by name within a folder.
  [[nodiscard]] virtual std::vector<std::filesystem::path> findAllLibraryBundlePaths(
      std::string_view withSearchPath, std::string_view andExtension, bool includingApplicationBundle) const = 0;
};

/// @{
/// The metadata keys of a bundle.
inline constexpr const char* kBundleIdentifierKey = "CFBundleIdentifier";
inline constexpr const char* kBundleDisplayNameKey = "CFBundleDisplayName";
inline constexpr const char* kBundleShortVersionKey = "CFBundleShortVersionString";
/// @}

}  // namespace quilt::platform
