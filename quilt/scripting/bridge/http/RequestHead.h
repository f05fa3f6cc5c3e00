// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quilt::scripting::http {

/// The request line and the fields of one HTTP/1 request.
struct RequestHead {
  std::string method;
  std::string target;      ///< as sent, percent signs and all; begins with "/"
  bool keepsOpen = false;  ///< the client wants to send another request on the connection
  std::vector<std::pair<std::string, std::string>> fields;  ///< names in lower case, values trimmed, in order

  [[nodiscard]] std::size_t count(std::string_view name) const;
  /// The value of a field that is there exactly once; none otherwise.
  [[nodiscard]] std::optional<std::string_view> only(std::string_view name) const;
  /// The target up to its first question mark.
  [[nodiscard]] std::string_view path() const;
  /// The value of a parameter after the question mark, as sent; none when it is not there.
  [[nodiscard]] std::optional<std::string_view> parameter(std::string_view name) const;
};

/// Reads a head, the empty line at its end included. None for anything that two readers could understand in two ways:
/// folded lines, lone line feeds, control characters, spaces before a colon, other versions than 1.0 and 1.1, targets
/// that are no path. Never throws; costs grow linearly.
std::optional<RequestHead> parseHead(std::string_view bytes);

/// The length of the body that follows: 0 without the field. None when the length cannot be told for certain: a
/// transfer coding, two lengths, or a length that is no number.
std::optional<std::size_t> bodyLengthOf(const RequestHead& head);

/// Text with its %XX taken apart; none when one is malformed.
std::optional<std::string> percentDecoded(std::string_view text);

}  // namespace quilt::scripting::http
