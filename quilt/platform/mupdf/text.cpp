// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/platform/mupdf/documents.h"

namespace quilt::platform::mupdf {

namespace {

constexpr const char* kWhite = " \t\r\n\f\v";

// Whether the bytes are UTF-8 without control characters other than white space.
bool isText(const std::string& text) {
  for (std::size_t i = 0; i < text.size();) {
    const auto lead = static_cast<unsigned char>(text[i]);
    const std::size_t length = lead < 0x80                   ? 1
                               : lead >= 0xC2 && lead < 0xE0 ? 2
                               : lead >= 0xE0 && lead < 0xF0 ? 3
                               : lead >= 0xF0 && lead < 0xF5 ? 4
                                                             : 0;
    if (length == 0 || text.size() - i < length || lead == 0x7F) return false;
    if (lead < 0x20 && lead != '\t' && lead != '\n' && lead != '\r') return false;
    for (std::size_t k = 1; k < length; ++k) {
      if ((static_cast<unsigned char>(text[i + k]) & 0xC0) != 0x80) return false;
    }
    i += length;
  }
  return true;
}

}  // namespace

std::optional<std::string> trimmed(const std::string& text) {
  const std::size_t first = text.find_first_not_of(kWhite);
  if (first == std::string::npos || !isText(text)) return std::nullopt;
  return text.substr(first, text.find_last_not_of(kWhite) + 1 - first);
}

std::optional<std::string> collapsed(const std::string& text) {
  std::string words;
  for (std::size_t at = text.find_first_not_of(kWhite); at != std::string::npos;) {
    const std::size_t end = std::min(text.find_first_of(kWhite, at), text.size());
    words += (words.empty() ? "" : " ") + text.substr(at, end - at);
    at = text.find_first_not_of(kWhite, end);
  }
  return trimmed(words);
}

}  // namespace quilt::platform::mupdf
