// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/Calls.h"

#include <charconv>
#include <nlohmann/json.hpp>
#include <optional>

#include "quilt/scripting/Accessor.h"

namespace quilt::scripting {

namespace {

using Json = nlohmann::ordered_json;
using platform::ErrorKind;

constexpr std::chrono::seconds kHeartbeat{15};

std::string textOf(const Json& json) { return json.dump(-1, ' ', false, Json::error_handler_t::replace); }

http::Response answering(int status, const Json& json) {
  return {status, {{"Content-Type", "application/json"}, {"Cache-Control", "no-store"}}, textOf(json)};
}

http::Response refusal(int status, const char* code, const std::string& message) {
  return answering(status, {{"error", {{"code", code}, {"message", message}}}});
}

http::Response noSession() {
  return refusal(404, "no-session", "There is no such session; it has ended, or was left alone for too long");
}

http::Response tooManyObjects() {
  return refusal(429, "too-many-objects", "This session holds as many objects as it may; open another");
}

// An object of JSON, or none.
std::optional<Json> parsed(const std::string& body) {
  Json json = Json::parse(body, nullptr, false);
  if (!json.is_object()) return std::nullopt;
  return json;
}

std::optional<std::string> memberText(const Json& json, const char* name) {
  const auto member = json.find(name);
  if (member == json.end() || !member->is_string()) return std::nullopt;
  return member->get<std::string>();
}

std::optional<Session::Handle> handleIn(const std::string& text) {
  Session::Handle handle = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), handle);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return handle;
}

// A value as an accessor takes it; none for what none of them takes.
std::optional<Value> valueFrom(const Json& json) {
  if (json.is_null()) return Value();
  if (json.is_string()) return Value(json.get<std::string>());
  if (json.is_number_unsigned() && json.get<std::uint64_t>() > static_cast<std::uint64_t>(INT64_MAX))
    return std::nullopt;
  if (json.is_number_integer()) return Value(json.get<std::int64_t>());
  if (json.is_number_float()) return Value(json.get<double>());
  return std::nullopt;
}

std::optional<std::vector<Value>> valuesFrom(const Json& json) {
  std::vector<Value> values;
  for (const Json& item : json) {
    auto value = valueFrom(item);
    if (!value) return std::nullopt;
    values.push_back(*std::move(value));
  }
  return values;
}

// {"object": "7", "class": "QuiltMedia"}; none when the session can hold no more.
std::optional<Json> reference(Session& session, const std::shared_ptr<platform::Object>& object) {
  const auto handle = session.handleOf(object);
  if (!handle) return std::nullopt;
  return Json{{"object", std::to_string(*handle)}, {"class", exposedClassOf(*object)->name}};
}

std::optional<Json> jsonFrom(Session& session, const Value& value) {
  struct Writer {
    Session& session;
    std::optional<Json> operator()(std::monostate) const { return Json(); }
    std::optional<Json> operator()(const std::string& text) const { return Json(text); }
    std::optional<Json> operator()(std::int64_t number) const { return Json(number); }
    std::optional<Json> operator()(double number) const { return Json(number); }
    std::optional<Json> operator()(const std::vector<std::string>& texts) const { return Json(texts); }
    std::optional<Json> operator()(const std::shared_ptr<platform::Object>& object) const {
      return reference(session, object);
    }
  };
  return std::visit(Writer{session}, value);
}

// Whether the accessor changes something: those that answer nothing do.
bool isEdit(const platform::Object& object, std::string_view name) {
  const Accessor* accessor = accessorOf(object, name);
  return accessor != nullptr && accessor->answer == Answer::Nothing;
}

Json tableOfClasses() {
  Json classes = Json::object();
  for (const ExposedClass& type : exposedClasses()) {
    Json names = Json::array();
    for (const Accessor& accessor : type.accessors) names.push_back(accessor.name);
    classes[std::string(type.name)] = std::move(names);
  }
  return classes;
}

std::string eventOf(const Session::Change& change) {
  return "event: change\ndata: " +
         textOf({{"object", std::to_string(change.handle)}, {"accessors", change.accessors}}) + "\n\n";
}

http::Response refusalOf(const platform::Error& error) {
  if (error.kind == ErrorKind::Unsupported) return refusal(404, "no-accessor", error.text);
  return refusal(400, "wrong-arguments", error.text);
}

}  // namespace

http::Response Calls::answer(std::string_view name, const std::string& body) {
  if (name == "open") return open();
  if (name == "call") return call(body);
  if (name == "close") return close(body);
  return refusal(404, "no-call", "There is \"open\", \"call\" and \"close\"");
}

http::Response Calls::open() {
  const auto identity = _sessions.open();
  if (!identity) return refusal(429, "too-many-sessions", "As many sessions are open as may be");
  const auto session = _sessions.find(*identity);
  if (!session) return noSession();
  Json roots = Json::object();
  for (const auto& [name, object] : _roots) {
    auto root = object ? reference(*session, object) : Json();
    if (!root) return tooManyObjects();
    roots[name] = *std::move(root);
  }
  return answering(200, {{"session", *identity}, {"roots", std::move(roots)}, {"classes", tableOfClasses()}});
}

