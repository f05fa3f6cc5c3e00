// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/http/Server.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <list>
#include <mutex>
#include <thread>

#include "quilt/scripting/bridge/http/Connection.h"

namespace quilt::scripting::http {

namespace {

using platform::Error;
using platform::ErrorKind;

constexpr int kTickMilliseconds = 500;

Error errorOf(int number, const std::string& what) {
  ErrorKind kind = ErrorKind::InputOutput;
  if (number == EADDRINUSE) kind = ErrorKind::AlreadyExists;
  if (number == EACCES) kind = ErrorKind::PermissionDenied;
  return {kind, what + ": " + std::generic_category().message(number), {}};
}

// Signals are the host's business: its main thread gets them, not a thread of the server.
class SignalsBlocked {
 public:
  SignalsBlocked() {
    sigset_t all;
    sigfillset(&all);
    pthread_sigmask(SIG_SETMASK, &all, &_before);
  }
  SignalsBlocked(const SignalsBlocked&) = delete;
  SignalsBlocked& operator=(const SignalsBlocked&) = delete;
  ~SignalsBlocked() { pthread_sigmask(SIG_SETMASK, &_before, nullptr); }

 private:
  sigset_t _before{};
};

}  // namespace

class Server::Implementation {
 public:
  Implementation(Descriptor listener, Descriptor bell, std::uint16_t port, const Limits& limits)
      : _listener(std::move(listener)), _bell(std::move(bell)), _port(port), _limits(limits) {}
  Implementation(const Implementation&) = delete;
  Implementation& operator=(const Implementation&) = delete;

  ~Implementation() {
    const std::uint64_t one = 1;
    (void)!::write(_bell.number(), &one, sizeof one);
    if (_acceptor.joinable()) _acceptor.join();
    for (Client& client : _clients) {
      ::shutdown(client.socket.number(), SHUT_RDWR);
      client.thread.join();
    }
  }

  [[nodiscard]] std::uint16_t port() const { return _port; }

  void open(Rooms rooms) {
    _rooms = std::move(rooms);
    const SignalsBlocked blocked;
    _acceptor = std::thread([this] { accept(); });
  }

 private:
  struct Client {
    Descriptor socket;
    std::atomic<bool> passedDoor{false};
    std::atomic<bool> isDone{false};
    std::thread thread{};
  };

  void accept() {
    pollfd watched[] = {{_bell.number(), POLLIN, 0}, {_listener.number(), POLLIN, 0}};
    while (watched[0].revents == 0) {
      if (poll(watched, 2, kTickMilliseconds) < 0) watched[0].revents = watched[1].revents = 0;
      removeDone();
      if (_rooms.tick) _rooms.tick();
      if (watched[1].revents != 0) admit();
    }
  }

  void admit() {
    Descriptor socket(accept4(_listener.number(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
    if (!socket) {
      // Out of descriptors, say: the client stays in the queue, and the next try must not come at once.
      if (errno != EAGAIN && errno != ECONNABORTED) std::this_thread::sleep_for(std::chrono::milliseconds(10));
      return;
    }
    const int on = 1;
    setsockopt(socket.number(), IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    if (_clients.size() >= _limits.connections && !evictStranger()) {
      constexpr std::string_view kFull =
          "HTTP/1.1 503 Service Unavailable\r\nContent-Length: 0\r\nConnection: close\r\n\r\n";
      (void)!send(socket.number(), kFull.data(), kFull.size(), MSG_NOSIGNAL);
      return;
    }
    Client& client = _clients.emplace_back();
    client.socket = std::move(socket);
    try {
      client.thread = std::thread([this, &client] { serve(client); });
    } catch (const std::system_error&) {
      _clients.pop_back();
    }
  }

  void serve(Client& client) {
    try {
      Connection(client.socket.number(), _limits).serve(_rooms, client.passedDoor);
    } catch (const std::exception&) {
      // Out of memory: this client's bytes and the connection go.
    }
    ::shutdown(client.socket.number(), SHUT_RDWR);
    client.isDone = true;
  }

  // Ends the oldest connection that has shown nothing yet, so that strangers cannot crowd out those who belong here.
  bool evictStranger() {
    const auto stranger =
        std::find_if(_clients.begin(), _clients.end(), [](const Client& client) { return !client.passedDoor; });
    if (stranger == _clients.end()) return false;
    ::shutdown(stranger->socket.number(), SHUT_RDWR);
    stranger->thread.join();
    _clients.erase(stranger);
    return true;
  }

  void removeDone() {
    _clients.remove_if([](Client& client) {
      if (!client.isDone) return false;
      client.thread.join();
      return true;
    });
  }

  Descriptor _listener;
  Descriptor _bell;  // rung to end
  std::uint16_t _port;
  const Limits _limits;
  Rooms _rooms;
  std::list<Client> _clients;  // touched by the acceptor's thread, and after its end
  std::thread _acceptor;
};

platform::Result<std::unique_ptr<Server>> Server::bind(std::uint16_t port, const Limits& limits) {
  Descriptor listener(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  Descriptor bell(eventfd(0, EFD_CLOEXEC));
  if (!listener || !bell) return errorOf(errno, "No socket can be had");
  const int on = 1;
  setsockopt(listener.number(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  address.sin_port = htons(port);
  socklen_t size = sizeof address;
  auto* generic = reinterpret_cast<sockaddr*>(&address);
  if (::bind(listener.number(), generic, size) != 0 || listen(listener.number(), SOMAXCONN) != 0 ||
      getsockname(listener.number(), generic, &size) != 0)
    return errorOf(errno, port == 0 ? "No port can be had" : "Port " + std::to_string(port) + " cannot be had");
  return std::unique_ptr<Server>(new Server(
      std::make_unique<Implementation>(std::move(listener), std::move(bell), ntohs(address.sin_port), limits)));
}

Server::Server(std::unique_ptr<Implementation> implementation) : _implementation(std::move(implementation)) {}
Server::~Server() = default;
std::uint16_t Server::port() const { return _implementation->port(); }
void Server::open(Rooms rooms) { _implementation->open(std::move(rooms)); }

}  // namespace quilt::scripting::http
