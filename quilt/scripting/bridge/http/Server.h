// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <memory>

#include "quilt/platform/base/Result.h"
#include "quilt/scripting/bridge/http/Limits.h"
#include "quilt/scripting/bridge/http/RequestHead.h"
#include "quilt/scripting/bridge/http/Response.h"

namespace quilt::scripting::http {

struct Request {
  RequestHead head;
  std::string body;
};

/// A small HTTP/1.1 server on 127.0.0.1 for few and local clients: a thread a connection, everything bounded.
///
/// The door sees each head before the body is read; what it answers is sent and ends the connection. The handler
/// answers the rest. Both run on the connections' threads, several at once, and must not outlive their owner, who stops
/// the server first. The tick runs about twice a second on a thread of the server.
class Server {
 public:
  using Door = std::function<std::optional<Response>(const RequestHead&)>;
  using Handler = std::function<Response(const Request&)>;

  struct Rooms {
    Door door;
    Handler handler;
    std::function<void()> tick;
  };

  /// Binds the port, 0 for any that is free, and serves once open() is called.
  static platform::Result<std::unique_ptr<Server>> bind(std::uint16_t port, const Limits& limits);
  Server(const Server&) = delete;
  Server& operator=(const Server&) = delete;
  /// Ends every connection and waits for the threads.
  ~Server();

  [[nodiscard]] std::uint16_t port() const;
  /// Once.
  void open(Rooms rooms);

 private:
  class Implementation;
  explicit Server(std::unique_ptr<Implementation> implementation);
  std::unique_ptr<Implementation> _implementation;
};

}  // namespace quilt::scripting::http
