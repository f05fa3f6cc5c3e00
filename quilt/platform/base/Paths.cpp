// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/Paths.h"

#include <algorithm>
#include <cstdlib>

namespace quilt::platform {

bool isPlainComponent(std::string_view name) {
  constexpr std::size_t longest = 255;
  return !name.empty() && name.size() <= longest && name != "." && name != ".." &&
         name.find('/') == std::string_view::npos && name.find('\0') == std::string_view::npos;
}

namespace {

/// Whether normalizing would change nothing: absolute, without doubled or trailing separators and components of dots.
bool isNormal(std::string_view text) {
  if (!text.starts_with('/')) return false;
  for (std::size_t start = 1;; ++start) {
    const std::size_t end = std::min(text.find('/', start), text.size());
    const std::string_view name = text.substr(start, end - start);
    if (name.empty() || name == "." || name == "..") return false;
    if (end == text.size()) return true;
    start = end;
  }
}

/// The one relative to the other when both are normal.
std::string relativeOf(std::string_view path, std::string_view base) {
  const auto alike =
      static_cast<std::size_t>(std::mismatch(path.begin(), path.end(), base.begin(), base.end()).first - path.begin());
  const auto endsComponent = [alike](std::string_view text) { return alike == text.size() || text[alike] == '/'; };
  // Where the components end that both begin with.
  const std::size_t common = endsComponent(path) && endsComponent(base) ? alike : path.rfind('/', alike - 1);
  std::string relative;
  for (const char c : base.substr(common))
    if (c == '/') relative += "../";
  relative += path.substr(std::min(common + 1, path.size()));
  if (relative.ends_with('/')) relative.pop_back();
  return relative.empty() ? "." : relative;
}

}  // namespace

std::filesystem::path pathRelativeTo(const std::filesystem::path& path, const std::filesystem::path& base) {
  return textRelativeTo(path.native(), base.native());
}

std::string textRelativeTo(const std::string& path, const std::string& base) {
  if (path.empty() || base.empty()) return path;
  // Paths of a package are plain as they stand: cutting off the front, or comparing texts, is a hundred times cheaper
  // than the rest.
  if (isNormal(path)) {
    if (path.starts_with(base) && path.size() > base.size() && path[base.size()] == '/')
      return path.substr(base.size() + 1);
    if (isNormal(base)) return relativeOf(path, base);
  }
  const auto relative = std::filesystem::path(path).lexically_normal().lexically_relative(standardizedPath(base));
  return relative.empty() ? path : relative.native();
}

std::filesystem::path standardizedPath(const std::filesystem::path& path) {
  std::string text = path.native();
  if (isNormal(text)) return path;
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
