// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/SavedRecord.h"

namespace quilt {

using platform::FDYLogger;
using platform::services;

namespace {

std::string listed(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text += (text.empty() ? "" : ", ") + word;
  return text;
}

}  // namespace

bool QuiltDocument::takeOverChanges(Dictionary mine, ConflictChoice inConflict) {
  const Path file = propertiesPath();
  const auto refuse = [&file](const std::string& what) {
    FDYLogger::logCritical(
        "Failed to update document at path \"%@\": \"Another program has changed %@ since it was read; nothing is "
        "overwritten\"",
        file, what);
    return false;
  };
  const platform::FileIdentity identity = SavedRecord::identityOf(file);
  if (identity == platform::FileIdentity{}) {  // taken away: there is nothing to overwrite
    _saved->noteNothing();
    return true;
  }
  auto theirs = services().propertyLists->readDictionary(file);
  if (!theirs || theirs->string("Version") != mine.string("Version") || theirs->string("UUID") != uuid()) {
    // A damaged record, one of a newer version, or another document's.
    if (inConflict != ConflictChoice::KeepMine) return refuse("the whole record");
    _saved->note({}, identity);
    return true;
  }
  const RecordMerge merge =
      _saved->merge(mine, *theirs, inConflict, {{"Title", untitledEpisode()}, {"jukeboxOrder", 0}});
  if (!merge.conflicts.empty()) return refuse(listed(merge.conflicts));
  std::vector<std::shared_ptr<QuiltMedia>> media;
  if (merge.media)
    for (const RecordMerge::Item& item : *merge.media) {
      media.push_back(item.theirs ? QuiltMedia::initWithDictionary(*item.theirs, shared(this))
                                  : mediaWithUUID(item.uuid));
      if (!media.back()) return refuse("the media item " + item.uuid);
    }
  // Also when the file was only touched, or an own save was reported as failed and had come through.
  if (merge.takesOver())
    FDYLogger::logWarning("Another program has changed the document at path \"%@\": its changes are kept", path());
  takeOver(merge, media);
  _saved->note(*theirs, identity);
  return true;
}

void QuiltDocument::takeOver(const RecordMerge& merge, const std::vector<std::shared_ptr<QuiltMedia>>& media) {
  const Dictionary unknown = _unknownEntries;
  apply(merge.theirs);
  for (const auto& [key, value] : unknown)
    if (!merge.theirs.contains(key)) _unknownEntries.append(key, value);
  for (const std::string& key : merge.removed) {
    if (key == "Title") setTitle(std::nullopt);
    if (key == "Description") setDescription(std::nullopt);
    if (key == "Author") setAuthor(std::nullopt);
    if (key == "Keywords") setKeywords(std::nullopt);
    if (key == "Category") setCategory(std::nullopt);
    if (key == "AdvisoryLabel") setAdvisoryLabel(std::nullopt);
    if (key == "jukeboxOrder") setJukeboxOrder(0);
    if (key == "ThemePath") setTheme(nullptr);
    if (key == "CreationDate") setCreationDate(std::nullopt);
    if (key == "Type") setType(std::nullopt);
    if (key == "LastPublishURL") setLastPublishURL(std::nullopt);
    _unknownEntries.remove(key);
  }
  if (!merge.media) return;
  // Their files are theirs to make and to delete: only the list follows.
  for (std::size_t i = 0; i < media.size(); ++i) {
    if (_media.at(i) == media[i]) continue;
    const auto before = mediaWithUUID(media[i]->uuid());
    _media.remove(before ? before : media[i]);
    _media.insert(media[i], std::min(i, _media.count()));
  }
  while (_media.count() > media.size()) _media.remove(_media.at(media.size()));
}

}  // namespace quilt
