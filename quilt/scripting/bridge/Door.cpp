// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/Door.h"

#include "quilt/scripting/bridge/Secret.h"

namespace quilt::scripting {

namespace {

constexpr std::string_view kTokenField = "x-conveyor-token";

// "application/json", also with its one parameter.
bool isJson(std::optional<std::string_view> type) {
  return type == "application/json" || type == "application/json; charset=utf-8" ||
         type == "application/json;charset=utf-8";
}

}  // namespace

bool Door::isOurHost(std::string_view host) const {
  for (const std::string_view name : {"127.0.0.1:", "[::1]:", "localhost:"})
    if (host.starts_with(name) && host.substr(name.size()) == _port) return true;
  return false;
}

std::optional<http::Response> Door::judge(const http::RequestHead& head) const {
  const auto host = head.only("host");
  if (!host || !isOurHost(*host)) return http::plain(403, "This is not the host that you look for.\n");
  if (head.count("origin") > 0) {
    const auto origin = head.only("origin");
    if (!origin || *origin != "http://" + std::string(*host))
      return http::plain(403, "Pages of other sites are not served.\n");
  }
  const std::string_view path = head.path().substr(1);
  if (!isSameSecret(path.substr(0, path.find('/')), _token))
    return http::plain(401, "The address lacks the token that \"quilt serve\" prints.\n");
  if (head.method == "GET" || head.method == "HEAD") return std::nullopt;
  if (head.method != "POST") {
    http::Response refusal = http::plain(405, "GET, HEAD and POST only.\n");
    refusal.fields.emplace_back("Allow", "GET, HEAD, POST");
    return refusal;
  }
  if (!isShownToken(head)) return http::plain(401, "The token is missing in X-Conveyor-Token.\n");
  if (!isJson(head.only("content-type"))) return http::plain(415, "Calls are application/json.\n");
  return std::nullopt;
}

std::optional<std::string_view> Door::pathBehind(const http::RequestHead& head) const {
  const std::string_view path = head.path();
  const std::size_t front = _token.size() + 2;  // and its two slashes
  if (path.size() < front) return std::nullopt;
  return path.substr(front);
}

bool Door::isShownToken(const http::RequestHead& head) const {
  const auto shown = head.only(kTokenField);
  return shown && isSameSecret(*shown, _token);
}

}  // namespace quilt::scripting
