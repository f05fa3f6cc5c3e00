// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/ScriptJsonWriter.h"

#include <array>
#include <charconv>
#include <cmath>

#include "quilt/platform/base/ByteTable.h"
#include "quilt/platform/base/Utf8.h"

namespace quilt::platform {

namespace {

/// The characters of one byte that a script's text holds as they are.
constexpr ByteTable kStandsForItself =
    tableOf([](std::size_t c) { return c >= ' ' && c < 0x7F && c != '"' && c != '\\' && c != '<'; });

class Writer {
 public:
  std::string write(const Dictionary& root) {
    element(root);
    return std::move(_out);
  }

 private:
  void element(const PropertyList& value) {
    std::visit([this](const auto& typed) { element(typed); }, value.value());
  }

  void element(bool flag) { _out += flag ? "true" : "false"; }
  void element(std::int64_t number) { _out += std::to_string(number); }

  void element(double number) {
    if (!std::isfinite(number)) {
      _out += "null";
      return;
    }
    std::array<char, 32> text{};
    _out.append(text.data(), std::to_chars(text.begin(), text.end(), number).ptr);
  }

  void element(Date date) { element(formatIso8601(date)); }

  void element(const Data& data) {
    _out += '[';
    const char* separator = "";
    for (const std::uint8_t byte : data) {
      _out += separator;
      element(std::int64_t{byte});
      separator = ",";
    }
    _out += ']';
  }

  void element(const Array& array) {
    _out += '[';
    const char* separator = "";
    for (const PropertyList& item : array) {
      _out += separator;
      element(item);
      separator = ",";
    }
    _out += ']';
  }

  void element(const Dictionary& dictionary) {
    _out += '{';
    const char* separator = "";
    for (const auto& [key, value] : dictionary) {
      _out += separator;
      element(key);
      _out += ':';
      element(value);
      separator = ",";
    }
    _out += '}';
  }

  void element(const std::string& text) {
    _out += '"';
    for (std::string_view rest = text;;) {
      const std::size_t length = lengthOf(kStandsForItself, rest);
      _out += rest.substr(0, length);
      rest.remove_prefix(length);
      if (rest.empty()) break;
      const Utf8Character character = firstUtf8Character(rest);
      append(character, rest.substr(0, character.length));
      rest.remove_prefix(character.length);
    }
    _out += '"';
  }

  void append(const Utf8Character& character, std::string_view bytes) {
    const char32_t code = character.code;
    const bool isLineEnd = code == 0x2028 || code == 0x2029;
    if (!character.isValid) {
      _out += kReplacementText;
    } else if (code == '"' || code == '\\') {
      _out.append("\\").append(bytes);
    } else if (code == '\n') {
      _out += "\\n";
    } else if (code < 0x20 || code == 0x7F || code == '<' || isLineEnd) {
      // "<" could begin the end of the script, or a comment that swallows it.
      constexpr char hex[] = "0123456789abcdef";
      _out += "\\u";
      for (int digit = 3; digit >= 0; --digit) _out += hex[(code >> (4 * static_cast<unsigned>(digit))) & 15U];
    } else {
      _out += bytes;
    }
  }

  std::string _out;
};

}  // namespace

std::string ScriptJsonWriter::toJSON(const Dictionary& dictionary) const { return Writer().write(dictionary); }

}  // namespace quilt::platform
