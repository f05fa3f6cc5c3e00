// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/base/ChildList.h"
#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/ProgressionBlock.h"
#include "quilt/themes/QuiltTheme.h"

namespace quilt {

/// The theme that a document gets when its author chose none.
inline constexpr const char* kQuiltDefaultThemeIdentifier = "org.quilt.theme.olive";

/// The installed themes: those of the user, of the system and of the application, in that order. Any thread may call
/// it; the list has a recursive lock and changes on the main thread.
class QUILT_EXPORT QuiltThemesController : public platform::Object {
 public:
  /// The shared controller, made on first use; lives until the process ends.
  static std::shared_ptr<QuiltThemesController> defaultController();
  /// One of the host's own, empty until it loads.
  static std::shared_ptr<QuiltThemesController> init();

  /// Whether loadWithProgressionBlock() runs.
  bool loadingThemes() const { return _loadingThemes.get(); }
  void setLoadingThemes(bool loading) { _loadingThemes.set(loading); }
  /// A copy of the list. Setting replaces it.
  std::vector<std::shared_ptr<QuiltTheme>> themes() const { return _themes.copy(); }
  void setThemes(std::vector<std::shared_ptr<QuiltTheme>> themes) { _themes.assign(std::move(themes)); }

  /// Empties the list and opens every theme bundle, reporting each (or null for one that is not valid) with the
  /// percentage of the bundles done; without bundles the block is not called. False, and nothing happens, while another
  /// load runs; false, after a critical line, when the block answers false, with the themes found so far in the list.
  bool loadWithProgressionBlock(const ObjectProgressionBlock<QuiltTheme>& withProgressionBlock);

  /// The first of the list with the identifier, or null.
  std::shared_ptr<QuiltTheme> themeWithIdentifier(const std::string& identifier) const;
  /// Null when the index is not below the count.
  std::shared_ptr<QuiltTheme> themeAtIndex(std::size_t index) const { return _themes.at(index); }
  /// How many themes there are now.
  std::size_t themesCount() const { return _themes.count(); }
  /// Calls the block on each with the lock held until it answers false.
  void performBlockOnThemes(const std::function<bool(const std::shared_ptr<QuiltTheme>&)>& block) const;
  /// The theme with kQuiltDefaultThemeIdentifier, else the first of the list, or null when the list is empty.
  std::shared_ptr<QuiltTheme> defaultTheme() const;

 protected:
  QuiltThemesController() = default;

 private:
  bool loadThemes(const ObjectProgressionBlock<QuiltTheme>& block);
  platform::Property<bool> _loadingThemes{*this, "loadingThemes"};
  platform::ChildList<QuiltTheme, QuiltThemesController> _themes{*this, "themes"};
};

}  // namespace quilt
