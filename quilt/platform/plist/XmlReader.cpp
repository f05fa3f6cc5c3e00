// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/XmlReader.h"

#include <algorithm>
#include <charconv>
#include <pugixml.hpp>
#include <unordered_map>

#include "quilt/platform/plist/Base64.h"

namespace quilt::platform {

namespace {

constexpr unsigned kOptions = pugi::parse_cdata | pugi::parse_escapes | pugi::parse_eol | pugi::parse_ws_pcdata_single;

Error damaged(std::string text) { return {ErrorKind::Damaged, std::move(text), {}}; }

std::string_view trimmed(std::string_view text) {
  constexpr std::string_view space = " \t\r\n";
  const std::size_t first = text.find_first_not_of(space);
  return first == std::string_view::npos ? std::string_view()
                                         : text.substr(first, text.find_last_not_of(space) - first + 1);
}

/// The element's text; comments and sections in between do not split it.
std::string textOf(pugi::xml_node element) {
  const pugi::xml_node only = element.first_child();
  if (only && !only.next_sibling()) return only.value();
  std::string text;
  for (const pugi::xml_node piece : element.children()) text += piece.value();
  return text;
}

std::optional<PropertyList> integerFrom(std::string_view text) {
  text = trimmed(text);
  if (text.starts_with('+')) text.remove_prefix(1);
  const bool isNegative = text.starts_with('-');
  const bool isHexadecimal = text.starts_with("0x") || text.starts_with("0X");
  const char* begin = text.data() + (isHexadecimal ? 2 : 0);
  const char* end = text.data() + text.size();
  std::int64_t number = 0;
  const auto [stop, problem] = std::from_chars(begin, end, number, isHexadecimal ? 16 : 10);
  if (stop != end || begin == end) return std::nullopt;
  if (problem == std::errc()) return PropertyList(number);
  // Beyond 64 signed bits: the nearest real is closer to it than any integer that fits.
  double real = 0;
  if (!isHexadecimal && std::from_chars(begin, end, real).ec == std::errc()) return PropertyList(real);
  return PropertyList(isNegative ? INT64_MIN : INT64_MAX);
}

std::optional<PropertyList> realFrom(std::string_view text) {
  text = trimmed(text);
  if (text.starts_with('+')) text.remove_prefix(1);
  double number = 0;
  const auto [stop, problem] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (stop != text.data() + text.size() || text.empty()) return std::nullopt;
  if (problem == std::errc()) return PropertyList(number);
  return std::nullopt;
}

class Builder {
 public:
  Result<PropertyList> value(pugi::xml_node element, std::size_t depth) {
    if (depth > kDeepestNesting) return wrong(element, "nests too deeply");
    const std::string_view name = element.name();
    if (name == "string") return PropertyList(textOf(element));
    if (name == "dict") return dictionary(element, depth);
    if (name == "array") return array(element, depth);
    if (name == "true") return PropertyList(true);
    if (name == "false") return PropertyList(false);
    std::optional<PropertyList> scalar;
    const std::string text = textOf(element);
    if (name == "integer") {
      scalar = integerFrom(text);
    } else if (name == "real") {
      scalar = realFrom(text);
    } else if (name == "date") {
      if (const auto date = parseIso8601(trimmed(text))) scalar = PropertyList(*date);
    } else if (name == "data") {
      if (auto data = decodeBase64(text)) scalar = PropertyList(*std::move(data));
    } else {
      return wrong(element, "is no kind of value");
    }
    if (!scalar) return wrong(element, "cannot be read");
    return *std::move(scalar);
  }

  /// Where the last error lies in the buffer.
  [[nodiscard]] std::ptrdiff_t place() const { return _place; }

 private:
  Result<PropertyList> array(pugi::xml_node element, std::size_t depth) {
    Array items;
    for (const pugi::xml_node child : element.children()) {
      if (child.type() != pugi::node_element) {
        if (trimmed(child.value()).empty()) continue;
        return wrong(element, "holds text between its values");
      }
      auto item = value(child, depth + 1);
      if (!item) return item.error();
      items.push_back(*std::move(item));
    }
    return PropertyList(std::move(items));
  }

  Result<PropertyList> dictionary(pugi::xml_node element, std::size_t depth) {
    Dictionary entries;
    pugi::xml_node key;
    for (const pugi::xml_node child : element.children()) {
      if (child.type() != pugi::node_element) {
        if (trimmed(child.value()).empty()) continue;
        return wrong(element, "holds text between its values");
      }
      const bool isKey = std::string_view(child.name()) == "key";
      if (isKey == static_cast<bool>(key)) return wrong(child, isKey ? "follows another key" : "has no key");
      if (isKey) {
        key = child;
        continue;
      }
      auto item = value(child, depth + 1);
      if (!item) return item.error();
      entries.append(textOf(key), *std::move(item));
      key = {};
    }
    if (key) return wrong(key, "has no value");
    dropRepeatedKeys(entries);
    return PropertyList(std::move(entries));
  }

  Error wrong(pugi::xml_node element, const std::string& what) {
    _place = element.offset_debug();
    return damaged("<" + std::string(element.name()) + "> " + what);
  }

  std::ptrdiff_t _place = -1;
};

std::string atByte(std::ptrdiff_t place) { return " (at byte " + std::to_string(place) + ")"; }

/// Whether any two entries share a key. Records are small, and comparing lengths settles most pairs.
bool hasRepeatedKeys(const Dictionary& dictionary) {
  constexpr std::size_t small = 32;
  if (dictionary.size() > small) return true;  // looked at properly
  for (auto one = dictionary.begin(); one != dictionary.end(); ++one)
    for (auto other = one + 1; other != dictionary.end(); ++other)
      if (one->first == other->first) return true;
  return false;
}

}  // namespace

void dropRepeatedKeys(Dictionary& dictionary) {
  if (!hasRepeatedKeys(dictionary)) return;
  std::unordered_map<std::string_view, std::size_t> last;
  last.reserve(dictionary.size());
  std::size_t position = 0;
  for (const auto& [key, value] : dictionary) last[key] = position++;
  if (last.size() == dictionary.size()) return;
  Dictionary unique;
  for (const auto& [key, value] : dictionary) {
    const auto found = last.find(key);
    if (found == last.end()) continue;
    unique.append(key, (dictionary.begin() + static_cast<std::ptrdiff_t>(found->second))->second);
    last.erase(found);
  }
  dictionary = std::move(unique);
}

Result<PropertyList> readXml(std::string& buffer) {
  pugi::xml_document document;
  const auto parsed = document.load_buffer_inplace(buffer.data(), buffer.size(), kOptions);
  if (!parsed) return damaged(std::string(parsed.description()) + atByte(parsed.offset));
  const pugi::xml_node root = document.document_element();
  pugi::xml_node content;
  for (const pugi::xml_node child : root.children()) {
    if (child.type() != pugi::node_element) continue;
    if (content) return damaged("The property list holds more than one value");
    content = child;
  }
  if (std::string_view(root.name()) != "plist" || !content) return damaged("This is no property list");
  Builder builder;
  auto value = builder.value(content, 1);
  if (!value) return damaged(value.error().text + atByte(builder.place()));
  return value;
}

}  // namespace quilt::platform
