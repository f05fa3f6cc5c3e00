// SPDX-License-Identifier: Apache-2.0
#include "cli/Output.h"

#include <cerrno>
#include <cstring>

#include "cli/Text.h"

namespace quilt::cli {

namespace {

constexpr int kSchema = 1;

}  // namespace

void Output::beginList() { _result = Json::array(); }

void Output::item(Json object, const std::string& lines) {
  if (_json) {
    if (!_result.is_array()) beginList();
    _result.push_back(std::move(object));
  } else {
    print(lines);
  }
}

void Output::object(Json object, const std::string& lines) {
  if (_json) {
    _result = std::move(object);
  } else {
    print(lines);
  }
}

void Output::publish() {
  if (_json) printDocument(std::nullopt);
  _isPublished = true;
}

std::string Output::shown(const std::filesystem::path& path) const {
  return _isTerminal ? escaped(path.native()) : path.native();
}

std::string Output::styled(const char* style, const std::string& text) const {
  return _color && !text.empty() ? style + text + "\x1b[0m" : text;
}

void Output::print(const std::string& text) {
  if (text.empty()) return;
  _messages.withoutStatus([&] {
    errno = 0;
    const bool written = std::fputs((text + "\n").c_str(), _stream) >= 0 && std::fflush(_stream) == 0;
    if (!written && _writeError == 0) _writeError = errno != 0 ? errno : EIO;
  });
}

void Output::printDocument(const std::optional<Failure>& failure) {
  Json document{{"schema", kSchema}, {"ok", !failure}};
  if (failure) document["error"] = failure->toJson();
  document["result"] = _result;
  print(document.dump(2, ' ', false, Json::error_handler_t::replace));
}

ExitCode Output::finish(const std::optional<Failure>& failure) {
  if (_json && !_isPublished) printDocument(failure);
  if (failure) {
    for (const Failure& cause : failure->causes) _messages.error(cause.message);
    if (!failure->message.empty()) _messages.error(failure->message);
  }
  if (failure) return failure->code;
  if (_writeError == 0) return ExitCode::Done;
  // A reader that went away (head, less) is no news to anyone.
  if (_writeError != EPIPE)
    _messages.error(std::string("The results could not be written: ") + std::strerror(_writeError));
  return ExitCode::InputOutput;
}

}  // namespace quilt::cli
