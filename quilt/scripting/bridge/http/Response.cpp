// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/http/Response.h"

namespace quilt::scripting::http {

Response plain(int status, std::string text) {
  return {status, {{"Content-Type", "text/plain; charset=utf-8"}, {"Cache-Control", "no-store"}}, std::move(text)};
}

const char* reasonOf(int status) {
  struct Row {
    int status;
    const char* reason;
  };
  constexpr Row kRows[] = {{200, "OK"},
                           {206, "Partial Content"},
                           {302, "Found"},
                           {304, "Not Modified"},
                           {400, "Bad Request"},
                           {401, "Unauthorized"},
                           {403, "Forbidden"},
                           {404, "Not Found"},
                           {405, "Method Not Allowed"},
                           {408, "Request Timeout"},
                           {409, "Conflict"},
                           {411, "Length Required"},
                           {413, "Content Too Large"},
                           {415, "Unsupported Media Type"},
                           {416, "Range Not Satisfiable"},
                           {429, "Too Many Requests"},
                           {431, "Request Header Fields Too Large"},
                           {500, "Internal Server Error"},
                           {503, "Service Unavailable"},
                           {504, "Gateway Timeout"}};
  for (const Row& row : kRows)
    if (row.status == status) return row.reason;
  return "Unknown";
}

}  // namespace quilt::scripting::http
