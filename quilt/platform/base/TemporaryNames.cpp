// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/TemporaryNames.h"

#include <algorithm>
#include <random>

namespace quilt::platform {

namespace {

constexpr std::size_t kLongestName = 255;
constexpr std::string_view kSuffix = ".tmp";
constexpr std::string_view kLetters = "abcdefghijklmnopqrstuvwxyz234567";
constexpr std::size_t kLetterCount = 8;

std::string randomLetters() {
  std::random_device random;
  std::string text;
  for (std::size_t i = 0; i < kLetterCount; ++i) text += kLetters[random() % kLetters.size()];
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

bool isHiddenTemporaryName(std::string_view name) {
  if (!name.starts_with('.') || !name.ends_with(kSuffix)) return false;
  name.remove_suffix(kSuffix.size());
  if (name.size() < 1 + 1 + kLetterCount) return false;
  const std::string_view letters = name.substr(name.size() - kLetterCount);
  return name[name.size() - kLetterCount - 1] == '.' &&
         std::ranges::all_of(letters, [](char c) { return kLetters.find(c) != std::string_view::npos; });
}

}  // namespace quilt::platform
