// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <utility>
#include <variant>

#include "quilt/platform/base/Error.h"

namespace quilt::platform {

/// A value or the error that prevented it, never both. Must be looked at.
///
///     Result<std::string> text = files.readFile(path, kMaximum);
///     if (!text) return text.error();
///     use(*text);
template <class T>
class [[nodiscard]] Result {
 public:
  /// Success with a value.
  Result(T value) : _content(std::in_place_index<0>, std::move(value)) {}  // NOLINT(google-explicit-constructor)
  /// Failure.
  Result(Error error) : _content(std::in_place_index<1>, std::move(error)) {}  // NOLINT(google-explicit-constructor)

  /// @{
  /// Whether it is a value.
  [[nodiscard]] bool hasValue() const { return _content.index() == 0; }
  explicit operator bool() const { return hasValue(); }
  /// @}

  /// @{
  /// The value; only when hasValue().
  T& operator*() & { return std::get<0>(_content); }
  const T& operator*() const& { return std::get<0>(_content); }
  T&& operator*() && { return std::get<0>(std::move(_content)); }
  T* operator->() { return &std::get<0>(_content); }
  const T* operator->() const { return &std::get<0>(_content); }
  /// @}

  /// The error; only when not hasValue().
  [[nodiscard]] const Error& error() const { return std::get<1>(_content); }

 private:
  std::variant<T, Error> _content;
};

/// Success or an error.
template <>
class [[nodiscard]] Result<void> {
 public:
  /// Success.
  Result() = default;
  /// Failure.
  Result(Error error) : _error(std::move(error)) {}  // NOLINT(google-explicit-constructor)

  /// @{
  /// Whether it is success.
  [[nodiscard]] bool hasValue() const { return !_error.has_value(); }
  explicit operator bool() const { return hasValue(); }
  /// @}
  /// The error; only when not hasValue().
  [[nodiscard]] const Error& error() const { return *_error; }

 private:
  std::optional<Error> _error;
};

}  // namespace quilt::platform
