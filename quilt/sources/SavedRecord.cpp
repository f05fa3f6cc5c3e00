// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/SavedRecord.h"

#include <algorithm>
#include <functional>
#include <set>
#include <string_view>
#include <type_traits>

#include "quilt/platform/interfaces/Services.h"

namespace quilt {

using platform::PropertyList;

namespace {

constexpr const char* kMedia = "Media";
constexpr const char* kIdentity = "UUID";

/// What is worked out anew at every save, at any depth of a record.
constexpr std::string_view kDerived[] = {
    "Version",         "ModifiedDate",     "DocumentDuration",  "IsFlattened", "TotalSizeInMegaBytes",
    "PosterImagePath", "PosterImageWidth", "PosterImageHeight", "Width",       "Height",
    "Duration",        "RelativePath",     "SampleFilename",    "SampleURL"};

bool isDerived(std::string_view key) {
  return std::find(std::begin(kDerived), std::end(kDerived), key) != std::end(kDerived);
}

std::uint64_t stirred(std::uint64_t value) {
  value = (value ^ (value >> 30U)) * 0xbf58476d1ce4e5b9;
  value = (value ^ (value >> 27U)) * 0x94d049bb133111eb;
  return value ^ (value >> 31U);
}

template <class T>
std::uint64_t hashOf(const T& value) {
  return stirred(std::hash<T>()(value));
}

template <class Items>
auto findItem(Items& items, const std::string& uuid) {
  return std::find_if(items.begin(), items.end(), [&uuid](const auto& item) { return item.uuid == uuid; });
}

template <class Items>
std::vector<std::string> orderOf(const Items& items, const std::set<std::string>& among) {
  std::vector<std::string> order;
  for (const auto& item : items)
    if (among.contains(item.uuid)) order.push_back(item.uuid);
  return order;
}

}  // namespace

platform::FileIdentity SavedRecord::identityOf(const Path& file) {
  return platform::services().files->stateOfFileAtPath(file);
}
}

// The order of keys says nothing; that of a list does.
SavedRecord::Print SavedRecord::printOf(const PropertyList& value) {
  return std::visit(
      [](const auto& content) -> Print {
        using Kind = std::decay_t<decltype(content)>;
        if constexpr (std::is_same_v<Kind, Dictionary>) {
          Print sum = 1;
          for (const auto& [key, entry] : content)
            if (!isDerived(key)) sum += stirred(hashOf(key) ^ (printOf(entry) * 3));
          return stirred(sum);
        } else if constexpr (std::is_same_v<Kind, Array>) {
          Print all = 2;
          for (const PropertyList& element : content) all = stirred(all * 31 + printOf(element));
          return all;
        } else if constexpr (std::is_same_v<Kind, Date>) {  // as files tell it
          return stirred(
              static_cast<Print>(std::chrono::floor<std::chrono::seconds>(content).time_since_epoch().count()));
        } else if constexpr (std::is_same_v<Kind, platform::Data>) {
          return hashOf(std::string_view(reinterpret_cast<const char*>(content.data()), content.size()));
        } else if constexpr (std::is_same_v<Kind, std::string>) {
          return hashOf(std::string_view(content));
        } else {
          return hashOf(content) + 4;
        }
      },
      value.value());
}

std::optional<std::vector<SavedRecord::Item>> SavedRecord::itemsOf(const Dictionary& record) {
  std::vector<Item> items;
  if (!record.contains(kMedia)) return items;
  const Array* media = record.array(kMedia);
  if (!media) return std::nullopt;
  std::set<std::string> known;
  for (const PropertyList& element : *media) {
    const auto* item = element.as<Dictionary>();
    const auto uuid = item ? item->string(kIdentity) : std::nullopt;
    if (!uuid || !known.insert(*uuid).second) return std::nullopt;
    items.push_back({*uuid, printOf(element)});
  }
  return items;
}

void SavedRecord::note(const Dictionary& record, const platform::FileIdentity& identity) {
  const std::lock_guard guard(_mutex);
  _isKnown = true;
  _identity = identity;
  _entries.clear();
  _media = 0;
  for (const auto& [key, value] : record) {
    if (key == kMedia) {
      _media = printOf(value);
    } else if (!isDerived(key)) {
      _entries.push_back({key, printOf(value)});
    }
  }
  _items = itemsOf(record);
}

void SavedRecord::noteNothing() { note({}, {}); }

bool SavedRecord::isKnown() const {
  const std::lock_guard guard(_mutex);
  return _isKnown;
}

platform::FileIdentity SavedRecord::identity() const {
  const std::lock_guard guard(_mutex);
  return _identity;
}

std::optional<SavedRecord::Print> SavedRecord::print(const std::string& key) const {
  const auto found =
      std::find_if(_entries.begin(), _entries.end(), [&key](const Entry& entry) { return entry.key == key; });
  return found == _entries.end() ? std::nullopt : std::optional(found->content);
}

