// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/documents/ThemeEntries.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"

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

/// The names at the top of the package that neither the document nor one of these has brought.
std::vector<std::string> foreignEntries(const Path& package, const std::vector<std::string>& brought,
                                        const std::shared_ptr<QuiltTheme>& theme) {
  const platform::FileManager& files = *services().files;
  auto names = files.contentsOfDirectoryAtPath(package);
  if (!names) return {};
  std::vector<std::string> known = brought;
  known.emplace_back("controllers");  // of the data script
  const Path folder = theme ? theme->templatePath() : Path();
  if (!folder.empty())
    if (const auto entries = files.contentsOfDirectoryAtPath(folder))
      known.insert(known.end(), entries->begin(), entries->end());
  std::erase_if(*names, [&known](const std::string& name) {
    return isKept(name) || platform::isHiddenTemporaryName(name) ||
           std::find(known.begin(), known.end(), name) != known.end();
  });
  std::sort(names->begin(), names->end());
  return *std::move(names);
}

void logFailure(const Text& theme, const Path& package, const Text& error) {
  FDYLogger::logCritical("Failed to apply theme \"%@\" on document at path \"%@\": \"%@\"", theme, package, error);
}

void logUnlisted(const Path& folder, const platform::Error& error) {
  FDYLogger::logDebug("Failed to get content of theme at path \"%@\": \"%@\"", folder, error);
}

void logUncopied(const Path& from, const Path& to, const platform::Error& error) {
  FDYLogger::logDebug("Failed to copy \"%@\" to \"%@\": \"%@\"", from, to, error);
}

/// Why the entry cannot be copied, as far as a look tells.
platform::Result<void> lookAtEntry(const Path& source, const Path& destination, const Path& bundle) {
  if (const Path link = firstLink(source, bundle); !link.empty())
    return platform::Error{platform::ErrorKind::Unsafe, "A theme may not hold symbolic links.", link};
  if (isKept(destination.filename().native()) && services().files->fileExistsAtPath(destination))
    return platform::Error{platform::ErrorKind::AlreadyExists, "The document has an entry of that name.", destination};
  return {};
}

}  // namespace

std::vector<std::string> themeEntriesIn(const Dictionary& record) {
  std::vector<std::string> names;
  if (const Array* entries = record.array(kThemeEntriesKey))
    for (const auto& entry : *entries)
      if (const auto* name = entry.as<std::string>()) names.push_back(*name);
  return names;
}

std::vector<std::string> QuiltDocument::entriesNoThemeBrought() const {
  return foreignEntries(path(), _themeEntries.get(), theme());
}

std::vector<std::string> QuiltDocument::entriesNoThemeBrought(const Path& package) {
  const auto record = services().propertyLists->readDictionary(package / kQuiltDocumentPropertiesFilename);
  if (!record) return {};
  const Text themePath = record->string("ThemePath");
  const bool isThere = themePath && services().files->fileExistsAtPath(*themePath);
  return foreignEntries(package, themeEntriesIn(*record), isThere ? QuiltTheme::initWithPath(*themePath) : nullptr);
}

bool QuiltDocument::canApplyTheme(const QuiltTheme& theme) const {
  const Path folder = theme.templatePath();
  const auto entries = services().files->contentsOfDirectoryAtPath(folder);
  if (!entries) {
    logUnlisted(folder, entries.error());
    logFailure(theme.localizedName(), path(), entries.error().text);
    return false;
  }
  for (const std::string& entry : *entries) {
    const auto look = lookAtEntry(folder / entry, path() / entry, theme.path());
    if (look) continue;
    logUncopied(folder / entry, path() / entry, look.error());
    logFailure(theme.localizedName(), path(), look.error().text);
    return false;
  }
  return true;
}

bool QuiltDocument::removeTheme() {
  const auto names = services().files->contentsOfDirectoryAtPath(path());
  if (!names) {
    FDYLogger::logCritical("Failed to get content of document at path \"%@\": \"%@\"", path(), names.error());
    return false;
  }
  for (const std::string& name : *names) {
    if (isKept(name)) continue;
    const Path entry = plainPath(path() / name);
    const auto removed = services().files->removeItem(entry, path());
    if (!removed && removed.error().kind != platform::ErrorKind::NotFound)
      FDYLogger::logWarning("Failed to remove current theme element \"@\": \"%@\"", entry, removed.error());
  }
  return true;
}

bool QuiltDocument::applyTheme(const std::shared_ptr<QuiltTheme>& theme, const ProgressionBlock& withProgressionBlock) {
  const Text name = theme ? theme->localizedName() : std::nullopt;
  const auto fail = [&](const Text& error) {
    logFailure(name, path(), error);
    removeTheme();
    return false;
  };

  if (!removeTheme()) return fail(std::nullopt);
  const Path folder = theme ? theme->templatePath() : Path();
  const auto entries = services().files->contentsOfDirectoryAtPath(folder);
  if (!entries) {
    logUnlisted(folder, entries.error());
    return fail(entries.error().text);
  }
  _themeEntries.set(*entries);
  std::size_t position = 0;
  for (const std::string& entry : *entries) {
    if (!platform::report(withProgressionBlock, platform::integerPercentage(position++, entries->size()))) {
      FDYLogger::logCritical("Theme \"%@\" appliance on document at path \"%@\" has been cancelled", name, path());
      return false;
    }
    const auto copied = copyEntry(folder / entry, path() / entry, theme->path());
    if (!copied) {
      logUncopied(folder / entry, path() / entry, copied.error());
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
