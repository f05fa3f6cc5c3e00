// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <concepts>
#include <cstdint>
#include <filesystem>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "quilt/platform/base/Error.h"
#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Url.h"

namespace quilt::platform {

/// How much a line matters, most first.
enum class LogLevel { Critical, Warning, Debug };

/// One argument of a message: an object's text (or a missing object), an integer or a real.
class QUILT_EXPORT LogArgument {
 public:
  /// @{
  /// Everything that a message may name: a text, a path, a URL or an error by its text, an integer, a real. Null and
  /// none, and an empty path, are a missing object.
  LogArgument(std::nullopt_t) {}                                     // NOLINT(google-explicit-constructor)
  LogArgument(const char* text);                                     // NOLINT(google-explicit-constructor)
  LogArgument(std::string text) : _value(std::move(text)) {}         // NOLINT(google-explicit-constructor)
  LogArgument(std::string_view text) : _value(std::string(text)) {}  // NOLINT(google-explicit-constructor)
  LogArgument(const std::optional<std::string>& text);               // NOLINT(google-explicit-constructor)
  LogArgument(const std::filesystem::path& path);                    // NOLINT(google-explicit-constructor)
  LogArgument(const Url& url) : _value(url.absoluteString()) {}      // NOLINT(google-explicit-constructor)
  LogArgument(const std::optional<Url>& url);                        // NOLINT(google-explicit-constructor)
  LogArgument(const Error& error) : _value(error.text) {}            // NOLINT(google-explicit-constructor)
  template <std::integral T>
  LogArgument(T value) : _value(static_cast<std::int64_t>(value)) {}  // NOLINT(google-explicit-constructor)
  template <std::floating_point T>
  LogArgument(T value) : _value(static_cast<double>(value)) {}  // NOLINT(google-explicit-constructor)
  /// @}

  /// Text as "%@" prints it; "(null)" for a missing object.
  [[nodiscard]] std::string asObject() const;
  /// @{
  /// The number as "%ld" and "%lf" print it: an integer is also a real, a real is cut to an integer; 0 for a text, a
  /// missing object and what is out of range.
  [[nodiscard]] std::int64_t asInteger() const;
  [[nodiscard]] double asReal() const;
  /// @}

 private:
  std::variant<std::monostate, std::string, std::int64_t, double> _value;
};

/// Fills in the placeholders "%@" (object), "%ld" and "%d" (integer), "%lf" (real, six decimals) and "%%" from left to
/// right. A placeholder without an argument prints "(null)" or 0; arguments left over are not printed.
QUILT_EXPORT std::string formatMessage(std::string_view format, const std::vector<LogArgument>& arguments);

/// Receives every line. Called on the thread that logs, one line at a time; must not wait for another thread.
class QUILT_EXPORT LogSink {
 public:
  virtual ~LogSink() = default;
  /// One line, formatted, without a line feed.
  virtual void write(LogLevel level, const std::string& message) = 0;
};

/// The shared logger. Every operation may be called on any thread.
class QUILT_EXPORT FDYLogger {
 public:
  FDYLogger() = delete;

  /// @{
  /// Formats the message as formatMessage() does and hands it to every sink, on this thread. Critical: an operation
  /// failed. Warning: something was refused, is missing or is left out. Debug: what happened, for developers.
  template <class... Arguments>
  static void logCritical(std::string_view format, const Arguments&... arguments) {
    log(LogLevel::Critical, format, {LogArgument(arguments)...});
  }
  template <class... Arguments>
  static void logWarning(std::string_view format, const Arguments&... arguments) {
    log(LogLevel::Warning, format, {LogArgument(arguments)...});
  }
  template <class... Arguments>
  static void logDebug(std::string_view format, const Arguments&... arguments) {
    log(LogLevel::Debug, format, {LogArgument(arguments)...});
  }
  /// @}

  /// @{
  /// Adds a sink until removeSink. Without a sink, lines go nowhere.
  static void addSink(std::shared_ptr<LogSink> sink);
  static void removeSink(const std::shared_ptr<LogSink>& sink);
  /// @}

 private:
  static void log(LogLevel level, std::string_view format, const std::vector<LogArgument>& arguments);
};

}  // namespace quilt::platform
