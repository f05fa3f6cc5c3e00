// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/http/RequestHead.h"

#include <algorithm>
#include <charconv>

namespace quilt::scripting::http {

namespace {

constexpr std::string_view kLineEnd = "\r\n";

bool isTokenCharacter(char c) {
  constexpr std::string_view kMarks = "!#$%&'*+-.^_`|~";
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
         kMarks.find(c) != std::string_view::npos;
}

bool isToken(std::string_view text) { return !text.empty() && std::all_of(text.begin(), text.end(), isTokenCharacter); }

bool isVisible(char c) { return c > ' ' && c < 0x7f; }

bool isFieldCharacter(char c) { return c == '\t' || (static_cast<unsigned char>(c) >= ' ' && c != 0x7f); }

char lowered(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; }

std::string lowered(std::string_view text) {
  std::string result(text);
  std::transform(result.begin(), result.end(), result.begin(), [](char c) { return lowered(c); });
  return result;
}

std::string_view trimmed(std::string_view text) {
  constexpr std::string_view kBlanks = " \t";
  const std::size_t first = text.find_first_not_of(kBlanks);
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

// "GET /path HTTP/1.1"; `isCurrent` tells the version.
bool readRequestLine(std::string_view line, RequestHead& head, bool& isCurrent) {
  const std::size_t first = line.find(' ');
  const std::size_t last = line.rfind(' ');
  if (first == std::string_view::npos || first == last) return false;
  const std::string_view method = line.substr(0, first);
  const std::string_view target = line.substr(first + 1, last - first - 1);
  const std::string_view version = line.substr(last + 1);
  if (!isToken(method) || !target.starts_with('/') || !std::all_of(target.begin(), target.end(), isVisible))
    return false;
  if (version != "HTTP/1.1" && version != "HTTP/1.0") return false;
  head.method = method;
  head.target = target;
  isCurrent = version == "HTTP/1.1";
  return true;
}

bool readField(std::string_view line, RequestHead& head) {
  const std::size_t colon = line.find(':');
  if (colon == std::string_view::npos || !isToken(line.substr(0, colon))) return false;
  const std::string_view value = line.substr(colon + 1);
  if (!std::all_of(value.begin(), value.end(), isFieldCharacter)) return false;
  head.fields.emplace_back(lowered(line.substr(0, colon)), trimmed(value));
  return true;
}

int digitOf(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  const char letter = lowered(c);
  return letter >= 'a' && letter <= 'f' ? letter - 'a' + 10 : -1;
}

}  // namespace

std::size_t RequestHead::count(std::string_view name) const {
  return static_cast<std::size_t>(
      std::count_if(fields.begin(), fields.end(), [name](const auto& field) { return field.first == name; }));
}

std::optional<std::string_view> RequestHead::only(std::string_view name) const {
  if (count(name) != 1) return std::nullopt;
  return std::find_if(fields.begin(), fields.end(), [name](const auto& field) { return field.first == name; })->second;
}

std::string_view RequestHead::path() const { return std::string_view(target).substr(0, target.find('?')); }

std::optional<std::string_view> RequestHead::parameter(std::string_view name) const {
  std::string_view rest = std::string_view(target).substr(path().size());
  while (!rest.empty()) {
    rest.remove_prefix(1);  // the "?" or "&"
    const std::string_view pair = rest.substr(0, rest.find('&'));
    const std::size_t equals = pair.find('=');
    if (equals != std::string_view::npos && pair.substr(0, equals) == name) return pair.substr(equals + 1);
    rest.remove_prefix(pair.size());
  }
  return std::nullopt;
}

std::optional<RequestHead> parseHead(std::string_view bytes) {
  RequestHead head;
  bool isCurrent = false;
  for (bool isFirst = true;; isFirst = false) {
    const std::size_t end = bytes.find(kLineEnd);
    if (end == std::string_view::npos) return std::nullopt;
    const std::string_view line = bytes.substr(0, end);
    bytes.remove_prefix(end + kLineEnd.size());
    if (line.empty()) {
      if (isFirst || !bytes.empty()) return std::nullopt;
      break;
    }
    if (!(isFirst ? readRequestLine(line, head, isCurrent) : readField(line, head))) return std::nullopt;
  }
  const auto connection = head.only("connection");
  head.keepsOpen = isCurrent && (head.count("connection") == 0 || (connection && lowered(*connection) == "keep-alive"));
  return head;
}

std::optional<std::size_t> bodyLengthOf(const RequestHead& head) {
  if (head.count("transfer-encoding") > 0) return std::nullopt;
  if (head.count("content-length") == 0) return 0;
  const auto text = head.only("content-length");
  if (!text) return std::nullopt;
  std::size_t length = 0;
  const auto [end, error] = std::from_chars(text->data(), text->data() + text->size(), length);
  if (error != std::errc() || end != text->data() + text->size()) return std::nullopt;
  return length;
}

std::optional<std::string> percentDecoded(std::string_view text) {
  std::string decoded;
  decoded.reserve(text.size());
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] != '%') {
      decoded += text[i];
      continue;
    }
    if (i + 2 >= text.size()) return std::nullopt;
    const int high = digitOf(text[i + 1]);
    const int low = digitOf(text[i + 2]);
    if (high < 0 || low < 0) return std::nullopt;
    decoded += static_cast<char>(high * 16 + low);
    i += 2;
  }
  return decoded;
}

}  // namespace quilt::scripting::http
