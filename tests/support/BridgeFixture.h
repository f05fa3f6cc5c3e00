// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>

#include "quilt/scripting/bridge/Bridge.h"
#include "tests/support/HttpClient.h"
#include "tests/support/PackageFixture.h"

namespace quilt::support {

/// A test of the bridge: the fixture's package is served, and clients talk to it from another thread while this one,
/// the main thread, keeps turning.
class BridgeFixture : public PackageFixture {
 protected:
  using Json = nlohmann::json;
  using Fields = std::vector<std::pair<std::string, std::string>>;

  BridgeFixture();
  ~BridgeFixture() override;

  /// Serves anew, with other limits.
  void serve(const scripting::Bridge::Options& options);
  void endBridge() { _bridge.reset(); }
  [[nodiscard]] scripting::Bridge& bridge() const { return *_bridge; }
  [[nodiscard]] std::uint16_t port() const { return _bridge->port(); }
  [[nodiscard]] std::string token() const;
  /// What a client of this bridge names as its host.
  [[nodiscard]] std::string host() const { return "127.0.0.1:" + std::to_string(port()); }
  /// "/TOKEN/" and the rest.
  [[nodiscard]] std::string path(const std::string& rest) const { return '/' + token() + '/' + rest; }

  /// Runs the clients' part on a thread of its own until it is done.
  static void meanwhile(const std::function<void()>& clients);

  /// A request as it goes over the wire: Host is added when it is missing in the fields, Content-Length for a body.
  [[nodiscard]] std::string request(const std::string& method, const std::string& target, Fields fields = {},
                                    const std::string& body = "") const;
  /// The fields of a call as conveyor.js sends them.
  [[nodiscard]] Fields callFields() const;

  /// The answer to a request on a connection of its own; from any thread.
  [[nodiscard]] HttpAnswer ask(const std::string& method, const std::string& target, const Fields& fields = {},
                               const std::string& body = "") const;
  [[nodiscard]] HttpAnswer post(const std::string& name, const Json& body) const;

  /// Opens a session: {"session", "roots", "classes"}.
  [[nodiscard]] Json opened() const;
  /// The whole answer of a call; `object` is a reference as answers hold it.
  [[nodiscard]] HttpAnswer called(const Json& session, const Json& object, const std::string& method,
                                  const Json& arguments = Json::array()) const;
  /// The code of a refusal; empty for any other answer.
  static std::string codeOf(const HttpAnswer& answer);
  /// The value of a call; fails the test when it is refused.
  [[nodiscard]] Json value(const Json& session, const Json& object, const std::string& method,
                           const Json& arguments = Json::array()) const;

 private:
  std::unique_ptr<scripting::Bridge> _bridge;
};

}  // namespace quilt::support
