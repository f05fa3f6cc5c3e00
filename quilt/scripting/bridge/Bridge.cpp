// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/Bridge.h"

#include "quilt/collections/QuiltCollection.h"
#include "quilt/resources/EmbeddedFiles.h"
#include "quilt/scripting/bridge/Calls.h"
#include "quilt/scripting/bridge/Door.h"
#include "quilt/scripting/bridge/Page.h"
#include "quilt/scripting/bridge/Secret.h"
#include "quilt/scripting/bridge/http/Files.h"
#include "quilt/scripting/bridge/http/Server.h"

namespace quilt::scripting {

namespace {

constexpr std::string_view kPackage = "package/";
constexpr std::string_view kCalls = "conveyor/";
constexpr std::string_view kEvents = "conveyor/events";
constexpr std::string_view kScript = "conveyor.js";
constexpr std::string_view kData = "package/controllers/data.js";

http::Response missing() { return http::plain(404, "There is nothing here.\n"); }

http::Response script() {
  for (const auto& file : resources::embeddedScripts())
    if (file.path == "scripting/conveyor.js")
      return {200,
              {{"Content-Type", "text/javascript; charset=utf-8"}, {"Cache-Control", "no-cache"}},
              {file.bytes.begin(), file.bytes.end()}};
  return missing();
}

}  // namespace

class Bridge::Implementation {
 public:
  Implementation(std::unique_ptr<http::Server> server, const std::shared_ptr<QuiltDocument>& document,
                 const Options& options)
      : _beat(options.limits.streamBeat),
        _token(makeSecret()),
        _door(server->port(), _token),
        _package{document->path(), withConveyor},
        _within(options.callTime),
        _sessions(options.sessions, options.objectsPerSession, options.sessionIdle),
        _keeper(document),
        _calls(_sessions, _mainThread, _keeper, {{"document", document}, {"collection", document->collectionOwner()}},
               options.callTime),
        _server(std::move(server)) {
    _server->open({[this](const http::RequestHead& head) { return _door.judge(head); },
                   [this](const http::Request& request) { return answer(request); }, [this] { tick(); }});
  }
  Implementation(const Implementation&) = delete;
  Implementation& operator=(const Implementation&) = delete;
  // First lets those go who wait for the main thread, which may be this one.
  ~Implementation() {
    _mainThread.end();
    _sessions.closeAll();
    _keeper.settle();
  }

  [[nodiscard]] std::uint16_t port() const { return _server->port(); }
  [[nodiscard]] std::string address() const {
    return "http://127.0.0.1:" + std::to_string(port()) + '/' + _token + '/' + std::string(kPackage);
  }
  [[nodiscard]] std::size_t sessionCount() const { return _sessions.count(); }
  bool settle() { return _keeper.settle(); }

 private:
  void tick() {
    _sessions.expire();
    if (_keeper.isDue()) _mainThread.post(settling());
  }

  std::function<void()> settling() {
    return [&keeper = _keeper] { keeper.settle(); };
  }

  http::Response answer(const http::Request& request) {
    const std::string_view path = _door.pathBehind(request.head).value_or("");
    if (request.head.method == "POST") {
      if (!path.starts_with(kCalls)) return missing();
      return _calls.answer(path.substr(kCalls.size()), request.body);
    }
    if (path == kEvents && request.head.method == "GET") {
      if (!_door.isShownToken(request.head)) return http::plain(401, "The token is missing in X-Conveyor-Token.\n");
      return _calls.events(request.head.parameter("session").value_or(""), _beat);
    }
    if (path == kScript) return script();
    if (path == kData && _keeper.isPageOld()) (void)_mainThread.perform(settling(), _within);
    if (path.starts_with(kPackage)) return http::answerFile(_package, path.substr(kPackage.size()), request.head);
    return missing();
  }

  const std::chrono::milliseconds _beat;
  const std::string _token;
  const Door _door;
  const http::FileRoom _package;
  const std::chrono::milliseconds _within;
  Sessions _sessions;
  EditKeeper _keeper;
  MainThreadCalls _mainThread;
  Calls _calls;
  std::unique_ptr<http::Server> _server;  // last: its threads end before what they use
};

platform::Result<std::unique_ptr<Bridge>> Bridge::serve(const std::shared_ptr<QuiltDocument>& document,
                                                        const Options& options) {
  auto server = http::Server::bind(options.port, options.limits);
  if (!server) return server.error();
  return std::unique_ptr<Bridge>(new Bridge(std::make_unique<Implementation>(*std::move(server), document, options)));
}

Bridge::Bridge(std::unique_ptr<Implementation> implementation) : _implementation(std::move(implementation)) {}
Bridge::~Bridge() = default;
std::string Bridge::address() const { return _implementation->address(); }
std::uint16_t Bridge::port() const { return _implementation->port(); }
std::size_t Bridge::sessionCount() const { return _implementation->sessionCount(); }
bool Bridge::settle() { return _implementation->settle(); }

}  // namespace quilt::scripting
