// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/files/TemporaryItem.h"

#include <sys/random.h>

#include <array>
#include <cerrno>
#include <utility>

#include "quilt/platform/files/Folders.h"

namespace quilt::platform {

namespace {

constexpr std::size_t kLongestName = 255;
constexpr std::string_view kSuffix = ".tmp";

std::string randomLetters() {
  constexpr std::string_view letters = "abcdefghijklmnopqrstuvwxyz234567";
  std::array<unsigned char, 8> bytes{};
  // Without randomness (EAGAIN early at boot) the names repeat, which create() survives.
  if (::getrandom(bytes.data(), bytes.size(), 0) < 0) bytes.fill(static_cast<unsigned char>(errno));
  std::string text;
  for (const unsigned char byte : bytes) text += letters[byte % letters.size()];
  return text;
}

// At most `size` bytes of the text, ending between characters: some file systems refuse names that are not UTF-8.
std::string_view shortened(std::string_view text, std::size_t size) {
  if (text.size() <= size) return text;
  const auto continues = [](char c) { return (static_cast<unsigned char>(c) & 0xC0) == 0x80; };
  while (size > 0 && continues(text[size])) --size;
  return text.substr(0, size);
}

}  // namespace

std::string hiddenNameBeside(std::string_view name) {
  const std::string ending = "." + randomLetters() + std::string(kSuffix);
  return "." + std::string(shortened(name, kLongestName - 1 - ending.size())) + ending;
}

TemporaryItem::TemporaryItem(SystemCalls& system, int folder, std::string finalName)
    : _system(system), _folder(folder), _finalName(std::move(finalName)) {}

TemporaryItem::~TemporaryItem() {
  bool changed = false;
  if (_exists) removeTree(_system, _folder, _name, changed);
}

int TemporaryItem::create(const std::function<int(const std::string&)>& make) {
  int error = EEXIST;
  for (int attempt = 0; error == EEXIST && attempt < 100; ++attempt) {
    _name = hiddenNameBeside(_finalName);
    error = make(_name);
  }
  _exists = error != EEXIST;  // what failed half-way is removed too
  return error;
}

int TemporaryItem::replace() {
  if (_system.renameAt(_folder, _name.c_str(), _folder, _finalName.c_str(), 0) != 0) return errno;
  _exists = false;
  return 0;
}

int TemporaryItem::putIfFree() {
  const int error = renameIfFree(_system, _folder, _name, _folder, _finalName);
  if (error == 0) _exists = false;
  return error;
}

}  // namespace quilt::platform
