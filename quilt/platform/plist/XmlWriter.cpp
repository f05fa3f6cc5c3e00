// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/XmlWriter.h"

#include <array>
#include <charconv>
#include <cmath>

#include "quilt/platform/base/ByteTable.h"
#include "quilt/platform/plist/Base64.h"
#include "quilt/platform/plist/XmlText.h"

namespace quilt::platform {

namespace {

/// The characters that stand for themselves, of those that are one byte.
constexpr auto kNeedsNoEntity = tableOf(
    [](std::size_t c) { return (c >= ' ' && c < 0x80 && c != '<' && c != '>' && c != '&') || c == '\t' || c == '\n'; });

class Writer {
 public:
  template <class Value>
  std::string write(const Value& root) {
    _out = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<plist version=\"1.0\">\n";
    element(root, 0);
    _out += "</plist>\n";
    return std::move(_out);
  }

 private:
  void element(const PropertyList& value, std::size_t depth) {
    std::visit([&](const auto& typed) { element(typed, depth); }, value.value());
  }

  void element(bool flag, std::size_t depth) { line(depth, flag ? "<true/>" : "<false/>"); }

  void element(std::int64_t number, std::size_t depth) {
    std::array<char, 24> text{};
    const auto end = std::to_chars(text.begin(), text.end(), number).ptr;
    tagged(depth, "integer", {text.data(), static_cast<std::size_t>(end - text.data())});
  }

  void element(double number, std::size_t depth) {
    if (std::isnan(number)) return tagged(depth, "real", "nan");
    if (std::isinf(number)) return tagged(depth, "real", number > 0 ? "inf" : "-inf");
    std::array<char, 32> text{};
    const auto end = std::to_chars(text.begin(), text.end(), number).ptr;
    tagged(depth, "real", {text.data(), static_cast<std::size_t>(end - text.data())});
  }

  void element(const std::string& text, std::size_t depth) {
    indent(depth);
    _out += "<string>";
    escaped(text);
    _out += "</string>\n";
  }

  void element(Date date, std::size_t depth) { tagged(depth, "date", formatIso8601(date)); }
  void element(const Data& data, std::size_t depth) { tagged(depth, "data", encodeBase64(data)); }

  void element(const Array& array, std::size_t depth) {
    if (array.empty()) return line(depth, "<array/>");
    line(depth, "<array>");
    for (const PropertyList& item : array) element(item, depth + 1);
    line(depth, "</array>");
  }

  void element(const Dictionary& dictionary, std::size_t depth) {
    if (dictionary.empty()) return line(depth, "<dict/>");
    line(depth, "<dict>");
    for (const auto& [key, item] : dictionary) {
      indent(depth + 1);
      _out += "<key>";
      escaped(key);
      _out += "</key>\n";
      element(item, depth + 1);
    }
    line(depth, "</dict>");
  }

  void indent(std::size_t depth) { _out.append(depth, '\t'); }

  void line(std::size_t depth, std::string_view text) {
    indent(depth);
    _out.append(text).append("\n");
  }

  void tagged(std::size_t depth, std::string_view tag, std::string_view text) {
    indent(depth);
    _out.append("<").append(tag).append(">").append(text).append("</").append(tag).append(">\n");
  }

  void escaped(std::string_view text) {
    for (;;) {
      const std::size_t length = lengthOf(kNeedsNoEntity, text);
      _out.append(text.substr(0, length));
      text.remove_prefix(length);
      if (text.empty()) return;
      const Utf8Character character = firstUtf8Character(text);
      _out.append(textOf(character, text));
      text.remove_prefix(character.length);
    }
  }

  /// What stands for the first character of the text.
  static std::string_view textOf(const Utf8Character& character, std::string_view text) {
    switch (text[0]) {
      case '&':
        return "&amp;";
      case '<':
        return "&lt;";
      case '>':
        return "&gt;";
      case '\r':
        return "&#13;";
    }
    return isXmlCharacter(character) ? text.substr(0, character.length) : kReplacementText;
  }

  std::string _out;
};

}  // namespace

std::string writeXml(const PropertyList& value) { return Writer().write(value); }
std::string writeXml(const Dictionary& dictionary) { return Writer().write(dictionary); }

}  // namespace quilt::platform
