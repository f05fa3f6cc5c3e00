// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <cstdint>
#include <map>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <string_view>

namespace quilt::support {

/// One answer of a server, as it came over the wire.
struct HttpAnswer {
  int status = 0;                             ///< 0: the connection ended, or nothing came within ten seconds
  std::map<std::string, std::string> fields;  ///< names in lower case
  std::string body;

  [[nodiscard]] nlohmann::json json() const { return nlohmann::json::parse(body, nullptr, false); }
  bool operator==(const HttpAnswer&) const = default;
};

/// A bare connection to a port of this machine, which sends whatever it is told, well-formed or not.
class HttpClient {
 public:
  explicit HttpClient(std::uint16_t port);
  HttpClient(const HttpClient&) = delete;
  HttpClient& operator=(const HttpClient&) = delete;
  ~HttpClient();

  /// False when the server has ended the connection.
  bool send(std::string_view bytes);
  /// Sends no more, and goes on reading.
  void endSending();
  /// The next answer; `hasBody` is false for the answer to HEAD.
  HttpAnswer read(bool hasBody = true);
  /// What comes of a stream until it holds the text; what came so far when it does not come in time.
  std::string readUntil(std::string_view text);
  /// Whether the server ends the connection; false when it does not within ten seconds.
  bool isEnded();

 private:
  bool receive();

  int _socket = -1;
  std::string _received;
};

}  // namespace quilt::support
