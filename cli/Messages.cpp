// SPDX-License-Identifier: Apache-2.0
#include "cli/Messages.h"

#include <fmt/format.h>

namespace quilt::cli {

void Messages::error(const std::string& text) { print("error: ", "\x1b[31m", text); }

void Messages::warning(const std::string& text) {
  if (!_quiet) print("warning: ", "\x1b[33m", text);
}

void Messages::note(const std::string& text) {
  if (!_quiet) print("", "", text);
}

void Messages::line(const std::string& text) {
  withoutStatus([&] { std::fputs((text + "\n").c_str(), _stream); });
}

void Messages::print(const char* kind, const char* color, const std::string& text) {
  line(_color && *kind ? fmt::format("quilt: {}{}\x1b[0m{}", color, kind, text)
                       : fmt::format("quilt: {}{}", kind, text));
}

void Messages::setStatus(const std::string& text) {
  if (!_isTerminal) return;
  const std::lock_guard guard(_mutex);
  clear();
  _status = text;
  draw();
}

void Messages::withoutStatus(const std::function<void()>& block) {
  const std::lock_guard guard(_mutex);
  clear();
  block();
  draw();
}

void Messages::clear() {
  if (!_status.empty()) std::fputs("\r\x1b[K", _stream);
}

void Messages::draw() {
  if (!_status.empty()) std::fputs(_status.c_str(), _stream);
  std::fflush(_stream);
}

}  // namespace quilt::cli
