// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/Page.h"

#include <algorithm>
#include <string_view>

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

void removePolicies(std::string& page) {
  std::string small = lowered(page);
  for (std::size_t place = small.find("<meta"); place != std::string::npos; place = small.find("<meta", place)) {
    const std::size_t end = endOfTag(small, place);
    if (end == std::string::npos) return;
    if (std::string_view(small).substr(place, end - place).find("content-security-policy") == std::string::npos) {
      place = end;
      continue;
    }
    page.erase(place, end - place);
    small.erase(place, end - place);
  }
}

}  // namespace

std::string withConveyor(std::string page) {
  constexpr std::string_view kScript = "<script src=\"../conveyor.js\"></script>";
  removePolicies(page);
  const std::string small = lowered(page);
  for (const std::string_view tag : {"<head", "<html", "<!doctype"}) {
    std::size_t found = small.find(tag);
    while (found != std::string::npos && tag == "<head" && small.compare(found, 7, "<header") == 0)
      found = small.find(tag, found + 1);
    const std::size_t end = found == std::string::npos ? found : endOfTag(small, found);
    if (end != std::string::npos) return page.insert(end, kScript);
  }
  return page.insert(0, kScript);
}

}  // namespace quilt::scripting
