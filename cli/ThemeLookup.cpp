// SPDX-License-Identifier: Apache-2.0
#include "cli/ThemeLookup.h"

#include "cli/Failure.h"
#include "cli/Text.h"
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

QuiltThemesController& loadedController() {
  QuiltThemesController& controller = *QuiltThemesController::defaultController();
  controller.loadWithProgressionBlock({});
  return controller;
}

}  // namespace

std::vector<std::shared_ptr<QuiltTheme>> installedThemes() { return loadedController().themes(); }

std::shared_ptr<QuiltTheme> defaultTheme() { return loadedController().defaultTheme(); }

std::shared_ptr<QuiltTheme> findTheme(const std::string& name, const Path& base) {
  const Path path = absolutePath(base.empty() || name.empty() ? name : (base / name).native());
  if (platform::services().files->fileExistsAtPath(path)) {
    if (auto theme = QuiltTheme::initWithPath(path)) return theme;
    throw Failure(ExitCode::Invalid, inQuotes(name) + " is no theme of a supported version; --verbose tells why", path);
  }
  if (auto theme = loadedController().themeWithIdentifier(name)) return theme;
  throw Failure(ExitCode::NotFound, "There is no theme " + inQuotes(name) + "; see \"quilt themes\"");
}

void checkTheme(const DocumentEntry& document, const std::string& cannot, const std::string& remedy) {
  const auto record = readDocumentRecord(document.path);
  if (!record) throw Failure(cannot, record.error());
  if (document.type != kQuiltDocumentTypeInteractive) return;
  const Text theme = record->string("ThemePath");
  if (!theme) throw Failure(ExitCode::Usage, cannot + ": It has no theme; " + remedy, document.path);
  if (!QuiltTheme::initWithPath(*theme))
    throw Failure(ExitCode::NotFound, cannot + ": Its theme " + inQuotes(*theme) + " is not there; " + remedy, *theme);
}

}  // namespace quilt::cli
