// SPDX-License-Identifier: Apache-2.0
#include "cli/ActingDelegate.h"
#include "cli/Text.h"
#include "cli/ThemeLookup.h"

namespace quilt::cli {

void ActingDelegate::perform(const ThemesRequest&) {
  _context.output.beginList();
  const auto themes = installedThemes();
  const auto standard = QuiltThemesController::defaultController()->defaultTheme();
  if (themes.empty()) _context.messages.note("No theme is installed");
  for (const auto& theme : themes) {
    const std::string identifier = theme->identifier().value_or("");
    const std::string name = theme->localizedName().value_or("");
    _context.output.item({{"identifier", identifier},
                          {"name", name},
                          {"version", theme->version().value_or("")},
                          {"path", theme->path().native()},
                          {"isDefault", standard && standard->path() == theme->path()}},
                         escaped(identifier) + '\t' + escaped(name) + '\t' + _context.output.shown(theme->path()));
  }
}

}  // namespace quilt::cli
