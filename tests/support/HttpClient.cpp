// SPDX-License-Identifier: Apache-2.0
#include "tests/support/HttpClient.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

#include <algorithm>
#include <array>

namespace quilt::support {

HttpClient::HttpClient(std::uint16_t port) : _socket(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
  const timeval patience{10, 0};
  setsockopt(_socket, SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof patience);
  setsockopt(_socket, SOL_SOCKET, SO_SNDTIMEO, &patience, sizeof patience);
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  address.sin_port = htons(port);
  if (connect(_socket, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
    close(_socket);
    _socket = -1;
  }
}

HttpClient::~HttpClient() {
  if (_socket >= 0) close(_socket);
}

bool HttpClient::send(std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t count = ::send(_socket, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    if (count <= 0) return false;
    bytes.remove_prefix(static_cast<std::size_t>(count));
  }
  return true;
}

void HttpClient::endSending() { shutdown(_socket, SHUT_WR); }

bool HttpClient::receive() {
  std::array<char, 65536> buffer{};
  const ssize_t count = recv(_socket, buffer.data(), buffer.size(), 0);
  if (count <= 0) return false;
  _received.append(buffer.data(), static_cast<std::size_t>(count));
  return true;
}

HttpAnswer HttpClient::read(bool hasBody) {
  constexpr std::string_view kEnd = "\r\n\r\n";
  std::size_t end = 0;
  while ((end = _received.find(kEnd)) == std::string::npos)
    if (!receive()) return {};
  HttpAnswer answer;
  const std::string head = _received.substr(0, end + 2);
  _received.erase(0, end + kEnd.size());
  answer.status = std::stoi(head.substr(head.find(' ')));
  for (std::size_t line = head.find("\r\n") + 2; line < head.size(); line = head.find("\r\n", line) + 2) {
    const std::size_t colon = head.find(": ", line);
    std::string name = head.substr(line, colon - line);
    std::transform(name.begin(), name.end(), name.begin(), [](unsigned char c) { return std::tolower(c); });
    answer.fields[name] = head.substr(colon + 2, head.find("\r\n", colon) - colon - 2);
  }
  const auto length = answer.fields.find("content-length");
  if (!hasBody || length == answer.fields.end()) return answer;
  const std::size_t wanted = std::stoul(length->second);
  while (_received.size() < wanted)
    if (!receive()) break;
  answer.body = _received.substr(0, wanted);
  _received.erase(0, wanted);
  return answer;
}

std::string HttpClient::readUntil(std::string_view text) {
  while (_received.find(text) == std::string::npos)
    if (!receive()) break;
  return std::exchange(_received, {});
}

bool HttpClient::isEnded() {
  for (;;) {
    char byte = 0;
    const ssize_t count = recv(_socket, &byte, 1, 0);
    if (count == 0 || (count < 0 && errno == ECONNRESET)) return true;
    if (count < 0) return false;
  }
}

}  // namespace quilt::support
