// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/XmlReader.h"

#include <algorithm>
#include <pugixml.hpp>
#include <unordered_map>
#include <utility>

#include "quilt/platform/plist/Limits.h"
#include "quilt/platform/plist/PlainXmlReader.h"
#include "quilt/platform/plist/XmlScalars.h"
#include "quilt/platform/plist/XmlText.h"

namespace quilt::platform {

namespace {

// The first text of an element is kept in the element itself, which saves every second node.
constexpr unsigned kOptions = pugi::parse_cdata | pugi::parse_escapes | pugi::parse_eol | pugi::parse_embed_pcdata;

Error damaged(std::string_view what, std::ptrdiff_t place) {
  return {ErrorKind::Damaged, std::string(what) + " (at byte " + std::to_string(place) + ")", {}};
}

Error errorOf(const pugi::xml_parse_result& parsed) {
  if (parsed.status == pugi::status_out_of_memory) return {ErrorKind::InputOutput, "There is not enough memory", {}};
  return damaged(parsed.description(), parsed.offset);
}

/// Whether a byte is a character or a part of one, as far as a look at the first two tells.
bool isInBytes(std::string_view buffer) { return buffer.size() > 1 && buffer[0] == '<' && buffer[1] != '\0'; }

/// Whether comments, sections or instructions may split a text. What stands before the root looks alike, but for the
/// usual first lines.
bool mayHoldSplitTexts(std::string_view buffer) {
  if (!isInBytes(buffer)) return true;
  const auto holds = [buffer](char mark, std::string_view expected) {
    for (std::size_t at = buffer.find(mark, 1); at != std::string_view::npos; at = buffer.find(mark, at + 1))
      if (buffer[at - 1] == '<' && !buffer.substr(at + 1).starts_with(expected)) return true;
    return false;
  };
  return holds('!', "DOCTYPE") || holds('?', "xml ");
}

/// Whether the parser may answer texts that could not be written again: it takes bytes and numbered characters as they
/// come.
bool mayHoldForeignBytes(std::string_view buffer) {
  if (!isInBytes(buffer)) return true;
  for (std::size_t at = buffer.find('&'); at != std::string_view::npos; at = buffer.find('&', at + 1))
    if (buffer.substr(at + 1).starts_with('#')) return true;
  return !isXmlText(buffer);
}

bool holdsTooManyTags(std::string_view buffer) {
  if (buffer.size() <= kMostTags) return false;
  const auto tags = std::count(buffer.begin(), buffer.end(), '<') + std::count(buffer.begin(), buffer.end(), '=');
  return std::cmp_greater(tags, kMostTags);
}

bool isBlank(std::string_view text) { return trimmed(text).empty(); }

/// Makes values of elements. After the first failure only error() is of use.
class Builder {
 public:
  explicit Builder(bool repairsTexts) : _repairsTexts(repairsTexts) {}

  bool read(pugi::xml_node element, std::size_t depth, PropertyList& value) {
    if (depth > kDeepestNesting) return fail(element, "nests too deeply");
    const std::string_view name = element.name();
    if (name == "string") {
      std::string text;
      if (!readText(element, text)) return false;
      value = PropertyList(std::move(text));
      return true;
    }
    if (name == "dict") return readDictionary(element, depth, value);
    if (name == "array") return readArray(element, depth, value);
    if (!readText(element, _text)) return false;
    if (name == "true" || name == "false") {
      if (!isBlank(_text)) return fail(element, "holds text");
      value = PropertyList(name == "true");
      return true;
    }
    if (!isScalarElement(name)) return fail(element, "is no kind of value");
    std::optional<PropertyList> scalar = scalarFrom(name, _text);
    if (!scalar) return fail(element, "cannot be read");
    value = *std::move(scalar);
    return true;
  }

  [[nodiscard]] Error error() const { return damaged(_what, _place); }

 private:
  bool readText(pugi::xml_node element, std::string& text) {
    text = element.value();
    for (pugi::xml_node piece = element.first_child(); piece; piece = piece.next_sibling()) {
      if (piece.type() == pugi::node_element) return fail(piece, "stands inside a text");
      text += piece.value();
    }
    if (_repairsTexts && !isXmlText(text)) text = xmlTextFrom(text);
    return true;
  }

  bool readArray(pugi::xml_node element, std::size_t depth, PropertyList& value) {
    if (!isBlank(element.value())) return fail(element, "holds text between its values");
    Array items;
    for (pugi::xml_node child = element.first_child(); child; child = child.next_sibling()) {
      if (isSpace(child)) continue;
      items.emplace_back(false);
      if (!read(child, depth + 1, items.back())) return false;
    }
    value = PropertyList(std::move(items));
    return true;
  }