RecordMerge SavedRecord::merge(const Dictionary& mine, const Dictionary& theirs, ConflictChoice choice,
                               const Dictionary& fallBacks) const {
  const std::lock_guard guard(_mutex);
  RecordMerge merged;
  std::set<std::string> keys;
  for (const auto& [key, value] : mine) keys.insert(key);
  for (const auto& [key, value] : theirs) keys.insert(key);
  for (const std::string& key : keys)
    if (key != kMedia && !isDerived(key)) mergeEntry(key, mine, theirs, choice, fallBacks, merged);
  mergeMedia(mine, theirs, choice, merged);
  return merged;
}

void SavedRecord::mergeEntry(const std::string& key, const Dictionary& mine, const Dictionary& theirs,
                             ConflictChoice choice, const Dictionary& fallBacks, RecordMerge& merged) const {
  const auto printIn = [&key](const Dictionary& record) -> std::optional<Print> {
    const PropertyList* value = record.find(key);
    return value ? std::optional(printOf(*value)) : std::nullopt;
  };
  const auto their = printIn(theirs);
  const auto base = print(key);
  auto my = printIn(mine);
  if (!base && my == printIn(fallBacks)) my = base;
  if (their == my || their == base) return;
  if (my != base && choice == ConflictChoice::Refuse) merged.conflicts.push_back("\"" + key + "\"");
  if (my != base && choice != ConflictChoice::KeepTheirs) return;
  if (their) {
    merged.theirs.append(key, *theirs.find(key));
  } else {
    merged.removed.push_back(key);
  }
}

void SavedRecord::mergeMedia(const Dictionary& mine, const Dictionary& theirs, ConflictChoice choice,
                             RecordMerge& merged) const {
  const auto printIn = [](const Dictionary& record) {
    const PropertyList* media = record.find(kMedia);
    return media ? printOf(*media) : Print{0};
  };
  const Print my = printIn(mine);
  const Print their = printIn(theirs);
  if (their == my || their == _media) return;
  const auto mineItems = itemsOf(mine);
  const auto theirItems = itemsOf(theirs);
  if (!mineItems || !theirItems || !_items) {
    // Which item is which cannot be told.
    if (choice == ConflictChoice::Refuse) merged.conflicts.emplace_back("the media items");
    if (choice == ConflictChoice::KeepTheirs && !theirItems) merged.conflicts.emplace_back("the media items");
    if (choice != ConflictChoice::KeepTheirs || !theirItems) return;
  }
  const std::vector<Item> none;
  const std::vector<Item>& base = _items ? *_items : none;
  const std::vector<Item>& ours = mineItems ? *mineItems : none;

  // Which of the items there are, and whose.
  std::vector<RecordMerge::Item> kept;
  const auto decide = [&](const std::string& uuid) {
    const auto root = findItem(base, uuid);
    const auto own = findItem(ours, uuid);
    const auto other = findItem(*theirItems, uuid);
    const auto content = [](const auto& found, const auto& list) {
      return found == list.end() ? std::nullopt : std::optional(found->content);
    };
    const auto was = content(root, base);
    const auto isMine = content(own, ours);
    const auto isTheirs = content(other, *theirItems);
    bool takesTheirs = isTheirs != isMine && isTheirs != was;
    if (takesTheirs && isMine != was) {
      if (choice == ConflictChoice::Refuse) merged.conflicts.push_back("the media item " + uuid);
      takesTheirs = choice == ConflictChoice::KeepTheirs;
    }
    if (!(takesTheirs ? isTheirs : isMine)) return;  // taken out
    const Dictionary* record = nullptr;
    if (takesTheirs) {
      const auto place = static_cast<std::size_t>(other - theirItems->begin());
      record = (*theirs.array(kMedia))[place].as<Dictionary>();
    }
    kept.push_back({uuid, record});
  };
  for (const Item& item : ours) decide(item.uuid);
  for (const Item& item : *theirItems)
    if (findItem(ours, item.uuid) == ours.end()) decide(item.uuid);

  // In whose order: that of who changed it. What only the other has goes behind what it stood behind there.
  std::set<std::string> common;
  for (const Item& item : ours)
    if (findItem(*theirItems, item.uuid) != theirItems->end() && findItem(base, item.uuid) != base.end())
      common.insert(item.uuid);
  const auto order = orderOf(base, common);
  const bool isMoved = orderOf(ours, common) != order;
  const bool isMovedThere = orderOf(*theirItems, common) != order;
  if (isMoved && isMovedThere && orderOf(ours, common) != orderOf(*theirItems, common) &&
      choice == ConflictChoice::Refuse)
    merged.conflicts.emplace_back("the order of the media items");
  const bool followsTheirs = isMovedThere && (!isMoved || choice == ConflictChoice::KeepTheirs);
  const std::vector<Item>& leader = followsTheirs ? *theirItems : ours;
  const std::vector<Item>& other = followsTheirs ? ours : *theirItems;
  std::vector<RecordMerge::Item> media;
  for (const Item& item : leader)
    if (const auto found = findItem(kept, item.uuid); found != kept.end()) media.push_back(*found);
  std::string before;
  for (const Item& item : other) {
    const auto found = findItem(kept, item.uuid);
    if (found != kept.end() && findItem(media, item.uuid) == media.end()) {
      const auto place = findItem(media, before);
      media.insert(place == media.end() ? media.begin() : std::next(place), *found);
    }
    if (found != kept.end()) before = item.uuid;
  }
  merged.media = std::move(media);
}

}  // namespace quilt
