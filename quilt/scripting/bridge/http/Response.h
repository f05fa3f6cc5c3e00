// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "quilt/scripting/bridge/http/Descriptor.h"

namespace quilt::scripting::http {

/// A stretch of an open file.
struct FileStretch {
  Descriptor file;
  std::uint64_t offset = 0;
  std::uint64_t length = 0;
};

/// What to answer: a text, a stretch of a file, or a stream of pieces.
struct Response {
  /// The next piece of a stream: waits for it a moment at most (Limits::streamBeat), and answers an empty one when
  /// there is none yet. None ends the stream.
  using NextPiece = std::function<std::optional<std::string>()>;

  int status = 200;
  std::vector<std::pair<std::string, std::string>> fields;
  std::string body;
  std::optional<FileStretch> file = std::nullopt;
  NextPiece stream = nullptr;
};

/// A short text that explains a status.
Response plain(int status, std::string text);

/// "Not Found".
const char* reasonOf(int status);

}  // namespace quilt::scripting::http
