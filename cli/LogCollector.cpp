// SPDX-License-Identifier: Apache-2.0
#include "cli/LogCollector.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <system_error>

#include "cli/DiskTrouble.h"
#include "cli/Text.h"

namespace quilt::cli {

namespace {

// An operation over very many objects must not fill the memory with its log.
constexpr std::size_t kKept = 1000;

const char* nameOf(platform::LogLevel level) {
  switch (level) {
    case platform::LogLevel::Critical:
      return "critical";
    case platform::LogLevel::Warning:
      return "warning";
    case platform::LogLevel::Debug:
      return "debug";
  }
  return "";
}

constexpr std::string_view kCopyFailed = "Copy failed with error code (-";
constexpr std::string_view kCannotBeSized = "Source derivative at path \"";  // why a copy was not even begun

bool isFailure(const std::string& message) {
  return message.starts_with("Failed ") || message.starts_with(kCopyFailed) || message.starts_with(kCannotBeSized);
}

// The library ends a line with the error's own sentence in quotes: ... at path "/x": "The disk is full". Of a copy it
// logs the system's error number.
std::string sentenceOf(const std::string& message) {
  if (message.starts_with(kCopyFailed))
    return std::generic_category().message(std::atoi(message.c_str() + kCopyFailed.size()));
  const std::size_t begin = message.rfind(": \"");
  const std::size_t end = message.rfind('"');
  if (begin == std::string::npos || end < begin + 4) return message;
  return message.substr(begin + 3, end - begin - 3);
}

}  // namespace

void LogCollector::write(platform::LogLevel level, const std::string& message) {
  {
    const std::lock_guard guard(_mutex);
    if (_lines.size() >= kKept) _lines.erase(_lines.begin(), _lines.begin() + kKept / 2);
    _lines.push_back({level, message});
  }
  if (_printsAll) _messages.line(std::string(nameOf(level)) + ": " + escaped(message));
}

void LogCollector::beginOperation() {
  DiskTrouble::forget();
  const std::lock_guard guard(_mutex);
  _lines.clear();
}

std::string LogCollector::cause() const {
  const std::lock_guard guard(_mutex);
  auto first = _lines.rbegin();
  while (first != _lines.rend() && isFailure(first->message)) ++first;
  return first.base() == _lines.end() ? std::string() : sentenceOf(first.base()->message);
}

std::string LogCollector::warning(std::string_view beginning) const {
  const std::lock_guard guard(_mutex);
  const auto found = std::find_if(_lines.begin(), _lines.end(), [&](const Line& line) {
    return line.level == platform::LogLevel::Warning && line.message.starts_with(beginning);
  });
  return found == _lines.end() ? std::string() : found->message;
}

void LogCollector::know(const std::string& name, const std::string& original) {
  const std::lock_guard guard(_mutex);
  _originals[name] = original;
}

// A line names its file first, in quotes.
std::string LogCollector::asKnown(const std::string& message) const {
  const std::size_t begin = message.find('"') + 1;
  const std::size_t end = begin == 0 ? begin : message.find('"', begin);
  if (end == 0 || end == std::string::npos) return message;
  const auto original = _originals.find(std::filesystem::path(message.substr(begin, end - begin)).filename());
  return original == _originals.end() ? message : message.substr(0, begin) + original->second + message.substr(end);
}

void LogCollector::showWarnings() {
  if (_printsAll) return;
  std::vector<Line> lines;
  {
    const std::lock_guard guard(_mutex);
    lines.swap(_lines);
    for (Line& line : lines) line.message = asKnown(line.message);
  }
  for (const Line& line : lines)
    if (line.level == platform::LogLevel::Warning) _messages.warning(escaped(line.message));
}

}  // namespace quilt::cli
