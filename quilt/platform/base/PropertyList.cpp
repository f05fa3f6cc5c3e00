// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/PropertyList.h"

namespace quilt::platform {

namespace {

template <class T>
std::optional<T> copyOf(const PropertyList* value) {
  const T* typed = value ? value->as<T>() : nullptr;
  return typed ? std::optional<T>(*typed) : std::nullopt;
}

template <class T, class Value>
auto* pointerTo(Value* value) {
  return value ? value->template as<T>() : nullptr;
}

}  // namespace

Dictionary::Dictionary() = default;
Dictionary::Dictionary(std::initializer_list<Entry> entries) {
  for (const Entry& entry : entries) set(entry.first, entry.second);
}
Dictionary::~Dictionary() = default;
Dictionary::Dictionary(const Dictionary&) = default;
Dictionary::Dictionary(Dictionary&&) noexcept = default;
Dictionary& Dictionary::operator=(const Dictionary&) = default;
Dictionary& Dictionary::operator=(Dictionary&&) noexcept = default;

void Dictionary::set(std::string key, PropertyList value) {
  for (Entry& entry : _entries) {
    if (entry.first != key) continue;
    entry.second = std::move(value);
    return;
  }
  append(std::move(key), std::move(value));
}

PropertyList& Dictionary::append(std::string key, PropertyList value) {
  return _entries.emplace_back(std::move(key), std::move(value)).second;
}

PropertyList& Dictionary::append(std::string key) { return _entries.emplace_back(std::move(key), false).second; }

void Dictionary::reserve(std::size_t count) { _entries.reserve(count); }

void Dictionary::remove(std::string_view key) {
  std::erase_if(_entries, [key](const Entry& entry) { return entry.first == key; });
}

const PropertyList* Dictionary::find(std::string_view key) const {
  for (const Entry& entry : _entries)
    if (entry.first == key) return &entry.second;
  return nullptr;
}

PropertyList* Dictionary::find(std::string_view key) {
  return const_cast<PropertyList*>(std::as_const(*this).find(key));  // of an object that is not const
}

std::optional<std::string> Dictionary::string(std::string_view key) const { return copyOf<std::string>(find(key)); }
std::optional<Date> Dictionary::date(std::string_view key) const { return copyOf<Date>(find(key)); }
const Array* Dictionary::array(std::string_view key) const { return pointerTo<Array>(find(key)); }
const Dictionary* Dictionary::dictionary(std::string_view key) const { return pointerTo<Dictionary>(find(key)); }
Array* Dictionary::array(std::string_view key) { return pointerTo<Array>(find(key)); }
Dictionary* Dictionary::dictionary(std::string_view key) { return pointerTo<Dictionary>(find(key)); }

std::optional<std::string> Dictionary::takeString(std::string_view key) {
  auto* text = pointerTo<std::string>(find(key));
  return text ? std::optional(std::exchange(*text, {})) : std::nullopt;
}

std::optional<std::int64_t> Dictionary::integer(std::string_view key) const {
  const PropertyList* value = find(key);
  if (const auto* whole = pointerTo<std::int64_t>(value)) return *whole;
  const auto* real = pointerTo<double>(value);
  constexpr double limit = 9223372036854775808.0;  // 2^63, exact as a double
  if (real && *real >= -limit && *real < limit) return static_cast<std::int64_t>(*real);
  return std::nullopt;
}

std::optional<bool> Dictionary::boolean(std::string_view key) const {
  const PropertyList* value = find(key);
  if (const auto* whole = pointerTo<std::int64_t>(value)) return *whole != 0;
  if (const auto* real = pointerTo<double>(value)) return *real != 0;
  return copyOf<bool>(value);
}

std::optional<double> Dictionary::real(std::string_view key) const {
  const PropertyList* value = find(key);
  if (const auto* real = pointerTo<double>(value)) return *real;
  if (const auto* whole = pointerTo<std::int64_t>(value)) return static_cast<double>(*whole);
  return std::nullopt;
}

std::size_t Dictionary::size() const { return _entries.size(); }
Dictionary::const_iterator Dictionary::begin() const { return _entries.begin(); }
Dictionary::const_iterator Dictionary::end() const { return _entries.end(); }
bool Dictionary::operator==(const Dictionary& other) const { return _entries == other._entries; }

void appendAll(Dictionary& record, const Dictionary& rest) {
  for (const auto& [key, value] : rest) record.append(key, value);
}

}  // namespace quilt::platform
