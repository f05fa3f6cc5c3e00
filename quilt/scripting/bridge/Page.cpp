// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/Page.h"

#include <algorithm>
#include <optional>
#include <string_view>
#include <vector>

namespace quilt::scripting {

namespace {

std::string lowered(std::string text) {
  std::transform(text.begin(), text.end(), text.begin(),
                 [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
  return text;
}

// Where the tag that begins at `place` ends, a ">" in quotes not counted; npos when it does not end.
std::size_t endOfTag(std::string_view page, std::size_t place) {
  char quote = 0;
  for (; place < page.size(); ++place) {
    const char c = page[place];
    if (quote != 0) {
      if (c == quote) quote = 0;
    } else if (c == '"' || c == '\'') {
      quote = c;
    } else if (c == '>') {
      return place + 1;
    }
  }
  return std::string_view::npos;
}

/// A tag as a browser sees one: not in a comment, and not in the text of a script or a title.
struct Tag {
  std::size_t begin = 0;
  std::size_t end = 0;
  std::string_view name;  // "head", "/head", "!doctype"
};

constexpr std::string_view kTextElements[] = {"script", "style", "title", "textarea", "xmp", "iframe"};

std::size_t endOfComment(std::string_view page, std::size_t place) {
  // From the second dash pair on: "<!-->" is whole.
  const std::size_t plain = page.find("-->", place + 2);
  const std::size_t odd = page.find("--!>", place + 4);
  if (odd < plain) return odd + 4;
  return plain == std::string_view::npos ? plain : plain + 3;
}

// The tags of a page in lower case, one after another.
class Tags {
 public:
  explicit Tags(std::string_view page) : _page(page) {}

  std::optional<Tag> next() {
    for (_place = _page.find('<', _place); _place != std::string_view::npos; _place = _page.find('<', _place)) {
      const std::string_view rest = _page.substr(_place + 1);
      if (rest.starts_with("!--")) {
        _place = endOfComment(_page, _place);
      } else if (!rest.empty() && isNameStart(rest.front())) {
        return take();
      } else {
        ++_place;
      }
      if (_place == std::string_view::npos) break;
    }
    return std::nullopt;
  }

 private:
  static bool isNameStart(char c) { return (c >= 'a' && c <= 'z') || c == '/' || c == '!' || c == '?'; }

  std::optional<Tag> take() {
    const std::string_view rest = _page.substr(_place + 1);
    const std::string_view name = rest.substr(0, rest.find_first_of(" \t\r\n\f/>", 1));
    const bool isMarkup = name.starts_with('!') || name.starts_with('?');
    const std::size_t close = isMarkup ? _page.find('>', _place) : endOfTag(_page, _place);
    if (close == std::string_view::npos) return std::nullopt;
    const Tag tag{_place, isMarkup ? close + 1 : close, name};
    _place = tag.end;
    if (std::find(std::begin(kTextElements), std::end(kTextElements), name) != std::end(kTextElements))
      _place = std::min(_page.find("</" + std::string(name), tag.end), _page.size());
    return tag;
  }

  const std::string_view _page;
  std::size_t _place = 0;
};

void removePolicies(std::string& page) {
  const std::string small = lowered(page);
  std::vector<Tag> policies;
  Tags tags(small);
  while (const auto tag = tags.next())
    if (tag->name == "meta" &&
        std::string_view(small).substr(tag->begin, tag->end - tag->begin).find("content-security-policy") !=
            std::string_view::npos)
      policies.push_back(*tag);
  for (auto policy = policies.rbegin(); policy != policies.rend(); ++policy)
    page.erase(policy->begin, policy->end - policy->begin);
}

// Where the head begins: behind its tag, or where a browser puts one.
std::size_t startOfHead(const std::string& page) {
  constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";
  std::size_t place = page.starts_with(kByteOrderMark) ? kByteOrderMark.size() : 0;
  const std::string small = lowered(page);
  Tags tags(small);
  while (const auto tag = tags.next()) {
    if (tag->name != "!doctype" && tag->name != "html" && tag->name != "head") break;
    place = tag->end;
    if (tag->name == "head") break;
  }
  return place;
}

}  // namespace

std::string withConveyor(std::string page) {
  removePolicies(page);
  return page.insert(startOfHead(page), "<script src=\"../conveyor.js\"></script>");
}

}  // namespace quilt::scripting
