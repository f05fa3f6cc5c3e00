// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <functional>

#include "quilt/scripting/bridge/http/Server.h"

namespace quilt::scripting::http {

/// Serves the files below one folder: whole, in part, or "not modified". No listing, no hidden names, no links.
struct FileRoom {
  std::filesystem::path folder;
  /// Changes a page on its way out; pages are the files named "index.html" in the folder itself.
  std::function<std::string(std::string page)> preparePage = nullptr;
};

/// Answers a GET or HEAD for the file at `path`, which is below the room's folder, as sent (with percent signs) and
/// without a "/" at its front; empty means "index.html". 404 for whatever is no plain file reached without links.
Response answerFile(const FileRoom& room, std::string_view path, const RequestHead& head);

/// What a Range field asks of a file: nothing to be heeded, bytes from `first` to `last`, or what cannot be given (also
/// several ranges, which players do not ask for).
struct ByteRange {
  enum class Kind { Whole, Part, Refused };
  Kind kind = Kind::Whole;
  std::uint64_t first = 0;
  std::uint64_t last = 0;
  bool operator==(const ByteRange&) const = default;
};
ByteRange parseRange(std::string_view field, std::uint64_t size);

/// "text/html; charset=utf-8", by the name's extension; "application/octet-stream" for one that is not known.
std::string mimeTypeOf(const std::filesystem::path& file);

}  // namespace quilt::scripting::http
