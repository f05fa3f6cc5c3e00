// SPDX-License-Identifier: Apache-2.0
#include "cli/Themes.h"

#include "cli/Catalogue.h"
#include "cli/Failure.h"
#include "cli/Text.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

std::vector<std::shared_ptr<QuiltTheme>> installedThemes() {
  std::vector<std::shared_ptr<QuiltTheme>> themes;
  for (const Path& path : platform::services().bundles->findAllLibraryBundlePaths("Themes", kQuiltThemeExtension, true))
    if (auto theme = QuiltTheme::initWithPath(path)) themes.push_back(std::move(theme));
  return themes;
}

std::shared_ptr<QuiltTheme> findTheme(const std::string& name) {
  const Path path = absolutePath(name);
  if (platform::services().files->fileExistsAtPath(path)) {
    if (auto theme = QuiltTheme::initWithPath(path)) return theme;
    throw Failure(ExitCode::Invalid, inQuotes(name) + " is no theme of a supported version; --verbose tells why", path);
  }
  for (auto& theme : installedThemes())
    if (theme->identifier() == name) return theme;
  throw Failure(ExitCode::NotFound, "There is no theme " + inQuotes(name) + "; see \"quilt doctor\"");
}

}  // namespace quilt::cli
