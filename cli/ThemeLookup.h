// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "cli/Catalogue.h"
#include "quilt/themes/QuiltThemesController.h"

namespace quilt::cli {

/// The valid themes of the user, the system and the application, in that order.
std::vector<std::shared_ptr<QuiltTheme>> installedThemes();

/// The theme for what names none; null when no theme is installed.
std::shared_ptr<QuiltTheme> defaultTheme();

/// The theme with this identifier, or in the bundle at this path, taken from `base`, or from the working folder when
/// that is empty. Throws a Failure, NotFound or Invalid.
std::shared_ptr<QuiltTheme> findTheme(const std::string& name, const Path& base = {});

/// Throws a Failure when the document's record cannot be read, or when the document is interactive and has no theme, or
/// one that is not there: `cannot` says what cannot be done, `remedy` how to choose a theme.
void checkTheme(const DocumentEntry& document, const std::string& cannot, const std::string& remedy);

}  // namespace quilt::cli
