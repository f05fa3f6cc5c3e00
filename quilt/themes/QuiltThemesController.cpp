// SPDX-License-Identifier: Apache-2.0
#include "quilt/themes/QuiltThemesController.h"

#include "quilt/platform/base/CleanUp.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt {

using platform::FDYLogger;
using platform::services;

namespace {

constexpr const char* kThemesFolder = "Themes";

}  // namespace

std::shared_ptr<QuiltThemesController> QuiltThemesController::defaultController() {
  // Never destroyed: the host may use it while the process ends.
  static const auto& controller = *new std::shared_ptr<QuiltThemesController>(init());
  return controller;
}

std::shared_ptr<QuiltThemesController> QuiltThemesController::init() {
  struct Made final : QuiltThemesController {};
  return std::make_shared<Made>();
}

bool QuiltThemesController::loadWithProgressionBlock(const ObjectProgressionBlock<QuiltTheme>& withProgressionBlock) {
  return platform::whileSet(_loadingThemes, [&] { return loadThemes(withProgressionBlock); }).value_or(false);
}

bool QuiltThemesController::loadThemes(const ObjectProgressionBlock<QuiltTheme>& block) {
  FDYLogger::logDebug("Loading themes...");
  _themes.assign({});

  const std::vector<Path> paths =
      services().bundles->findAllLibraryBundlePaths(kThemesFolder, kQuiltThemeExtension, true);
  std::size_t done = 0;
  for (const Path& path : paths) {
    const auto theme = QuiltTheme::initWithPath(path);
    if (theme) {
      FDYLogger::logDebug("Loaded theme \"%@\"", theme->localizedName());
      _themes.append(theme);
    }
    if (!platform::report(block, theme, platform::integerPercentage(++done, paths.size()))) {
      FDYLogger::logCritical("Loading themes has been cancelled");
      return false;
    }
  }
  return true;
}

std::shared_ptr<QuiltTheme> QuiltThemesController::themeWithIdentifier(const std::string& identifier) const {
  return _themes.first([&](const std::shared_ptr<QuiltTheme>& theme) { return theme->identifier() == identifier; });
}

void QuiltThemesController::performBlockOnThemes(
    const std::function<bool(const std::shared_ptr<QuiltTheme>&)>& block) const {
  _themes.walk(block);
}

std::shared_ptr<QuiltTheme> QuiltThemesController::defaultTheme() const {
  const platform::MonitorLock lock = _themes.lock();
  if (const auto theme = themeWithIdentifier(kQuiltDefaultThemeIdentifier)) return theme;
  return themeAtIndex(0);
}

}  // namespace quilt
