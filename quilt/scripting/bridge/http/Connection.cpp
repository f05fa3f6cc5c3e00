// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/http/Connection.h"

#include <poll.h>
#include <sys/sendfile.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>

namespace quilt::scripting::http {

namespace {

constexpr std::string_view kHeadEnd = "\r\n\r\n";

// On every answer, refusals included.
constexpr std::string_view kEveryField =
    "X-Content-Type-Options: nosniff\r\n"
    "Content-Security-Policy: default-src 'none'; script-src 'self'; style-src 'self' 'unsafe-inline'; "
    "img-src 'self' data: blob:; media-src 'self' blob:; font-src 'self' data:; connect-src 'self'; "
    "frame-src 'self'; object-src 'none'; base-uri 'none'; form-action 'none'; frame-ancestors 'self'\r\n"
    "Referrer-Policy: no-referrer\r\n"
    "Cross-Origin-Resource-Policy: same-origin\r\n"
    "Cross-Origin-Opener-Policy: same-origin\r\n";

int millisecondsUntil(std::chrono::steady_clock::time_point deadline) {
  const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now()).count();
  return static_cast<int>(std::clamp<std::int64_t>(left, 0, 3'600'000));
}

std::string chunk(std::string_view piece) {
  std::array<char, 16> digits{};
  const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), piece.size(), 16).ptr;
  std::string text(digits.data(), end);
  return text.append("\r\n").append(piece).append("\r\n");
}

}  // namespace

void Connection::serve(const Server::Rooms& rooms, std::atomic<bool>& passedDoor) {
  for (std::size_t i = 1; i <= _limits.requestsPerConnection; ++i) {
    Request request;
    if (auto head = readHead()) {
      request.head = *std::move(head);
    } else {
      return;
    }
    if (const auto refusal = rooms.door(request.head)) return refuse(*refusal);
    passedDoor = true;
    const auto length = bodyLengthOf(request.head);
    if (!length || request.head.count("expect") > 0)
      return refuse(plain(411, "A body comes at once and with one Content-Length.\n"));
    if (*length > _limits.bodyBytes) return refuse(plain(413, "The body is too large.\n"));
    if (!readBody(*length, request.body)) return;
    const bool keepsOpen = request.head.keepsOpen && i < _limits.requestsPerConnection;
    if (!answer(rooms.handler(request), keepsOpen, request.head.method != "HEAD") || !keepsOpen) return;
  }
}

bool Connection::waitFor(short events, Clock::time_point deadline) const {
  pollfd watched{_socket, events, 0};
  for (;;) {
    const int ready = poll(&watched, 1, millisecondsUntil(deadline));
    if (ready >= 0 || errno != EINTR) return ready > 0;
  }
}

Connection::Got Connection::receive(Clock::time_point deadline) {
  std::array<char, 8192> buffer;
  for (;;) {
    const ssize_t count = recv(_socket, buffer.data(), buffer.size(), 0);
    if (count > 0) {
      _received.append(buffer.data(), static_cast<std::size_t>(count));
      return Got::Bytes;
    }
    if (count == 0) return Got::End;
    if (errno == EINTR) continue;
    if (errno != EAGAIN) return Got::End;
    if (!waitFor(POLLIN, deadline)) return Got::Late;
  }
}

std::optional<RequestHead> Connection::readHead() {
  if (_received.empty() && receive(Clock::now() + _limits.idle) != Got::Bytes) return std::nullopt;
  const auto deadline = Clock::now() + _limits.head;
  for (std::size_t searched = 0;;) {
    const std::size_t end = _received.find(kHeadEnd, searched);
    if (std::min(end, _received.size()) > _limits.headBytes) {
      refuse(plain(431, "The head is too large.\n"));
      return std::nullopt;
    }
    if (end != std::string::npos) {
      auto head = parseHead(std::string_view(_received).substr(0, end + kHeadEnd.size()));
      _received.erase(0, end + kHeadEnd.size());
      if (!head) refuse(plain(400, "This is no request that is understood here.\n"));
      return head;
    }
    searched = _received.size() - std::min(_received.size(), kHeadEnd.size() - 1);
    switch (receive(deadline)) {
      case Got::Bytes:
        break;
      case Got::Late:
        refuse(plain(408, "The request took too long.\n"));
        return std::nullopt;
      case Got::End:
        return std::nullopt;
    }
  }
}

