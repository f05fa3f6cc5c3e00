// SPDX-License-Identifier: Apache-2.0
#include "tests/support/PropertyListChecks.h"

#include <set>

#include "quilt/platform/plist/PlainXmlReader.h"
#include "quilt/platform/plist/XmlPropertyLists.h"
#include "quilt/platform/plist/XmlReader.h"
#include "quilt/platform/plist/XmlText.h"
#include "quilt/platform/plist/XmlWriter.h"

namespace quilt::support {

using namespace platform;

namespace {

class Judge {
 public:
  std::string judge(const PropertyList& value, std::size_t depth) {
    if (depth > 128) return "It nests too deeply.";
    return std::visit([&](const auto& typed) { return judge(typed, depth); }, value.value());
  }

 private:
  static std::string judge(bool /*flag*/, std::size_t /*depth*/) { return {}; }
  static std::string judge(std::int64_t /*number*/, std::size_t /*depth*/) { return {}; }
  static std::string judge(double /*number*/, std::size_t /*depth*/) { return {}; }
  static std::string judge(const Data& /*data*/, std::size_t /*depth*/) { return {}; }

  static std::string judge(const std::string& text, std::size_t /*depth*/) {
    return isXmlText(text) ? "" : "A text cannot be written.";
  }

  static std::string judge(Date date, std::size_t /*depth*/) {
    return parseIso8601(formatIso8601(date)) ? "" : "A date cannot be written.";
  }

  std::string judge(const Array& array, std::size_t depth) {
    std::string problem;
    for (const PropertyList& item : array)
      if (problem.empty()) problem = judge(item, depth + 1);
    return problem;
  }

  std::string judge(const Dictionary& dictionary, std::size_t depth) {
    std::set<std::string_view> keys;
    for (const auto& [key, item] : dictionary) {
      if (!isXmlText(key)) return "A key cannot be written.";
      if (!keys.insert(key).second) return "The key \"" + key + "\" stands twice.";
      if (std::string problem = judge(item, depth + 1); !problem.empty()) return problem;
    }
    return {};
  }
};

/// What is read plainly must be what the full parser reads; a comment has that one read it.
std::string disagreementOfReaders(std::string_view bytes) {
  const auto plain = readPlainXml(bytes);
  if (!plain) return {};
  std::string commented = std::string(bytes) + "<!-- -->";
  const auto full = readXml(commented);
  if (!full) return "What is read plainly the parser refuses: " + full.error().text;
  return writeXml(*plain) == writeXml(*full) ? "" : "Read plainly it is another value.";
}

}  // namespace

std::string problemWith(const PropertyList& value) {
  if (std::string problem = Judge().judge(value, 1); !problem.empty()) return problem;
  const XmlPropertyLists lists;
  const std::string written = lists.serialize(value);
  const auto again = lists.parse(written);
  if (!again) return "What was written of it cannot be read: " + again.error().text;
  return lists.serialize(*again) == written ? "" : "Written anew it is another value.";
}

std::string problemWhenReading(std::string_view bytes) {
  if (std::string problem = disagreementOfReaders(bytes); !problem.empty()) return problem;
  const auto value = XmlPropertyLists().parse(bytes);
  if (value) return problemWith(*value);
  if (value.error().text.empty() || !isXmlText(value.error().text)) return "The error says nothing.";
  return value.error().kind == ErrorKind::Damaged ? "" : "The error is of a wrong kind: " + value.error().text;
}

}  // namespace quilt::support
