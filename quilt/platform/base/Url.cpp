// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/Url.h"

#include <algorithm>
#include <cctype>

namespace quilt::platform {

namespace {

constexpr std::string_view kFilePrefix = "file://";
constexpr char kHex[] = "0123456789ABCDEF";

// The characters of RFC 3986 that a path may hold unencoded, without those that old readers trip over.
bool standsForItself(unsigned char c) {
  return std::isalnum(c) != 0 ||
         std::string_view("-._~/!$&'()*+,=:@").find(static_cast<char>(c)) != std::string_view::npos;
}

int hexValue(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  if (c >= 'A' && c <= 'F') return c - 'A' + 10;
  return -1;
}

std::string percentEncoded(std::string_view text) {
  std::string out;
  out.reserve(text.size());
  for (const char c : text) {
    const auto byte = static_cast<unsigned char>(c);
    if (byte < 0x80 && standsForItself(byte)) {
      out += c;
    } else {
      out += '%';
      out += kHex[byte >> 4];
      out += kHex[byte & 15];
    }
  }
  return out;
}

std::string percentDecoded(std::string_view text) {
  if (text.find('%') == std::string_view::npos) return std::string(text);
  std::string out;
  out.reserve(text.size());
  for (std::size_t i = 0; i < text.size(); ++i) {
    const int high = text[i] == '%' && i + 2 < text.size() ? hexValue(text[i + 1]) : -1;
    const int low = high >= 0 ? hexValue(text[i + 2]) : -1;
    if (low >= 0) {
      out += static_cast<char>(high * 16 + low);
      i += 2;
    } else {
      out += text[i];
    }
  }
  return out;
}

std::string lowercase(std::string_view text) {
  std::string out(text);
  std::transform(out.begin(), out.end(), out.begin(),
                 [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
  return out;
}

// The length of "scheme", or 0 when the text does not begin with "scheme:".
std::size_t schemeLength(std::string_view text) {
  const std::size_t colon = text.find(':');
  if (colon == std::string_view::npos || colon == 0 || std::isalpha(static_cast<unsigned char>(text[0])) == 0) return 0;
  const bool valid = std::all_of(text.begin(), text.begin() + static_cast<std::ptrdiff_t>(colon), [](unsigned char c) {
    return std::isalnum(c) != 0 || c == '+' || c == '-' || c == '.';
  });
  return valid ? colon : 0;
}

// What follows the authority.
std::string_view afterAuthority(std::string_view text) {
  text.remove_prefix(schemeLength(text) + 1);
  if (text.substr(0, 2) == "//") {
    text.remove_prefix(2);
    text.remove_prefix(std::min(text.find_first_of("/?#"), text.size()));
  }
  return text;
}

// The same, up to a query or fragment.
std::string_view pathPart(std::string_view text) {
  text = afterAuthority(text);
  return text.substr(0, std::min(text.find('?'), text.find('#')));
}

// With the spaces behind the authority encoded.
std::string withEncodedSpaces(std::string_view text) {
  std::string out(text);
  const std::size_t start = text.size() - afterAuthority(text).size();
  for (std::size_t i = out.size(); i-- > start;)
    if (out[i] == ' ') out.replace(i, 1, "%20");
  return out;
}

}  // namespace

Url Url::fileUrl(const std::filesystem::path& path) {
  const std::filesystem::path absolute = path.is_absolute() ? path : std::filesystem::current_path() / path;
  return {std::string(kFilePrefix) + percentEncoded(absolute.native()), true};
}

std::optional<Url> Url::parse(std::string_view given) {
  const std::string text = given.find(' ') == std::string_view::npos ? std::string(given) : withEncodedSpaces(given);
  const auto forbidden = [](unsigned char c) { return c <= 0x20 || c == 0x7F; };
  const std::size_t scheme = schemeLength(text);
  if (scheme == 0 || scheme + 1 == text.size() || std::any_of(text.begin(), text.end(), forbidden)) return std::nullopt;
  if (lowercase(text.substr(0, scheme)) != "file") return Url(text, false);

  const std::string_view afterScheme = std::string_view(text).substr(scheme + 1);
  if (afterScheme.substr(0, 2) == "//") {
    const std::string_view authority = afterScheme.substr(2, afterScheme.find('/', 2) - 2);
    if (!authority.empty() && lowercase(authority) != "localhost") return std::nullopt;
  }
  const std::string_view path = pathPart(text);
  const bool isAbsolute = percentDecoded(path.substr(0, 3)).starts_with('/');
  if (!isAbsolute || path.find("%00") != std::string_view::npos) return std::nullopt;
  return Url(text, true);
}

std::filesystem::path Url::relativePath() const { return relativePathText(); }

std::string Url::relativePathText() const { return percentDecoded(pathPart(_text)); }

}  // namespace quilt::platform
