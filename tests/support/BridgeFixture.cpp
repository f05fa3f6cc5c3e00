// SPDX-License-Identifier: Apache-2.0
#include "tests/support/BridgeFixture.h"

#include <algorithm>

#include "quilt/platform/base/Worker.h"

namespace quilt::support {

BridgeFixture::BridgeFixture() { serve({}); }

BridgeFixture::~BridgeFixture() = default;

void BridgeFixture::serve(const scripting::Bridge::Options& options) {
  _bridge.reset();
  auto bridge = scripting::Bridge::serve(document(), options);
  if (!bridge) throw std::runtime_error(bridge.error().text);
  _bridge = *std::move(bridge);
}

std::string BridgeFixture::token() const {
  const std::string address = bridge().address();
  const std::size_t begin = address.find('/', 7) + 1;
  return address.substr(begin, address.find('/', begin) - begin);
}

void BridgeFixture::meanwhile(const std::function<void()>& clients) { platform::runOnWorker(clients); }

std::string BridgeFixture::request(const std::string& method, const std::string& target, Fields fields,
                                   const std::string& body) const {
  const bool namesHost =
      std::any_of(fields.begin(), fields.end(), [](const auto& field) { return field.first == "Host"; });
  if (!namesHost) fields.emplace(fields.begin(), "Host", host());
  if (!body.empty()) fields.emplace_back("Content-Length", std::to_string(body.size()));
  std::string text = method + ' ' + target + " HTTP/1.1\r\n";
  for (const auto& [name, fieldValue] : fields) text += name + ": " + fieldValue + "\r\n";
  return text + "\r\n" + body;
}

BridgeFixture::Fields BridgeFixture::callFields() const {
  return {{"Content-Type", "application/json"}, {"X-Conveyor-Token", token()}};
}

HttpAnswer BridgeFixture::ask(const std::string& method, const std::string& target, const Fields& fields,
                              const std::string& body) const {
  HttpClient client(port());
  client.send(request(method, target, fields, body));
  return client.read(method != "HEAD");
}

HttpAnswer BridgeFixture::post(const std::string& name, const Json& body) const {
  return ask("POST", path("conveyor/" + name), callFields(), body.dump());
}

nlohmann::json BridgeFixture::opened() const {
  const HttpAnswer answer = post("open", Json::object());
  EXPECT_EQ(200, answer.status) << answer.body;
  return answer.json();
}

HttpAnswer BridgeFixture::called(const Json& session, const Json& object, const std::string& method,
                                 const Json& arguments) const {
  return post(
      "call",
      {{"session", session["session"]}, {"object", object["object"]}, {"method", method}, {"arguments", arguments}});
}

std::string BridgeFixture::codeOf(const HttpAnswer& answer) {
  const Json json = answer.json();
  return json.is_object() && json.contains("error") ? json["error"]["code"].get<std::string>() : "";
}

nlohmann::json BridgeFixture::value(const Json& session, const Json& object, const std::string& method,
                                    const Json& arguments) const {
  const HttpAnswer answer = called(session, object, method, arguments);
  EXPECT_EQ(200, answer.status) << method << ": " << answer.body;
  return answer.status == 200 ? answer.json()["value"] : Json("refused");
}

}  // namespace quilt::support
