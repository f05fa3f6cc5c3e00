// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include <algorithm>

#include "cli/ActingDelegate.h"
#include "cli/Text.h"
#include "cli/ThemeLookup.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

struct Finding {
  std::string name;
  bool present;
  std::string text;
};

Json json(const platform::Capability& capability) {
  return {{"name", capability.name},
          {"type", "capability"},
          {"present", capability.present},
          {"version", capability.version},
          {"remedy", capability.remedy}};
}

Json json(const QuiltTheme& theme) {
  return {{"name", theme.localizedName().value_or("")},
          {"type", "theme"},
          {"present", true},
          {"identifier", theme.identifier().value_or("")},
          {"version", theme.version().value_or("")},
          {"path", theme.path().native()}};
}

}  // namespace

void ActingDelegate::perform(const DoctorRequest&) {
  _context.output.beginList();
  std::vector<std::pair<Finding, Json>> rows;
  for (const platform::Capability& capability : platform::services().diagnostics->capabilities()) {
    const std::string text = capability.present ? escaped(capability.version) : escaped(capability.remedy);
    rows.push_back({{escaped(capability.name), capability.present, text}, json(capability)});
  }
  for (const auto& theme : installedThemes())
    rows.push_back({{"Theme " + escaped(theme->localizedName().value_or("")), true,
                     escaped(theme->version().value_or("")) + "  " + escaped(theme->path().native())},
                    json(*theme)});
  std::size_t width = 0;
  for (const auto& [row, object] : rows) width = std::max(width, columns(row.name));
  for (auto& [row, object] : rows)
    _context.output.item(std::move(object),
                         fmt::format("{}  {}  {}", padded(row.name, width), row.present ? "yes" : "no ", row.text));
}

}  // namespace quilt::cli
