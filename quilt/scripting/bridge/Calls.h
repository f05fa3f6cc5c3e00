// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "quilt/platform/base/Object.h"
#include "quilt/scripting/bridge/EditKeeper.h"
#include "quilt/scripting/bridge/MainThreadCalls.h"
#include "quilt/scripting/bridge/Session.h"
#include "quilt/scripting/bridge/http/Response.h"

namespace quilt::scripting {

/// The calls of the bridge: JSON in, JSON out. Any thread but the main thread.
class Calls {
 public:
  /// The objects that a client begins with, by name.
  using Roots = std::vector<std::pair<std::string, std::shared_ptr<platform::Object>>>;

  Calls(Sessions& sessions, MainThreadCalls& mainThread, EditKeeper& keeper, Roots roots,
        std::chrono::milliseconds within)
      : _sessions(sessions), _mainThread(mainThread), _keeper(keeper), _roots(std::move(roots)), _within(within) {}

  /// What the client asks with a body: `name` is "open", "call" or "close".
  http::Response answer(std::string_view name, const std::string& body);

  /// The stream of changes of one session, which ends with it.
  http::Response events(std::string_view identity, std::chrono::milliseconds beat);

 private:
  http::Response open();
  http::Response call(const std::string& body);
  http::Response close(const std::string& body);

  Sessions& _sessions;
  MainThreadCalls& _mainThread;
  EditKeeper& _keeper;
  const Roots _roots;
  const std::chrono::milliseconds _within;
};

}  // namespace quilt::scripting
