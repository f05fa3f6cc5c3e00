// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/PlainXmlReader.h"

#include <algorithm>
#include <string>
#include <utility>

#include "quilt/platform/base/ByteTable.h"
#include "quilt/platform/plist/Limits.h"
#include "quilt/platform/plist/XmlReader.h"
#include "quilt/platform/plist/XmlScalars.h"
#include "quilt/platform/plist/XmlText.h"

namespace quilt::platform {

namespace {

constexpr std::string_view kDeclaration = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>";

struct Entity {
  std::string_view text;
  char character;
};

constexpr Entity kEntities[] = {{"&amp;", '&'}, {"&lt;", '<'}, {"&gt;", '>'}, {"&quot;", '"'}, {"&apos;", '\''}};

constexpr auto kIsSpace = tableOf([](std::size_t c) { return c == ' ' || c == '\t' || c == '\n' || c == '\r'; });

/// The characters of a text that stand for themselves. A carriage return does not: a parser makes a line feed of it.
constexpr auto kIsOrdinary =
    tableOf([](std::size_t c) { return (c >= ' ' && c < 0x80 && c != '<' && c != '&') || c == '\t' || c == '\n'; });

/// What the line of the document's type is made of, when it declares nothing.
constexpr auto kIsOfType = tableOf([](std::size_t c) {
  return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') || c == ' ' || c == '"' ||
         c == '-' || c == '/' || c == '.' || c == ':';
});

/// Each function takes what it reads from the front of the text; false or none for what is not written plainly.
class PlainReader {
 public:
  explicit PlainReader(std::string_view text) : _rest(text) {}

  std::optional<PropertyList> read() {
    PropertyList value(false);
    return readHead() && readValue(value, 1) && readTail() ? std::optional(std::move(value)) : std::nullopt;
  }

 private:
  bool readHead() {
    take(kDeclaration);
    skipSpace();
    if (take("<!DOCTYPE ")) {
      const std::string_view type = takeAll(kIsOfType);
      if (std::count(type.begin(), type.end(), '"') % 2 != 0 || !take(">")) return false;
      skipSpace();
    }
    return take("<plist version=\"1.0\">") || take("<plist>");
  }

  bool readTail() {
    skipSpace();
    if (!take("</plist>")) return false;
    skipSpace();
    return _rest.empty();
  }

  bool readValue(PropertyList& value, std::size_t depth) {
    if (depth > kDeepestNesting) return false;
    skipSpace();
    if (take("<string>")) return readText(value.become<std::string>()) && take("</string>");
    if (take("<dict>")) return readDictionary(value.become<Dictionary>(), depth);
    if (take("<array>")) return readArray(value.become<Array>(), depth);
    if (take("<true/>")) return hold(value, true);
    if (take("<false/>")) return hold(value, false);
    if (take("<dict/>")) return hold(value, Dictionary());
    if (take("<array/>")) return hold(value, Array());
    return readScalar(value);
  }

  static bool hold(PropertyList& value, PropertyList content) {
    value = std::move(content);
    return true;
  }

  bool readScalar(PropertyList& value) {
    if (!take("<")) return false;
    const std::optional<std::string_view> name = takeUpTo('>');
    std::string text;
    if (!name || !readText(text) || !take("</") || !take(*name) || !take(">")) return false;
    std::optional<PropertyList> scalar = scalarFrom(*name, text);
    return scalar && hold(value, *std::move(scalar));
  }

  bool readArray(Array& items, std::size_t depth) {
    for (;;) {
      skipSpace();
      if (take("</array>")) return true;
      if (!readValue(items.emplace_back(false), depth + 1)) return false;
    }
  }

  bool readDictionary(Dictionary& entries, std::size_t depth) {
    for (;;) {
      skipSpace();
      if (take("</dict>")) break;
      if (entries.empty()) entries.reserve(std::exchange(_usualSize, 0));
      std::string key;
      if (!take("<key>") || !readText(key) || !take("</key>")) return false;
      if (!readValue(entries.append(std::move(key)), depth + 1)) return false;
    }
    _usualSize = entries.size();
    dropRepeatedKeys(entries);
    return true;
  }

  /// Reads the text of an element, up to a tag.
  bool readText(std::string& out) {
    for (;;) {
      out += takeAll(kIsOrdinary);
      if (_rest.starts_with('<')) return true;
      if (!readEntity(out) && !readCharacter(out)) return false;
    }
  }

  bool readEntity(std::string& out) {
    for (const Entity& entity : kEntities) {
      if (!take(entity.text)) continue;
      out += entity.character;
      return true;
    }
    return false;
  }

  /// Reads one character beyond ASCII.
  bool readCharacter(std::string& out) {
    if (_rest.empty() || static_cast<unsigned char>(_rest[0]) < 0x80) return false;
    const Utf8Character character = firstUtf8Character(_rest);
    if (!isXmlCharacter(character)) return false;
    out += _rest.substr(0, character.length);
    _rest.remove_prefix(character.length);
    return true;
  }

  bool take(std::string_view expected) {
    if (!_rest.starts_with(expected)) return false;
    _rest.remove_prefix(expected.size());
    return true;
  }

  /// What stands before the mark; the mark is taken too.
  std::optional<std::string_view> takeUpTo(char mark) {
    const std::size_t end = _rest.find(mark);
    if (end == std::string_view::npos) return std::nullopt;
    const std::string_view before = _rest.substr(0, end);
    _rest.remove_prefix(end + 1);
    return before;
  }

  /// The longest front of such bytes.
  std::string_view takeAll(const ByteTable& table) {
    const std::string_view all = _rest.substr(0, lengthOf(table, _rest));
    _rest.remove_prefix(all.size());
    return all;
  }

  void skipSpace() { takeAll(kIsSpace); }

  std::string_view _rest;
  // The size of the dictionary that ended last, for one that begins: neighbours are alike. It is used up, so that all
  // together make no more room than there are entries.
  std::size_t _usualSize = 0;
};

}  // namespace

std::optional<PropertyList> readPlainXml(std::string_view text) { return PlainReader(text).read(); }

}  // namespace quilt::platform
