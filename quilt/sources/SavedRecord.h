// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "quilt/platform/interfaces/FileManager.h"
#include "quilt/sources/ConflictChoice.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt {

/// What two hands made of one record: what to take over from the other's file before one's own is written.
struct RecordMerge {
  /// An item of the merged "Media", in order.
  struct Item {
    std::string uuid;
    const Dictionary* theirs = nullptr;  ///< their record, which replaces ours or is new; null: ours stays
  };

  Dictionary theirs;                       ///< the entries to take over, without "Media"
  std::vector<std::string> removed;        ///< the keys that they took out
  std::optional<std::vector<Item>> media;  ///< none: ours stays as it is
  std::vector<std::string> conflicts;      ///< what both changed, in words; nothing may be written then

  /// Whether there is anything to take over.
  [[nodiscard]] bool takesOver() const { return !theirs.empty() || !removed.empty() || media; }
};

/// Which state of its file an object has read or written last, and enough of it to tell later which of two hands
/// changed what: a number for each entry, and for each item of "Media". What follows from the rest, as sizes and the
/// time of saving do, does not count. Any thread.
class SavedRecord {
 public:
  /// Before the file is read: a state that comes in between must count as new.
  static platform::FileIdentity identityOf(const Path& file);

  /// That the record was read or written, as the file is now.
  void note(const Dictionary& record, const platform::FileIdentity& identity);
  /// Whether anything was noted: who has never read nor written a record replaces what is there.
  [[nodiscard]] bool isKnown() const;
  /// The state of the file that was noted; that of nothing before.
  [[nodiscard]] platform::FileIdentity identity() const;

  /// That nothing is there yet.
  void noteNothing();

  /// Three ways: this is the common root, `mine` is to be written, `theirs` is in the file. An entry of `fallBacks`
  /// that the root does not have counts as missing from `mine`, too. The result refers to `theirs`.
  [[nodiscard]] RecordMerge merge(const Dictionary& mine, const Dictionary& theirs, ConflictChoice choice,
                                  const Dictionary& fallBacks = {}) const;

 private:
  using Print = std::uint64_t;
  struct Item {
    std::string uuid;
    Print content = 0;
  };
  struct Entry {
    std::string key;
    Print content = 0;
  };

  static Print printOf(const platform::PropertyList& value);
  static std::optional<std::vector<Item>> itemsOf(const Dictionary& record);
  [[nodiscard]] std::optional<Print> print(const std::string& key) const;
  void mergeEntry(const std::string& key, const Dictionary& mine, const Dictionary& theirs, ConflictChoice choice,
                  const Dictionary& fallBacks, RecordMerge& merged) const;
  void mergeMedia(const Dictionary& mine, const Dictionary& theirs, ConflictChoice choice, RecordMerge& merged) const;

  mutable std::mutex _mutex;  // nothing else is locked under it
  bool _isKnown = false;
  platform::FileIdentity _identity;
  std::vector<Entry> _entries;              // without "Media"
  Print _media = 0;                         // of all of "Media"; 0: there was none
  std::optional<std::vector<Item>> _items;  // of "Media"; none when one has no identity, or two have the same
};

}  // namespace quilt
