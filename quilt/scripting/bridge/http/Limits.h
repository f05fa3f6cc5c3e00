// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <cstddef>

namespace quilt::scripting::http {

/// What no client can exceed. Times are absolute: dripping bytes gains nothing.
struct Limits {
  std::size_t connections = 64;
  std::size_t headBytes = std::size_t{16} << 10;
  std::size_t bodyBytes = std::size_t{1} << 20;
  std::size_t requestsPerConnection = 1000;
  std::chrono::milliseconds idle{5000};  ///< until the first byte of a request
  std::chrono::milliseconds head{5000};  ///< from the first byte to the end of the head
  std::chrono::milliseconds body{10000};
  std::chrono::milliseconds stall{30000};  ///< how long a client may read nothing of what it is sent
  std::chrono::milliseconds streamBeat{250};
};

}  // namespace quilt::scripting::http
