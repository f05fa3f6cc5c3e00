// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/Bundles.h"

namespace quilt::platform {

/// Bundles as folders on disk.
class FolderBundles final : public Bundles {
 public:
  /// The application's resources lie in "../share/quilt" beside the program's folder, when that exists.
  FolderBundles();
  explicit FolderBundles(std::filesystem::path mainBundleResourcePath);

  [[nodiscard]] std::shared_ptr<Bundle> bundleWithPath(const std::filesystem::path& path) const override;
  [[nodiscard]] std::filesystem::path mainBundleResourcePath() const override { return _resourcePath; }
  /// Library folders: "quilt" in $XDG_DATA_HOME (else ~/.local/share), then in each entry of $XDG_DATA_DIRS (else
  /// /usr/local/share and /usr/share). Names that begin with "." are passed over.
  [[nodiscard]] std::vector<std::filesystem::path> findAllLibraryBundlePaths(
      std::string_view withSearchPath, std::string_view andExtension, bool includingApplicationBundle) const override;

 private:
  const std::filesystem::path _resourcePath;
};

}  // namespace quilt::platform
