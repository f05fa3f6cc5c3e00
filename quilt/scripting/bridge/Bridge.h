// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Result.h"
#include "quilt/scripting/bridge/http/Limits.h"

namespace quilt::scripting {

/// Serves one document's package to browsers and automation clients of this machine, with the live model behind it:
/// every accessor of the table (Accessor.h) and nothing else, and notices of what changes. docs/bridge.md describes the
/// protocol, conveyor.js speaks it.
///
/// The accessors run on the main thread, so a host keeps its loop turning while a bridge is there. Made and destroyed
/// on any thread; the end waits for calls under way.
class QUILT_EXPORT Bridge {
 public:
  /// What a host may set; the defaults suit one document and a few clients.
  struct Options {
    std::uint16_t port = 0;                         ///< 0: any that is free
    http::Limits limits{};                          ///< what one client may take
    std::chrono::milliseconds callTime{10000};      ///< how long a call waits for the main thread
    std::chrono::milliseconds sessionIdle{300000};  ///< how long a session lives without calls and without listening
    std::size_t sessions = 32;                      ///< at once; a silent one makes room, see docs/bridge.md
    std::size_t objectsPerSession = 50000;          ///< that a client holds; more are refused
  };

  /// Serves the document's package folder as it is, and as long as the bridge lives; only the data that its page reads
  /// follows the model. Fails when the port is taken.
  static platform::Result<std::unique_ptr<Bridge>> serve(const std::shared_ptr<QuiltDocument>& document,
                                                         const Options& options);
  Bridge(const Bridge&) = delete;
  Bridge& operator=(const Bridge&) = delete;
  ~Bridge();

  /// Where the package is: "http://127.0.0.1:4711/TOKEN/package/". Whoever knows it may read and edit, so it is for the
  /// user's eyes and no log.
  [[nodiscard]] std::string address() const;
  /// The port that was bound.
  [[nodiscard]] std::uint16_t port() const;
  /// Sessions that are open now.
  [[nodiscard]] std::size_t sessionCount() const;

  /// Main thread: saves what a failure left unsaved, and has the package's data on disk say what the document says;
  /// both happen by themselves too, soon after an edit and at the end. False when the record cannot be written.
  bool settle();

 private:
  class Implementation;
  explicit Bridge(std::unique_ptr<Implementation> implementation);
  std::unique_ptr<Implementation> _implementation;
};

}  // namespace quilt::scripting
