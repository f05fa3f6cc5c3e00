// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/TemporaryNames.h"

#include <algorithm>
#include <random>
#include <set>

namespace quilt::platform {

namespace {

constexpr std::size_t kLongestName = 255;
constexpr std::string_view kHalfSuffix = ".tmp";
constexpr std::string_view kAsideSuffix = ".old";
constexpr std::string_view kUnfinishedSuffix = ".new";
constexpr std::string_view kLetters = "abcdefghijklmnopqrstuvwxyz234567";
constexpr std::size_t kLetterCount = 8;
constexpr std::size_t kUuidLength = 36;

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

std::string nameBeside(std::string_view name, std::string_view suffix) {
  const std::string ending = "." + randomLetters() + std::string(suffix);
  return "." + std::string(shortened(name, kLongestName - 1 - ending.size())) + ending;
}

bool isUuid(std::string_view text) {
  if (text.size() != kUuidLength) return false;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char c = text[i];
    const bool isDash = i == 8 || i == 13 || i == 18 || i == 23;
    const bool isHex = (c >= '0' && c <= '9') || (c >= 'A' && c <= 'F') || (c >= 'a' && c <= 'f');
    if (isDash ? c != '-' : !isHex) return false;
  }
  return true;
}

bool isWord(std::string_view text) {
  return !text.empty() && std::ranges::all_of(text, [](char c) {
    return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
  });
}

// ".UUID.EXTENSION" with an extension of plain words.
bool isUuidWithExtension(std::string_view name) {
  if (name.size() < 1 + kUuidLength + 2 || !isUuid(name.substr(1, kUuidLength)) || name[1 + kUuidLength] != '.')
    return false;
  const std::string_view extension = name.substr(1 + kUuidLength + 1);
  return extension == "qpk.zip" || isWord(extension);
}

// ".NAME.UUID", also with the ending that an archive in the making has.
bool endsWithUuid(std::string_view name) {
  constexpr std::size_t kArchiveEnding = 1 + 6;
  const auto ends = [](std::string_view text) {
    return text.size() > 1 + 1 + kUuidLength && text[text.size() - kUuidLength - 1] == '.' &&
           isUuid(text.substr(text.size() - kUuidLength));
  };
  if (ends(name)) return true;
  if (name.size() <= kArchiveEnding || name[name.size() - kArchiveEnding] != '.') return false;
  return isWord(name.substr(name.size() - kArchiveEnding + 1)) && ends(name.substr(0, name.size() - kArchiveEnding));
}

}  // namespace

std::string hiddenNameBeside(std::string_view name) { return nameBeside(name, kHalfSuffix); }

std::string asideNameBeside(std::string_view name) { return nameBeside(name, kAsideSuffix); }

std::string unfinishedNameBeside(std::string_view name) { return nameBeside(name, kUnfinishedSuffix); }

HiddenName hiddenNameFrom(std::string_view name) {
  if (!name.starts_with('.')) return {};
  for (const auto& [suffix, kind] :
       {std::pair(kHalfSuffix, HiddenKind::Half), std::pair(kAsideSuffix, HiddenKind::Aside),
        std::pair(kUnfinishedSuffix, HiddenKind::Unfinished)}) {
    if (!name.ends_with(suffix)) continue;
    const std::string_view rest = name.substr(0, name.size() - suffix.size());
    if (rest.size() < 1 + 1 + kLetterCount || rest[rest.size() - kLetterCount - 1] != '.') continue;
    const std::string_view letters = rest.substr(rest.size() - kLetterCount);
    if (!std::ranges::all_of(letters, [](char c) { return kLetters.find(c) != std::string_view::npos; })) continue;
    return {kind, rest.substr(1, rest.size() - 1 - 1 - kLetterCount)};
  }
  if (isUuidWithExtension(name) || endsWithUuid(name)) return {HiddenKind::Half, {}};
  return {};
}

bool isHiddenTemporaryName(std::string_view name) { return hiddenNameFrom(name).kind != HiddenKind::None; }

std::vector<std::string> finishedNames(const std::vector<std::string>& listing) {
  std::set<std::string_view> unfinished;
  for (const std::string& name : listing)
    if (const HiddenName hidden = hiddenNameFrom(name); hidden.kind == HiddenKind::Unfinished)
      unfinished.insert(hidden.of);
  std::vector<std::string> finished;
  for (const std::string& name : listing)
    if (!name.starts_with('.') && !unfinished.contains(name)) finished.push_back(name);
  return finished;
}

}  // namespace quilt::platform
