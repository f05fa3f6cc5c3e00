// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/documents/QuiltDocument.h"
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
    if (const auto removed = services().files->removeItem(entry, path()); !removed)
      FDYLogger::logWarning("Failed to remove current theme element \"@\": \"%@\"", entry, removed.error());
  }
  return true;
}

bool QuiltDocument::applyTheme(const std::shared_ptr<QuiltTheme>& theme, const ProgressionBlock& withProgressionBlock) {
  const Text name = theme->localizedName();
  const auto fail = [&](const Text& error) {
    FDYLogger::logCritical("Failed to apply theme \"%@\" on document at path \"%@\": \"%@\"", name, path(), error);
    removeTheme();
    return false;
  };

  if (!removeTheme()) return fail(std::nullopt);
  const Path folder = theme->templatePath();
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
    const auto copied = services().files->copyItem(folder / entry, path() / entry);
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
