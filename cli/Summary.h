// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <vector>

namespace quilt::cli {

/// Names and values, one pair a line, the values in one column. Empty values are left out; both are escaped by add().
class Summary {
 public:
  void add(const std::string& name, const std::string& value);
  /// The lines, each after the indent, without a last line end.
  [[nodiscard]] std::string text(const std::string& indent = "  ") const;

 private:
  std::vector<std::pair<std::string, std::string>> _rows;
};

}  // namespace quilt::cli
