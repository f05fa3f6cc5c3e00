// SPDX-License-Identifier: Apache-2.0
#include "cli/Text.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <ctime>

namespace quilt::cli {

namespace {

struct Character {
  char32_t code;
  std::size_t length;  // bytes; 1 for a byte that is no UTF-8
  bool valid;
};

bool isContinuation(char byte) { return (static_cast<unsigned char>(byte) & 0xc0U) == 0x80U; }

Character characterAt(std::string_view text, std::size_t at) {
  const auto first = static_cast<unsigned char>(text[at]);
  if (first < 0x80) return {first, 1, true};
  const std::size_t length = first >= 0xf0 ? 4 : first >= 0xe0 ? 3 : 2;
  if (first < 0xc2 || first > 0xf4 || at + length > text.size()) return {first, 1, false};
  char32_t code = first & (0x7fU >> length);
  for (std::size_t i = 1; i < length; ++i) {
    if (!isContinuation(text[at + i])) return {first, 1, false};
    code = (code << 6U) | (static_cast<unsigned char>(text[at + i]) & 0x3fU);
  }
  constexpr std::array<char32_t, 5> kSmallest{0, 0, 0x80, 0x800, 0x10000};
  const bool valid = code >= kSmallest[length] && code <= 0x10ffff && (code < 0xd800 || code > 0xdfff);
  return valid ? Character{code, length, true} : Character{first, 1, false};
}

bool isControl(char32_t code) { return code < 0x20 || (code >= 0x7f && code < 0xa0); }

// Line and paragraph separators, and the marks that turn the direction of what follows.
bool misleads(char32_t code) {
  return (code >= 0x2028 && code <= 0x202e) || (code >= 0x2066 && code <= 0x2069) || code == 0x200e || code == 0x200f ||
         code == 0xfeff;
}

void appendEscaped(std::string& out, char32_t code) {
  switch (code) {
    case '\n':
      out += "\\n";
      return;
    case '\r':
      out += "\\r";
      return;
    case '\t':
      out += "\\t";
      return;
    case '\\':
      out += "\\\\";
      return;
  }
  out += code < 0x80 ? fmt::format("\\x{:02x}", static_cast<unsigned>(code))
                     : fmt::format("\\u{:04x}", static_cast<unsigned>(code));
}

}  // namespace

std::string escaped(std::string_view text) {
  std::string out;
  for (std::size_t at = 0; at < text.size();) {
    const Character character = characterAt(text, at);
    if (!character.valid) {
      out += fmt::format("\\x{:02x}", static_cast<unsigned>(character.code));
    } else if (isControl(character.code) || misleads(character.code) || character.code == '\\') {
      appendEscaped(out, character.code);
    } else {
      out += text.substr(at, character.length);
    }
    at += character.length;
  }
  return out;
}

std::string inQuotes(std::string_view text) { return '"' + escaped(text) + '"'; }

std::string inQuotes(const std::string& title, const std::string& uuid) {
  return inQuotes(title.empty() ? uuid : title);
}

bool isText(std::string_view bytes) {
  for (std::size_t at = 0; at < bytes.size();) {
    const Character character = characterAt(bytes, at);
    const bool breaks = character.code == '\n' || character.code == '\t';
    if (!character.valid || (isControl(character.code) && !breaks)) return false;
    at += character.length;
  }
  return true;
}

std::string asTitle(std::string_view bytes) {
  std::string out;
  for (std::size_t at = 0; at < bytes.size();) {
    const Character character = characterAt(bytes, at);
    if (!character.valid) {
      out += "\xef\xbf\xbd";
    } else if (isControl(character.code)) {
      out += ' ';
    } else {
      out += bytes.substr(at, character.length);
    }
    at += character.length;
  }
  return out;
}

std::string sizeText(std::uint64_t bytes) {
  if (bytes < 1000) return fmt::format("{} B", bytes);
  auto value = static_cast<double>(bytes);
  std::size_t unit = 0;
  constexpr std::array<const char*, 6> kUnits{"B", "kB", "MB", "GB", "TB", "PB"};
  // 999.95 would print as 1000.0.
  while (value >= 999.95 && unit + 1 < kUnits.size()) {
    value /= 1000;
    ++unit;
  }
  return fmt::format("{:.1f} {}", value, kUnits[unit]);
}

std::string durationText(double seconds) {
  if (!(seconds > 0)) return "0:00";
  const auto whole = static_cast<std::uint64_t>(std::llround(std::min(seconds, 1e15)));
  if (whole < 3600) return fmt::format("{}:{:02}", whole / 60, whole % 60);
  return fmt::format("{}:{:02}:{:02}", whole / 3600, whole / 60 % 60, whole % 60);
}

std::string dateText(platform::Date date) {
  const std::time_t seconds = std::chrono::system_clock::to_time_t(date);
  std::tm local = {};
  localtime_r(&seconds, &local);
  return fmt::format("{:04}-{:02}-{:02} {:02}:{:02}", local.tm_year + 1900, local.tm_mon + 1, local.tm_mday,
                     local.tm_hour, local.tm_min);
}

std::size_t columns(std::string_view text) {
  return static_cast<std::size_t>(
      std::count_if(text.begin(), text.end(), [](char byte) { return !isContinuation(byte); }));
}

std::string padded(std::string_view text, std::size_t width) {
  std::string out(text);
  const std::size_t taken = columns(text);
  if (taken < width) out.append(width - taken, ' ');
  return out;
}

}  // namespace quilt::cli