http::Response Calls::call(const std::string& body) {
  const auto json = parsed(body);
  const auto identity = json ? memberText(*json, "session") : std::nullopt;
  const auto handle = json ? memberText(*json, "object") : std::nullopt;
  const auto method = json ? memberText(*json, "method") : std::nullopt;
  const auto given = json ? json->find("arguments") : Json::const_iterator();
  if (!identity || !handle || !method || given == json->end() || !given->is_array())
    return refusal(400, "bad-request", "A call is {\"session\", \"object\", \"method\", \"arguments\": []}");
  const auto session = _sessions.find(*identity);
  if (!session) return noSession();
  const auto number = handleIn(*handle);
  const auto object = number ? session->object(*number) : nullptr;
  if (!object) return refusal(404, "no-object", "There is no such object in this session, or no more");
  if (isExcludedFromScripts(*object, *method))
    return refusal(404, "no-accessor",
                   "\"" + *method + "\" is no accessor of " + std::string(exposedClassOf(*object)->name));
  const auto arguments = valuesFrom(*given);
  if (!arguments) return refusal(400, "wrong-arguments", "Arguments are texts, whole numbers and null");

  // Shared: the block may go on after this call has given up.
  struct Outcome {
    std::optional<platform::Result<Value>> result;
    bool isSaved = true;
    bool standsIn = false;
  };
  const auto done = std::make_shared<Outcome>();
  const auto outcome = _mainThread.perform(
      [done, object, method = *method, arguments = *arguments, &keeper = _keeper] {
        try {
          const auto act = [&] {
            done->result = perform(*object, method, arguments);
            done->standsIn = answersStandIn(*object, method);
            return done->result->hasValue();
          };
          if (isEdit(*object, method))
            done->isSaved = keeper.keep(act);
          else
            act();
        } catch (const std::exception& error) {
          done->result = platform::Error{ErrorKind::InputOutput, error.what(), {}};
        } catch (...) {
          done->result = platform::Error{ErrorKind::InputOutput, "A host's observer threw", {}};
        }
      },
      _within);
  switch (outcome) {
    case MainThreadCalls::Outcome::NotBegun:
      return refusal(503, "busy", "The application is busy; nothing was done");
    case MainThreadCalls::Outcome::NotEnded:
      return refusal(504, "too-slow", "The application has begun and takes long; look again later");
    case MainThreadCalls::Outcome::Done:
      break;
  }
  const platform::Result<Value>& answer = *done->result;
  if (!answer) {
    if (answer.error().kind == ErrorKind::InputOutput) return refusal(500, "failed", "Something unexpected happened");
    return refusalOf(answer.error());
  }
  if (!done->isSaved)
    return refusal(500, "not-saved",
                   "The change is made, but the document cannot be saved: its record cannot be written");
  auto value = jsonFrom(*session, *answer);
  if (!value) return tooManyObjects();
  Json result = {{"value", *std::move(value)}};
  if (done->standsIn) result["standsIn"] = true;
  return answering(200, result);
}

http::Response Calls::close(const std::string& body) {
  const auto json = parsed(body);
  const auto identity = json ? memberText(*json, "session") : std::nullopt;
  if (!identity) return refusal(400, "bad-request", "To close is {\"session\"}");
  if (!_sessions.find(*identity)) return noSession();
  _sessions.close(*identity);
  return answering(200, Json::object());
}

http::Response Calls::events(std::string_view identity, std::chrono::milliseconds beat) {
  const auto session = _sessions.find(identity);
  if (!session) return noSession();
  if (!session->beginStream()) return refusal(409, "already-listening", "This session has its stream of changes");
  // Whatever ends the stream ends the session.
  struct Stream {
    Sessions& sessions;
    std::string identity;
    std::shared_ptr<Session> session;
    std::chrono::steady_clock::time_point spoke = std::chrono::steady_clock::now();
    bool hasBegun = false;
    Stream(Sessions& all, std::string_view name, std::shared_ptr<Session> one)
        : sessions(all), identity(name), session(std::move(one)) {}
    Stream(const Stream&) = delete;
    Stream& operator=(const Stream&) = delete;
    ~Stream() { sessions.close(identity); }
  };
  http::Response response{200, {{"Content-Type", "text/event-stream"}, {"Cache-Control", "no-store"}}, {}};
  response.stream = [stream = std::make_shared<Stream>(_sessions, identity, session),
                     beat]() -> std::optional<std::string> {
    if (!std::exchange(stream->hasBegun, true)) return "event: open\ndata: {}\n\n";
    const auto changes = stream->session->takeChanges(beat);
    if (!changes) return std::nullopt;
    std::string piece;
    for (const Session::Change& change : *changes) piece += eventOf(change);
    const auto now = std::chrono::steady_clock::now();
    if (piece.empty() && now - stream->spoke > kHeartbeat) piece = ":\n\n";
    if (!piece.empty()) stream->spoke = now;
    return piece;
  };
  return response;
}

}  // namespace quilt::scripting
