// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/bundles/FolderBundles.h"

#include <algorithm>
#include <cstdlib>

#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform {

namespace {

namespace fs = std::filesystem;

class FolderBundle final : public Bundle {
 public:
  explicit FolderBundle(fs::path path) : _path(std::move(path)) {}

  [[nodiscard]] const fs::path& path() const override { return _path; }

  [[nodiscard]] std::optional<PropertyList> infoDictionaryNoCacheValueForKey(std::string_view key) const override {
    const auto info = services().propertyLists->readDictionary(metadataFolder() / "Info.plist");
    const PropertyList* value = info ? info->find(key) : nullptr;
    return value ? std::optional<PropertyList>(*value) : std::nullopt;
  }

  [[nodiscard]] fs::path pathForResource(std::string_view name, std::string_view ofType) const override {
    const std::string file = withExtension(name, ofType);
    if (!isPlainComponent(file)) return {};
    for (const fs::path& folder : {metadataFolder() / "Resources", metadataFolder()})
      if (services().files->fileExistsAtPath(folder / file)) return folder / file;
    return {};
  }

 private:
  [[nodiscard]] fs::path metadataFolder() const {
    const fs::path contents = _path / "Contents";
    return services().files->fileExistsAtPath(contents / "Info.plist") ? contents : _path;
  }

  const fs::path _path;
};

std::string environment(const char* name, const std::string& fallback) {
  const char* value = std::getenv(name);
  return value && *value ? value : fallback;
}

std::vector<fs::path> libraryFolders() {
  std::vector<fs::path> folders;
  const std::string home = environment("HOME", "");
  const std::string user = environment("XDG_DATA_HOME", home.empty() ? "" : home + "/.local/share");
  if (!user.empty()) folders.push_back(fs::path(user) / "quilt");
  std::string list = environment("XDG_DATA_DIRS", "/usr/local/share:/usr/share");
  for (std::size_t start = 0; start <= list.size();) {
    const std::size_t end = std::min(list.find(':', start), list.size());
    if (end > start) folders.push_back(fs::path(list.substr(start, end - start)) / "quilt");
    start = end + 1;
  }
  return folders;
}

fs::path programResources() {
  std::error_code problem;
  const fs::path program = fs::read_symlink("/proc/self/exe", problem);
  if (problem) return {};
  fs::path resources = program.parent_path().parent_path() / "share" / "quilt";
  return fs::is_directory(resources, problem) ? resources : fs::path();
}

}  // namespace

FolderBundles::FolderBundles() : FolderBundles(programResources()) {}

FolderBundles::FolderBundles(fs::path mainBundleResourcePath) : _resourcePath(std::move(mainBundleResourcePath)) {}

std::shared_ptr<Bundle> FolderBundles::bundleWithPath(const fs::path& path) const {
  if (services().files->kindOfItemAtPath(path) != FileKind::Folder) return nullptr;
  return std::make_shared<FolderBundle>(path);
}

std::vector<fs::path> FolderBundles::findAllLibraryBundlePaths(std::string_view withSearchPath,
                                                               std::string_view andExtension,
                                                               bool includingApplicationBundle) const {
  std::vector<fs::path> folders = libraryFolders();
  if (includingApplicationBundle && !_resourcePath.empty()) folders.push_back(_resourcePath);
  std::vector<fs::path> found;
  for (const fs::path& library : folders) {
    const fs::path folder = library / withSearchPath;
    auto names = services().files->contentsOfDirectoryAtPath(folder);
    if (!names) continue;
    std::sort(names->begin(), names->end());
    for (const std::string& name : *names) {
      if (name.starts_with('.') || pathExtension(name) != andExtension) continue;
      // The same folder may be listed twice, by the environment or as the application's own.
      if (std::find(found.begin(), found.end(), folder / name) == found.end()) found.push_back(folder / name);
    }
  }
  return found;
}

}  // namespace quilt::platform
