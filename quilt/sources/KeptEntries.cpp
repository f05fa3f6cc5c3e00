// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/KeptEntries.h"

#include <algorithm>
#include <cctype>
#include <utility>

namespace quilt {

using platform::PropertyList;

namespace {

thread_local std::size_t onlyUsable = 0;

bool fits(const Dictionary& record, std::string_view key, RecordKind kind) {
  switch (kind) {
    case RecordKind::Text:
      return record.find(key)->as<std::string>() != nullptr;
    case RecordKind::Integer:
      return record.integer(key).has_value();
    case RecordKind::Real:
      return record.real(key).has_value();
    case RecordKind::Boolean:
      return record.boolean(key).has_value();
    case RecordKind::Date:
      return record.date(key).has_value();
    case RecordKind::List:
      return record.array(key) != nullptr;
    case RecordKind::Record:
      return record.dictionary(key) != nullptr;
    case RecordKind::Told:
      return true;
  }
  return true;
}

bool isKeyOf(std::string_view key, std::string_view property) {
  if (key.size() != property.size() && (key.size() != property.size() + 4 || !key.ends_with("Path"))) return false;
  return std::equal(property.begin(), property.end(), key.begin(),
                    [](unsigned char one, unsigned char other) { return std::tolower(one) == std::tolower(other); });
}

bool isContainer(const PropertyList& value) { return value.as<Array>() || value.as<Dictionary>(); }

template <class Test>
void removeWhere(Dictionary& entries, const Test& test) {
  std::vector<std::string> keys;
  for (const auto& [key, value] : entries)
    if (test(key)) keys.push_back(key);
  for (const std::string& key : keys) entries.remove(key);
}

void insertInto(Dictionary& record, const UnusedEntries::Element& element) {
  Array* list = record.array(element.key);
  if (!list) list = record.append(element.key, Array()).as<Array>();
  list->insert(list->begin() + static_cast<std::ptrdiff_t>(std::min(element.place, list->size())), element.value);
}

}  // namespace

// ---- What a loader leaves

void UnusedEntries::keep(std::string key, PropertyList value) { unusable.set(std::move(key), std::move(value)); }

void UnusedEntries::keepElement(std::string key, std::size_t place, PropertyList value) {
  elements.push_back({std::move(key), place, std::move(value)});
}

void UnusedEntries::keepRest(std::span<const RecordKey> keys, const Dictionary& record) {
  for (const auto& [key, value] : record) {
    const auto known =
        std::find_if(keys.begin(), keys.end(), [&key = key](const RecordKey& one) { return one.name == key; });
    if (known == keys.end()) {
      unknown.append(key, value);
    } else if (!fits(record, key, known->kind)) {
      unusable.set(key, value);
    }
  }
}

// ---- What an object keeps

void KeptEntries::take(UnusedEntries unused) {
  const std::lock_guard guard(_mutex);
  _unused = std::move(unused);
  _isEmpty = _unused.unknown.empty() && _unused.unusable.empty() && _unused.elements.empty();
}

void KeptEntries::copyFrom(const KeptEntries& other) {
  UnusedEntries entries;
  {
    const std::lock_guard guard(other._mutex);
    entries = other._unused;
  }
  take(std::move(entries));
}

void KeptEntries::forget(std::string_view property) {
  if (_isEmpty) return;
  const std::lock_guard guard(_mutex);
  removeWhere(_unused.unusable, [property](const std::string& key) { return isKeyOf(key, property); });
  std::erase_if(_unused.elements, [property](const auto& element) { return isKeyOf(element.key, property); });
}

bool KeptEntries::holds(std::string_view key) const {
  if (_isEmpty) return false;
  const std::lock_guard guard(_mutex);
  return _unused.unusable.contains(key);
}

void KeptEntries::writeInto(Dictionary& record) const {
  if (_isEmpty) return;
  const std::lock_guard guard(_mutex);
  platform::appendAll(record, _unused.unknown);
  if (onlyUsable > 0) return;
  removeWhere(_unused.unusable, [&record](const std::string& key) {
    const PropertyList* live = record.find(key);
    return live && isContainer(*live);
  });
  for (const auto& [key, value] : _unused.unusable) record.set(key, value);
  for (const auto& element : _unused.elements) insertInto(record, element);
}

OnlyUsableEntries::OnlyUsableEntries() { ++onlyUsable; }
OnlyUsableEntries::~OnlyUsableEntries() { --onlyUsable; }

}  // namespace quilt