bool Connection::readBody(std::size_t length, std::string& body) {
  const auto deadline = Clock::now() + _limits.body;
  while (_received.size() < length) {
    switch (receive(deadline)) {
      case Got::Bytes:
        break;
      case Got::Late:
        refuse(plain(408, "The request took too long.\n"));
        return false;
      case Got::End:
        return false;
    }
  }
  body = _received.substr(0, length);
  _received.erase(0, length);
  return true;
}

bool Connection::answer(const Response& response, bool keepsOpen, bool withBody) {
  std::string head = "HTTP/1.1 " + std::to_string(response.status) + ' ' + reasonOf(response.status) + "\r\n";
  for (const auto& [name, value] : response.fields) head.append(name).append(": ").append(value).append("\r\n");
  head += kEveryField;
  if (response.stream) {
    head += "Transfer-Encoding: chunked\r\n";
  } else if (response.status != 304) {
    const std::uint64_t length = response.file ? response.file->length : response.body.size();
    head += "Content-Length: " + std::to_string(length) + "\r\n";
  }
  head += keepsOpen ? "Connection: keep-alive\r\n\r\n" : "Connection: close\r\n\r\n";
  if (!withBody) return sendAll(head);
  if (response.stream) return sendAll(head) && sendStream(response.stream);
  if (response.file) return sendAll(head) && sendFile(*response.file);
  return sendAll(head + response.body);
}

bool Connection::sendAll(std::string_view bytes) {
  auto deadline = Clock::now() + _limits.stall;
  while (!bytes.empty()) {
    const ssize_t count = send(_socket, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    if (count >= 0) {
      bytes.remove_prefix(static_cast<std::size_t>(count));
      deadline = Clock::now() + _limits.stall;
    } else if (errno == EAGAIN) {
      if (!waitFor(POLLOUT, deadline)) return false;
    } else if (errno != EINTR) {
      return false;
    }
  }
  return true;
}

bool Connection::sendFile(const FileStretch& stretch) {
  auto offset = static_cast<off_t>(stretch.offset);
  std::uint64_t left = stretch.length;
  auto deadline = Clock::now() + _limits.stall;
  while (left > 0) {
    const ssize_t count = sendfile(_socket, stretch.file.number(), &offset,
                                   static_cast<std::size_t>(std::min<std::uint64_t>(left, std::uint64_t{1} << 20)));
    if (count > 0) {
      left -= static_cast<std::uint64_t>(count);
      deadline = Clock::now() + _limits.stall;
    } else if (count == 0) {
      return false;  // the file has become shorter
    } else if (errno == EAGAIN) {
      if (!waitFor(POLLOUT, deadline)) return false;
    } else if (errno != EINTR) {
      return false;
    }
  }
  return true;
}

bool Connection::sendStream(const Response::NextPiece& next) {
  while (isThere()) {
    const auto piece = next();
    if (!piece) return sendAll(chunk(""));
    if (!piece->empty() && !sendAll(chunk(*piece))) return false;
  }
  return false;
}

bool Connection::isThere() const {
  char byte = 0;
  const ssize_t count = recv(_socket, &byte, 1, MSG_PEEK);
  return count > 0 || (count < 0 && (errno == EAGAIN || errno == EINTR));
}

void Connection::refuse(const Response& response) {
  if (!answer(response, false, true)) return;
  shutdown(_socket, SHUT_WR);
  constexpr std::chrono::milliseconds kPatience{300};
  const auto deadline = Clock::now() + kPatience;
  const std::size_t most = _limits.headBytes + _limits.bodyBytes;
  std::size_t thrownAway = 0;
  for (_received.clear(); thrownAway < most && Clock::now() < deadline; _received.clear()) {
    if (receive(deadline) != Got::Bytes) return;
    thrownAway += _received.size();
  }
}

}  // namespace quilt::scripting::http
