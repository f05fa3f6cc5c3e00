// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>

#include "quilt/scripting/bridge/http/Server.h"

namespace quilt::scripting::http {

/// One client's socket: reads its requests and writes the answers, within the limits.
class Connection {
 public:
  Connection(int socket, const Limits& limits) : _socket(socket), _limits(limits) {}

  /// Serves requests until the client or a limit ends it, or the socket is shut down from elsewhere. `passedDoor` is
  /// set once the door lets a request through.
  void serve(const Server::Rooms& rooms, std::atomic<bool>& passedDoor);

 private:
  using Clock = std::chrono::steady_clock;

  enum class Got { Bytes, End, Late };
  Got receive(Clock::time_point deadline);
  /// The next head; what is wrong with it is answered here.
  std::optional<RequestHead> readHead();
  bool readBody(std::size_t length, std::string& body);
  bool answer(const Response& response, bool keepsOpen, bool withBody);
  bool sendAll(std::string_view bytes);
  bool sendFile(const FileStretch& stretch);
  bool sendStream(const Response::NextPiece& next);
  [[nodiscard]] bool waitFor(short events, Clock::time_point deadline) const;
  [[nodiscard]] bool isThere() const;
  /// Tells the client that nothing more comes, and lets it read the answer before the socket closes on its own bytes.
  void refuse(const Response& response);

  int _socket;
  const Limits& _limits;
  std::string _received;  // and not yet used
};

}  // namespace quilt::scripting::http
