// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <mutex>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "quilt/platform/base/Export.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt {

/// Which values a loader takes under a key.
enum class RecordKind {
  Text,
  Integer,
  Real,
  Boolean,
  Date,
  List,
  Record,
  Told  ///< any, and none is kept: written for other readers, or an object's identity, which it always has
};

/// A key of a record and what it holds.
struct RecordKey {
  std::string_view name;  ///< a literal: kept by reference
  RecordKind kind;        ///< of its value
};

/// What a loader leaves of a record while it reads it, on one thread.
struct QUILT_EXPORT UnusedEntries {
  /// An element of a list that yields nothing, with its place among all that the list held.
  struct Element {
    std::string key;               ///< of the list
    std::size_t place = 0;         ///< from 0
    platform::PropertyList value;  ///< as it stood
  };

  /// Keeps the value of a key of ours that could not be used although it is of the right kind.
  void keep(std::string key, platform::PropertyList value);
  /// Keeps an element of a list.
  void keepElement(std::string key, std::size_t place, platform::PropertyList value);
  /// Keeps, of what is left in the record, the keys that are not among `keys` and the values of a wrong kind.
  void keepRest(std::span<const RecordKey> keys, const Dictionary& record);

  Dictionary unknown;             ///< under keys of a newer version
  Dictionary unusable;            ///< under keys of ours
  std::vector<Element> elements;  ///< by rising place within each list
};

/// What no loader could use of an object's record: it stays with the object and is written back as it stood, until
/// someone gives the object a value in its place. So a theme that is away for a while, an item that an attacker or a
/// newer version wrote, and a number where a text belongs outlive every save. Any thread may call it.
class QUILT_EXPORT KeptEntries {
 public:
  /// Takes what was left, in place of everything kept so far.
  void take(UnusedEntries unused);
  /// A second object's entries, in place of everything kept so far.
  void copyFrom(const KeptEntries& other);
  /// Gives up what stands under a key, and what was kept of its list. A property that is set names its key in another
  /// case, or without the "Path" at its end.
  void forget(std::string_view property);
  /// Whether a value of a wrong kind stands under the key.
  [[nodiscard]] bool holds(std::string_view key) const;
  /// Writes everything back into the object's fresh record: elements in their places, or at the end of a list that has
  /// become shorter. A list or record that the object has by now takes the place of what was kept, for good.
  void writeInto(Dictionary& record) const;

 private:
  mutable std::mutex _mutex;
  mutable UnusedEntries _unused;
  std::atomic<bool> _isEmpty{true};  // most objects keep nothing, and each set of a property asks
};

/// While one lives, records that are built on this thread hold only what the model uses and keys of newer versions: for
/// readers who would take the rest at its word.
class QUILT_EXPORT OnlyUsableEntries {
 public:
  OnlyUsableEntries();
  OnlyUsableEntries(const OnlyUsableEntries&) = delete;
  OnlyUsableEntries& operator=(const OnlyUsableEntries&) = delete;
  ~OnlyUsableEntries();
};

/// Hands each dictionary of a list to `read`, which empties it and answers true, or leaves it as it is and answers
/// false. What yields nothing is kept.
template <class Read>
void readList(Dictionary& record, const char* key, UnusedEntries& unused, const Read& read) {
  Array* elements = record.array(key);
  if (!elements) return;
  std::size_t place = 0;
  for (auto& element : *elements) {
    auto* entry = element.as<Dictionary>();
    if (!entry || !read(*entry)) unused.keepElement(key, place, std::move(element));
    ++place;
  }
}

}  // namespace quilt
