// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <cstddef>

namespace quilt::scripting::http {

/// What no client can exceed. Times are absolute: dripping bytes gains nothing.
struct Limits {
  std::size_t connections = 64;                   ///< at once
  std::size_t headBytes = std::size_t{16} << 10;  ///< the request line with its fields
  std::size_t bodyBytes = std::size_t{1} << 20;   ///< of a request
  std::size_t requestsPerConnection = 1000;       ///< then the connection ends
  std::chrono::milliseconds idle{5000};           ///< until the first byte of a request
  std::chrono::milliseconds head{5000};           ///< from the first byte to the end of the head
  std::chrono::milliseconds body{10000};          ///< from the end of the head to the end of the body
  std::chrono::milliseconds stall{30000};         ///< how long a client may read nothing of what it is sent
  std::chrono::milliseconds streamBeat{250};      ///< how long a stream waits for its next piece at a time
};

}  // namespace quilt::scripting::http
