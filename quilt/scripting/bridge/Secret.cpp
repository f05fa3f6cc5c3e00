// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/Secret.h"

#include <sys/random.h>

#include <array>
#include <cerrno>
#include <system_error>

namespace quilt::scripting {

std::string makeSecret() {
  std::array<unsigned char, 16> bytes{};
  while (getrandom(bytes.data(), bytes.size(), 0) != static_cast<ssize_t>(bytes.size()))
    if (errno != EINTR) throw std::system_error(errno, std::generic_category(), "no random numbers");
  std::string text;
  for (const unsigned char byte : bytes) {
    constexpr char kDigits[] = "0123456789abcdef";
    text += kDigits[byte >> 4];
    text += kDigits[byte & 15];
  }
  return text;
}

bool isSameSecret(std::string_view given, std::string_view secret) {
  if (given.size() != secret.size()) return false;
  volatile unsigned char difference = 0;
  for (std::size_t i = 0; i < secret.size(); ++i)
    difference = static_cast<unsigned char>(difference | (given[i] ^ secret[i]));
  return difference == 0;
}

}  // namespace quilt::scripting
