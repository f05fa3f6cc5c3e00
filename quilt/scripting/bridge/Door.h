// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/scripting/bridge/http/RequestHead.h"
#include "quilt/scripting/bridge/http/Response.h"

namespace quilt::scripting {

/// Who may come in: requests that name this server as their host (a page of another site whose name was bent to this
/// address does not), that come from no other site's page, and that know the token. Paths begin with the token, so that
/// the addresses in a page carry it on; what is more than reading also shows it in a field that no other site can send.
class Door {
 public:
  Door(std::uint16_t port, std::string token) : _port(std::to_string(port)), _token(std::move(token)) {}

  /// The refusal, or none for a request that may come in. Looks at the host first, then at the origin, then at the
  /// token; what it answers tells nothing about what lies behind.
  [[nodiscard]] std::optional<http::Response> judge(const http::RequestHead& head) const;

  /// The path behind the token and its slash; none for the token alone.
  [[nodiscard]] std::optional<std::string_view> pathBehind(const http::RequestHead& head) const;

  /// Whether the token is shown in its field.
  [[nodiscard]] bool isShownToken(const http::RequestHead& head) const;

 private:
  [[nodiscard]] bool isOurHost(std::string_view host) const;

  std::string _port;
  std::string _token;
};

}  // namespace quilt::scripting