  bool readDictionary(pugi::xml_node element, std::size_t depth, PropertyList& value) {
    if (!isBlank(element.value())) return fail(element, "holds text between its values");
    std::size_t count = 0;
    for (pugi::xml_node child = element.first_child(); child; child = child.next_sibling()) ++count;
    Dictionary entries;
    entries.reserve(count / 2);
    pugi::xml_node key;
    std::string name;
    for (pugi::xml_node child = element.first_child(); child; child = child.next_sibling()) {
      if (isSpace(child)) continue;
      const bool isKey = std::string_view(child.name()) == "key";
      if (isKey == static_cast<bool>(key)) return fail(child, isKey ? "follows another key" : "has no key");
      if (isKey) {
        if (!readText(child, name)) return false;
        key = child;
        continue;
      }
      PropertyList item(false);
      if (!read(child, depth + 1, item)) return false;
      entries.append(std::exchange(name, {}), std::move(item));
      key = {};
    }
    if (key) return fail(key, "has no value");
    dropRepeatedKeys(entries);
    value = PropertyList(std::move(entries));
    return true;
  }

  /// Whether it is the space between values; other text is no element and so fails as one.
  static bool isSpace(pugi::xml_node child) { return child.type() != pugi::node_element && isBlank(child.value()); }

  bool fail(pugi::xml_node element, std::string_view what) {
    const bool isElement = element.type() == pugi::node_element;
    constexpr std::size_t longest = 32;  // of a name that the file made up
    const std::string name = xmlTextFrom(std::string_view(element.name()).substr(0, longest));
    _what = isElement ? "<" + name + "> " : "A text ";
    _what += what;
    _place = element.offset_debug();
    return false;
  }

  const bool _repairsTexts;
  std::string _text;  // of the scalar being read
  std::string _what;
  std::ptrdiff_t _place = 0;
};

/// Whether any two entries may share a key. Records are small, and comparing lengths settles most pairs.
bool mayRepeatKeys(const Dictionary& dictionary) {
  constexpr std::size_t small = 32;
  if (dictionary.size() > small) return true;  // looked at properly
  const auto end = dictionary.end();
  for (auto one = dictionary.begin(); one != end; ++one)
    for (auto other = one + 1; other != end; ++other)
      if (one->first == other->first) return true;
  return false;
}

pugi::xml_node nextElement(pugi::xml_node node) {
  while (node && node.type() != pugi::node_element) node = node.next_sibling();
  return node;
}

}  // namespace

bool exceedsLimits(std::string_view buffer) { return buffer.size() > kLongestPropertyList || holdsTooManyTags(buffer); }

void dropRepeatedKeys(Dictionary& dictionary) {
  if (!mayRepeatKeys(dictionary)) return;
  std::unordered_map<std::string_view, std::size_t> last;
  last.reserve(dictionary.size());
  std::size_t position = 0;
  for (const auto& [key, value] : dictionary) last[key] = position++;
  if (last.size() == dictionary.size()) return;
  Dictionary unique;
  unique.reserve(last.size());
  for (const auto& [key, value] : dictionary) {
    const auto found = last.find(key);
    if (found == last.end()) continue;
    unique.append(key, (dictionary.begin() + static_cast<std::ptrdiff_t>(found->second))->second);
    last.erase(found);
  }
  dictionary = std::move(unique);
}

Result<PropertyList> readXml(std::string& buffer) {
  if (holdsTooManyTags(buffer)) return damaged("The property list holds too many values", 0);
  if (std::optional<PropertyList> value = readPlainXml(buffer)) return *std::move(value);
  const unsigned space = mayHoldSplitTexts(buffer) ? pugi::parse_ws_pcdata : pugi::parse_ws_pcdata_single;
  Builder builder(mayHoldForeignBytes(buffer));
  pugi::xml_document document;
  const auto parsed = document.load_buffer_inplace(buffer.data(), buffer.size(), kOptions | space);
  if (!parsed) return errorOf(parsed);

  const pugi::xml_node root = document.document_element();
  if (std::string_view(root.name()) != "plist") return damaged("This is no property list", root.offset_debug());
  if (const auto other = nextElement(root.next_sibling()))
    return damaged("Something follows the property list", other.offset_debug());
  const pugi::xml_node content = nextElement(root.first_child());
  if (!content) return damaged("The property list holds no value", root.offset_debug());
  if (const auto other = nextElement(content.next_sibling()))
    return damaged("The property list holds more than one value", other.offset_debug());

  PropertyList value(false);
  if (!builder.read(content, 1, value)) return builder.error();
  return value;
}

}  // namespace quilt::platform
