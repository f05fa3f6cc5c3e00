// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/CleanUp.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt {

using platform::FDYLogger;
using platform::services;

namespace {

/// The package's own top-level entries; every other belongs to the theme. "data.js" lies in "controllers", which goes
/// with the theme's files and is written again by finalize.
constexpr std::string_view kKeptEntries[] = {"properties.plist", "media",   "poster.png", "JukeboxMetadata.plist",
                                             "JukeboxArtwork",   "data.js", "Glance"};

bool isKept(const std::string& name) {
  return std::find(std::begin(kKeptEntries), std::end(kKeptEntries), name) != std::end(kKeptEntries);
}

/// The first link in an entry of the template, or on the way to it from the bundle; empty when there is none. A copy of
/// it would lead out of the package.
Path firstLink(const Path& entry, const Path& bundle) {
  std::vector<Path> pending{entry};
  while (!pending.empty()) {
    const Path item = std::move(pending.back());
    pending.pop_back();
    if (!services().files->isConfined(item, bundle)) return item;
    if (services().files->kindOfItemAtPath(item) != platform::FileKind::Folder) continue;
    if (const auto names = services().files->contentsOfDirectoryAtPath(item))
      for (const std::string& name : *names) pending.push_back(item / name);
  }
  return {};
}

platform::Result<void> copyEntry(const Path& source, const Path& destination, const Path& bundle) {
  if (const Path link = firstLink(source, bundle); !link.empty())
    return platform::Error{platform::ErrorKind::Unsafe, "A theme may not hold symbolic links.", link};
  return services().files->copyItem(source, destination);
}

}  // namespace

bool QuiltDocument::removeTheme() {
  const auto names = services().files->contentsOfDirectoryAtPath(path());
  if (!names) {
    FDYLogger::logCritical("Failed to get content of document at path \"%@\": \"%@\"", path(), names.error());
    return false;
  }
  for (const std::string& name : *names) {
    if (isKept(name)) continue;
    const Path entry = platform::standardizedPath(path() / name);
    const auto removed = services().files->removeItem(entry, path());
    if (!removed && removed.error().kind != platform::ErrorKind::NotFound)
      FDYLogger::logWarning("Failed to remove current theme element \"@\": \"%@\"", entry, removed.error());
  }
  return true;
}

bool QuiltDocument::applyTheme(const std::shared_ptr<QuiltTheme>& theme, const ProgressionBlock& withProgressionBlock) {
  const Text name = theme ? theme->localizedName() : std::nullopt;
  const auto fail = [&](const Text& error) {
    FDYLogger::logCritical("Failed to apply theme \"%@\" on document at path \"%@\": \"%@\"", name, path(), error);
    removeTheme();
    return false;
  };

  const platform::OnException removeHalf([this] { removeTheme(); });
  if (!removeTheme()) return fail(std::nullopt);
  const Path folder = theme ? theme->templatePath() : Path();
  const auto entries = services().files->contentsOfDirectoryAtPath(folder);
  if (!entries) {
    FDYLogger::logDebug("Failed to get content of theme at path \"%@\": \"%@\"", folder, entries.error());
    return fail(entries.error().text);
  }
  std::size_t position = 0;
  for (const std::string& entry : *entries) {
    if (!platform::report(withProgressionBlock, platform::integerPercentage(position++, entries->size()))) {
      FDYLogger::logCritical("Theme \"%@\" appliance on document at path \"%@\" has been cancelled", name, path());
      return false;
    }
    const auto copied = copyEntry(folder / entry, path() / entry, theme->path());
    if (!copied) {
      FDYLogger::logDebug("Failed to copy \"%@\" to \"%@\": \"%@\"", folder / entry, path() / entry, copied.error());
      return fail(copied.error().text);
    }
  }
  if (!generateLocalizationControllerFromTheme(theme)) {
    FDYLogger::logDebug("Failed to generate localization controller");
    return fail(std::nullopt);
  }
  platform::report(withProgressionBlock, 100);
  return true;
}

bool QuiltDocument::generateLocalizationControllerFromTheme(const std::shared_ptr<QuiltTheme>& /*theme*/) {
  return true;
}

}  // namespace quilt
