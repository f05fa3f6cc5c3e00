// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <algorithm>
#include <cstdint>
#include <iterator>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "quilt/platform/base/Date.h"
#include "quilt/platform/base/Export.h"

namespace quilt::platform {

class PropertyList;

/// A property list's array.
using Array = std::vector<PropertyList>;
/// A property list's bytes.
using Data = std::vector<std::uint8_t>;

/// A property-list dictionary that keeps its keys in the order in which they were first set.
/// Look-up is linear: records have a dozen keys.
class QUILT_EXPORT Dictionary {
 public:
  /// @{
  /// A key, UTF-8, with its value; and the walk over them in order.
  using Entry = std::pair<std::string, PropertyList>;
  using const_iterator = std::vector<Entry>::const_iterator;
  /// @}

  /// No keys.
  Dictionary();
  /// The entries in this order. The caller names each key once.
  Dictionary(std::initializer_list<Entry> entries);
  ~Dictionary();
  /// @{
  /// Values: a copy shares nothing, what was moved from is empty.
  Dictionary(const Dictionary&);
  Dictionary(Dictionary&&) noexcept;
  Dictionary& operator=(const Dictionary&);
  Dictionary& operator=(Dictionary&&) noexcept;
  /// @}

  /// Replaces the value of a key in its place, or appends the key.
  void set(std::string key, PropertyList value);
  /// Appends without looking for the key; the caller knows that it is not there. The value in its place, valid until
  /// the dictionary changes.
  PropertyList& append(std::string key, PropertyList value);
  PropertyList& append(std::string key);  ///< likewise, with false, for the value to be filled in its place
  /// Makes room for this many keys in all.
  void reserve(std::size_t count);
  /// Removes the key with its value, if it is there.
  void remove(std::string_view key);

  /// @{
  /// The value of a key, or null. Valid until the dictionary changes.
  [[nodiscard]] const PropertyList* find(std::string_view key) const;
  [[nodiscard]] PropertyList* find(std::string_view key);
  /// @}
  /// Whether the key is there, with a value of any kind.
  [[nodiscard]] bool contains(std::string_view key) const { return find(key) != nullptr; }

  /// @{
  /// The value of a key when it is there and of the wanted kind; otherwise none or null.
  /// A real answers as an integer too, cut toward zero, when it is in range; a whole number answers as a real, and
  /// either as a boolean: true unless it is 0.
  [[nodiscard]] std::optional<std::string> string(std::string_view key) const;
  [[nodiscard]] std::optional<std::int64_t> integer(std::string_view key) const;
  [[nodiscard]] std::optional<double> real(std::string_view key) const;
  [[nodiscard]] std::optional<bool> boolean(std::string_view key) const;
  [[nodiscard]] std::optional<Date> date(std::string_view key) const;
  [[nodiscard]] const Array* array(std::string_view key) const;
  [[nodiscard]] Array* array(std::string_view key);
  [[nodiscard]] const Dictionary* dictionary(std::string_view key) const;
  [[nodiscard]] Dictionary* dictionary(std::string_view key);
  /// @}
  /// string(), moved out: the value that stays is empty.
  [[nodiscard]] std::optional<std::string> takeString(std::string_view key);

  /// @{
  /// How many keys there are.
  [[nodiscard]] std::size_t size() const;
  [[nodiscard]] bool empty() const { return size() == 0; }
  /// @}
  /// @{
  /// Walks the entries in order. Valid until the dictionary changes.
  [[nodiscard]] const_iterator begin() const;
  [[nodiscard]] const_iterator end() const;
  /// @}

  /// Equal when both hold the same keys in the same order with equal values.
  bool operator==(const Dictionary& other) const;

 private:
  std::vector<Entry> _entries;
};

/// One value of a property list. Booleans, whole numbers and reals are kinds of their own, and stay what they are
/// through a file.
class QUILT_EXPORT PropertyList {
 public:
  /// Every kind there is.
  using Value = std::variant<bool, std::int64_t, double, std::string, Date, Data, Array, Dictionary>;

  /// @{
  /// A value of the kind that its type tells.
  PropertyList(bool value) : _value(value) {}                      // NOLINT(google-explicit-constructor)
  PropertyList(int value) : _value(std::int64_t{value}) {}         // NOLINT(google-explicit-constructor)
  PropertyList(std::int64_t value) : _value(value) {}              // NOLINT(google-explicit-constructor)
  PropertyList(double value) : _value(value) {}                    // NOLINT(google-explicit-constructor)
  PropertyList(const char* value) : _value(std::string(value)) {}  // NOLINT(google-explicit-constructor)
  PropertyList(std::string value) : _value(std::move(value)) {}    // NOLINT(google-explicit-constructor)
  PropertyList(Date value) : _value(value) {}                      // NOLINT(google-explicit-constructor)
  PropertyList(Data value) : _value(std::move(value)) {}           // NOLINT(google-explicit-constructor)
  PropertyList(Array value) : _value(std::move(value)) {}          // NOLINT(google-explicit-constructor)
  PropertyList(Dictionary value) : _value(std::move(value)) {}     // NOLINT(google-explicit-constructor)
  /// @}

  /// @{
  /// The value as a kind, or null when it is of another.
  template <class T>
  [[nodiscard]] const T* as() const {
    return std::get_if<T>(&_value);
  }
  template <class T>
  [[nodiscard]] T* as() {
    return std::get_if<T>(&_value);
  }
  /// @}

  /// Makes it an empty value of a kind, to be filled where it is.
  template <class T>
  T& become() {
    return _value.emplace<T>();
  }

  /// The value, to be visited.
  [[nodiscard]] const Value& value() const { return _value; }

  /// Equal when of one kind and equal in it: 1 is neither 1.0 nor true.
  bool operator==(const PropertyList&) const = default;

 private:
  Value _value;
};

/// Appends every entry of `rest` to `record`.
QUILT_EXPORT void appendAll(Dictionary& record, const Dictionary& rest);

}  // namespace quilt::platform
