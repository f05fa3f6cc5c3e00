// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/Paths.h"

#include <cstdlib>

namespace quilt::platform {

bool isPlainComponent(std::string_view name) {
  constexpr std::size_t longest = 255;
  return !name.empty() && name.size() <= longest && name != "." && name != ".." &&
         name.find('/') == std::string_view::npos && name.find('\0') == std::string_view::npos;
}

std::filesystem::path pathRelativeTo(const std::filesystem::path& path, const std::filesystem::path& base) {
  if (path.empty() || base.empty()) return path;
  const std::filesystem::path relative = path.lexically_normal().lexically_relative(standardizedPath(base));
  return relative.empty() ? path : relative;
}

std::filesystem::path standardizedPath(const std::filesystem::path& path) {
  std::string text = path.native();
  if (text == "~" || text.starts_with("~/")) {
    if (const char* home = std::getenv("HOME")) text.replace(0, 1, home);
  }
  std::string normal = std::filesystem::path(text).lexically_normal().native();
  while (normal.size() > 1 && normal.back() == '/') normal.pop_back();
  return normal;
}

std::string pathExtension(const std::filesystem::path& path) {
  const std::string extension = path.extension().native();
  return extension.empty() ? extension : extension.substr(1);
}

std::string withExtension(std::string_view base, std::string_view extension) {
  std::string name(base);
  if (!extension.empty()) name.append(".").append(extension);
  return name;
}

}  // namespace quilt::platform
