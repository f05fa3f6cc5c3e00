// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/FDYLogger.h"

#include <cmath>
#include <cstdio>
#include <mutex>
#include <utility>

namespace quilt::platform {

namespace {

constexpr std::string_view kMissingObject = "(null)";

struct Sinks {
  std::recursive_mutex mutex;  // recursive: a sink may log
  std::vector<std::shared_ptr<LogSink>> all;
};

// Never destroyed: objects with static lifetime may log while the process ends.
Sinks& sinks() {
  static Sinks& instance = *new Sinks;
  return instance;
}

std::string sixDecimals(double value) {
  const int length = std::snprintf(nullptr, 0, "%f", value);
  std::string text(static_cast<std::size_t>(length) + 1, '\0');
  std::snprintf(text.data(), text.size(), "%f", value);
  text.pop_back();
  // The host's locale may write a decimal comma; messages do not follow it.
  for (char& c : text)
    if (c == ',') c = '.';
  return text;
}

}  // namespace

LogArgument::LogArgument(const char* text) {
  if (text) _value = std::string(text);
}

LogArgument::LogArgument(const std::optional<std::string>& text) {
  if (text) _value = *text;
}

LogArgument::LogArgument(const std::filesystem::path& path) {
  if (!path.empty()) _value = path.native();
}

LogArgument::LogArgument(const std::optional<Url>& url) {
  if (url) _value = url->absoluteString();
}

std::string LogArgument::asObject() const {
  if (const auto* text = std::get_if<std::string>(&_value)) return *text;
  if (const auto* integer = std::get_if<std::int64_t>(&_value)) return std::to_string(*integer);
  if (const auto* real = std::get_if<double>(&_value)) {
    std::string text = sixDecimals(*real);
    if (text.find('.') != std::string::npos) {
      text.erase(text.find_last_not_of('0') + 1);
      if (text.back() == '.') text.pop_back();
    }
    return text;
  }
  return std::string(kMissingObject);
}

std::int64_t LogArgument::asInteger() const {
  if (const auto* integer = std::get_if<std::int64_t>(&_value)) return *integer;
  if (const auto* real = std::get_if<double>(&_value); real && std::abs(*real) < 9.2e18)
    return static_cast<std::int64_t>(*real);
  return 0;
}

double LogArgument::asReal() const {
  if (const auto* real = std::get_if<double>(&_value)) return *real;
  if (const auto* integer = std::get_if<std::int64_t>(&_value)) return static_cast<double>(*integer);
  return 0;
}

std::string formatMessage(std::string_view format, const std::vector<LogArgument>& arguments) {
  std::string out;
  std::size_t used = 0;
  const auto next = [&]() -> LogArgument { return used < arguments.size() ? arguments[used++] : std::nullopt; };
  while (!format.empty()) {
    if (format.starts_with("%@")) {
      out += next().asObject();
      format.remove_prefix(2);
    } else if (format.starts_with("%ld")) {
      out += std::to_string(next().asInteger());
      format.remove_prefix(3);
    } else if (format.starts_with("%lf")) {
      out += sixDecimals(next().asReal());
      format.remove_prefix(3);
    } else if (format.starts_with("%d")) {
      out += std::to_string(next().asInteger());
      format.remove_prefix(2);
    } else {
      if (format.starts_with("%%")) format.remove_prefix(1);
      out += format.front();
      format.remove_prefix(1);
    }
  }
  return out;
}

void FDYLogger::addSink(std::shared_ptr<LogSink> sink) {
  const std::lock_guard guard(sinks().mutex);
  sinks().all.push_back(std::move(sink));
}

void FDYLogger::removeSink(const std::shared_ptr<LogSink>& sink) {
  const std::lock_guard guard(sinks().mutex);
  std::erase(sinks().all, sink);
}

void FDYLogger::log(LogLevel level, std::string_view format, const std::vector<LogArgument>& arguments) {
  const std::lock_guard guard(sinks().mutex);
  if (sinks().all.empty()) return;
  const std::string message = formatMessage(format, arguments);
  const std::vector<std::shared_ptr<LogSink>> receivers = sinks().all;
  for (const auto& sink : receivers) sink->write(level, message);
}

}  // namespace quilt::platform
