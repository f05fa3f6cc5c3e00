// SPDX-License-Identifier: Apache-2.0
#include "cli/Summary.h"

#include <algorithm>

#include "cli/Text.h"

namespace quilt::cli {

void Summary::add(const std::string& name, const std::string& value) {
  if (!value.empty()) _rows.emplace_back(escaped(name), escaped(value));
}

std::string Summary::text(const std::string& indent) const {
  std::size_t width = 0;
  for (const auto& [name, value] : _rows) width = std::max(width, columns(name));
  std::string text;
  for (const auto& [name, value] : _rows) {
    if (!text.empty()) text += '\n';
    text.append(indent).append(padded(name, width)).append("  ").append(value);
  }
  return text;
}

}  // namespace quilt::cli
