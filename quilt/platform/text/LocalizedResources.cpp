// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/LocalizedResources.h"

#include <cstdlib>

#include "quilt/resources/EmbeddedFiles.h"

namespace quilt::platform {

namespace {

std::span<const unsigned char> fileNamed(std::string_view path) {
  for (const auto& file : resources::embeddedFiles())
    if (file.path == path) return file.bytes;
  return {};
}

std::string userLanguage() {
  for (const char* name : {"LC_ALL", "LC_MESSAGES", "LANG"}) {
    const char* value = std::getenv(name);
    if (value && *value) return value;
  }
  return "en";
}

std::span<const unsigned char> tableFor(std::string_view language) {
  // "de_AT.UTF-8@euro": the whole locale's table, else its language's, else the English one.
  const std::string_view locale = language.substr(0, language.find_first_of(".@"));
  for (const std::string_view name : {locale, locale.substr(0, locale.find('_')), std::string_view("en")}) {
    const auto bytes = fileNamed("strings/" + std::string(name) + ".strings");
    if (!bytes.empty()) return bytes;
  }
  return {};
}

/// Takes a quoted text from the front; false when there is none.
bool takeQuoted(std::string_view& rest, std::string& text) {
  const std::size_t quote = rest.find_first_not_of(" \t\r\n");
  if (quote == std::string_view::npos || rest[quote] != '"') return false;
  text.clear();
  for (std::size_t i = quote + 1; i < rest.size(); ++i) {
    if (rest[i] == '"') {
      rest.remove_prefix(i + 1);
      return true;
    }
    if (rest[i] == '\\' && i + 1 < rest.size()) {
      ++i;
      text += rest[i] == 'n' ? '\n' : rest[i];
    } else {
      text += rest[i];
    }
  }
  return false;
}

bool takeCharacter(std::string_view& rest, char c) {
  const std::size_t place = rest.find_first_not_of(" \t\r\n");
  if (place == std::string_view::npos || rest[place] != c) return false;
  rest.remove_prefix(place + 1);
  return true;
}

bool takeComment(std::string_view& rest) {
  const std::size_t place = rest.find_first_not_of(" \t\r\n");
  if (place == std::string_view::npos) return false;
  const std::string_view start = rest.substr(place);
  const bool isBlock = start.starts_with("/*");
  if (!isBlock && !start.starts_with("//")) return false;
  const std::string_view end = isBlock ? "*/" : "\n";
  const std::size_t close = start.find(end, 2);
  rest.remove_prefix(close == std::string_view::npos ? rest.size() : place + close + end.size());
  return true;
}

}  // namespace

std::map<std::string, std::string, std::less<>> parseStrings(std::string_view text) {
  std::map<std::string, std::string, std::less<>> strings;
  std::string key;
  std::string value;
  while (!text.empty()) {
    if (takeComment(text)) continue;
    if (takeQuoted(text, key) && takeCharacter(text, '=') && takeQuoted(text, value) && takeCharacter(text, ';')) {
      strings[key] = value;
    } else {
      const std::size_t line = text.find('\n');
      text.remove_prefix(line == std::string_view::npos ? text.size() : line + 1);
    }
  }
  return strings;
}

LocalizedResources::LocalizedResources() : LocalizedResources(userLanguage()) {}

LocalizedResources::LocalizedResources(std::string_view language) {
  const auto table = tableFor(language);
  _strings = parseStrings({reinterpret_cast<const char*>(table.data()), table.size()});
}

std::string LocalizedResources::localizedString(std::string_view key, std::string_view fallback) const {
  const auto found = _strings.find(key);
  return std::string(found == _strings.end() ? fallback : std::string_view(found->second));
}

std::span<const unsigned char> LocalizedResources::artwork(std::string_view name, std::string_view type) const {
  return fileNamed("artwork/" + std::string(name) + "." + std::string(type));
}

}  // namespace quilt::platform
