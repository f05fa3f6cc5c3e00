// SPDX-License-Identifier: Apache-2.0
#include "quilt/collections/QuiltCollection.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <new>

#include "quilt/collections/QuiltCollectionsController.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/SavedRecord.h"

namespace quilt {

using platform::FDYLogger;
using platform::Result;
using platform::services;

namespace {

constexpr const char* kCollectionFilename = "collection.plist";
constexpr const char* kPosterImageFilename = "poster.png";

constexpr std::array<std::string_view, 9> kSavedProperties = {"title",         "description",    "author",
                                                              "copyright",     "keywords",       "category",
                                                              "advisoryLabel", "preferredTheme", "lastPublishURL"};

constexpr std::array<std::string_view, 12> kRecordKeys = {
    "UUID",      "CreationDate", "ModifiedDate", "Title",         "Description",        "Author",
    "Copyright", "Keywords",     "Category",     "AdvisoryLabel", "PreferredThemePath", "LastPublishURL"};

std::optional<Date> later(const std::optional<Date>& one, const std::optional<Date>& other) {
  if (!one || !other) return std::nullopt;
  return std::max(*one, *other);
}

std::string fullDescription(const platform::Error& error) {
  return error.file.empty() ? error.text : error.text + " (" + error.file.native() + ")";
}

}  // namespace

QuiltCollection::QuiltCollection() : _saved(std::make_shared<SavedRecord>()) {}

// Construction

std::shared_ptr<QuiltCollection> QuiltCollection::init() {
  struct Made final : QuiltCollection {};
  const auto collection = std::make_shared<Made>();
  collection->_uuid.store(platform::generateUUID());
  collection->_creationDate.store(services().clock->now());
  collection->saveWhenChanged();
  return collection;
}

std::shared_ptr<QuiltCollection> QuiltCollection::initWithPath(const Path& path) {
  auto collection = init();
  collection->setPath(path);
  platform::FileManager& files = *services().files;
  if (files.fileExistsAtPath(path)) {
    if (!collection->loadDictionary() || !collection->_loadDocuments()) return nullptr;
    collection->removeAllBrokenDocuments();
    return collection;
  }
  collection->_saved->noteNothing();
  if (const Result<void> made = files.createDirectoryAtPath(path); !made) {
    FDYLogger::logCritical("Failed to create collection at path \"%@\": \"%@\"", path, made.error());
    return nullptr;
  }
  if (!collection->update()) {
    FDYLogger::logCritical("Failed to create collection at path \"%@\"", path);
    return nullptr;
  }
  return collection;
}

std::shared_ptr<QuiltCollection> QuiltCollection::initWithPathAlone(const Path& path) {
  auto collection = init();
  collection->setPath(path);
  return collection->loadDictionary() ? collection : nullptr;
}

void QuiltCollection::saveWhenChanged() {
  for (const std::string_view key : kSavedProperties)
    _observations.push_back(observe(key, [this](const platform::ChangeNotice&) {
      if (!isLoading() && _takingOver != platform::currentThreadIdentity()) update();
    }));
}

// Places in the folder

Path QuiltCollection::_collectionFilepath() const { return inFolder(kCollectionFilename); }

Path QuiltCollection::_posterImageFilepath() const { return inFolder(kPosterImageFilename); }

Path QuiltCollection::inFolder(const std::string& name) const {
  const Path folder = path();
  return folder.empty() ? folder : folder / name;
}

// Dates

std::optional<Date> QuiltCollection::modifiedDate() const {
  // A document without a date takes the running value back to none: the next one starts it anew.
  std::optional<Date> newest;
  _documents.walk([&newest](const std::shared_ptr<QuiltDocument>& document) {
    const std::optional<Date> date = document->modifiedDate();
    newest = newest ? later(date, newest) : date;
    return true;
  });
  const std::optional<Date> stamp = _modifiedDate.get();
  return newest ? later(stamp, newest) : stamp;
}

std::set<std::string> QuiltCollection::keyPathsForValuesAffectingModifiedDate() { return {"documents"}; }

std::vector<std::string_view> QuiltCollection::keysDependingOn(std::string_view key) const {
  if (keyPathsForValuesAffectingModifiedDate().contains(std::string(key))) return {"modifiedDate"};
  return {};
}

bool QuiltCollection::hasBeenModified() const {
  const std::optional<Date> modified = modifiedDate();
  const std::optional<Date> created = creationDate();
  if (!modified || !created) return false;
  return std::chrono::abs(*modified - *created) >= std::chrono::seconds(1);
}

void QuiltCollection::resetModifiedDate() {
  setModifiedDate(creationDate());
  update();
}

// Loading and saving

bool QuiltCollection::loadDictionary() {
  const platform::FileIdentity identity = SavedRecord::identityOf(_collectionFilepath());
  const Result<Dictionary> read = services().propertyLists->readDictionary(_collectionFilepath());
  if (!read) {
    FDYLogger::logWarning("Failed to load collection at path \"%@\": \"Collection dictionary is invalid\"", path());
    return false;
  }
  setIsLoading(true);
  apply(*read);
  _unknownEntries.store(platform::entriesBeyond(kRecordKeys, *read));
  _saved->note(*read, identity);
  setIsLoading(false);
  return true;
}

void QuiltCollection::apply(const Dictionary& record) {
  if (const Text uuid = record.string("UUID")) setUuid(*uuid);
  if (const auto date = record.date("CreationDate")) setCreationDate(date);
  if (const auto date = record.date("ModifiedDate")) setModifiedDate(date);
  if (const Text text = record.string("Title")) setTitle(text);
  if (const Text text = record.string("Description")) setDescription(text);
  if (const Text text = record.string("Author")) setAuthor(text);
  if (const Text text = record.string("Copyright")) setCopyright(text);
  if (const Text text = record.string("Keywords")) setKeywords(text);
  if (const Text text = record.string("Category")) setCategory(text);
  if (const Text text = record.string("AdvisoryLabel")) setAdvisoryLabel(text);
  if (const Text themePath = record.string("PreferredThemePath"))
    if (auto theme = QuiltTheme::initWithPath(*themePath)) setPreferredTheme(std::move(theme));
  if (const Text text = record.string("LastPublishURL")) setLastPublishURL(text);
}

bool QuiltCollection::_loadDocuments() {
  const Path folder = path();
  if (folder.empty()) {
    FDYLogger::logCritical("Failed to load collection: \"Collection path is invalid\"");
    return false;
  }
  FDYLogger::logDebug("Loading collection \"%@\"...", title());
  const platform::FileManager& files = *services().files;
  const Result<std::vector<std::string>> names = files.contentsOfDirectoryAtPath(folder);
  if (!names) {
    FDYLogger::logWarning("Failed to load collection at path \"%@\": \"%@\"", folder, names.error());
    return false;
  }
  for (const std::string& name : *names) {
    if (name.starts_with(".")) continue;
    const Path entry = folder / name;
    if (files.kindOfItemAtPath(entry) != platform::FileKind::Folder) continue;
    addDocument(QuiltDocument::initWithPath(entry));
  }
  return true;
}

Dictionary QuiltCollection::dictionary() const {
  Dictionary record;
  const auto put = [&record](const char* key, const auto& value) {
    if (value) record.append(key, *value);
  };
  record.append("UUID", uuid());
  put("CreationDate", creationDate());
  put("ModifiedDate", modifiedDate());
  put("Title", title());
  put("Description", description());
  put("Author", author());
  put("Copyright", copyright());
  put("Keywords", keywords());
  put("Category", category());
  put("AdvisoryLabel", advisoryLabel());
  if (const auto theme = preferredTheme()) record.append("PreferredThemePath", theme->path().native());
  put("LastPublishURL", lastPublishURL());
  platform::appendAll(record, _unknownEntries.get());
  return record;
}

bool QuiltCollection::update(ConflictChoice inConflict) {
  if (isLoading()) return true;
  setModifiedDate(services().clock->now());

  const Path file = _collectionFilepath();
  const auto fail = [&file] {
    FDYLogger::logCritical("Failed to update collection at path \"%@\"", file);
    return false;
  };
  constexpr int kAttempts = 20;  // each is one more hand that was faster
  for (int attempt = 0; attempt < kAttempts; ++attempt) {
    Dictionary record;
    std::uint64_t turn = 0;
    try {
      const platform::MonitorLock lock = _documents.lock();
      turn = ++_recordsBuilt;
      record = dictionary();
    } catch (const std::bad_alloc&) {
      FDYLogger::logCritical("Failed to update collection at path \"%@\".", file);
      return false;
    }
    {
      // Threads that save at once may arrive here in any order; the newest record must be the one that stays.
      const std::lock_guard guard(_saving);
      if (turn < _newestSaved) return true;
      const Result<void> written = write(record, file);
      if (written) {
        _newestSaved = turn;
        return true;
      }
      if (written.error().kind != platform::ErrorKind::Changed) return fail();
    }
    if (!takeOverChanges(record, inConflict)) return fail();
  }
  return fail();
}

Result<void> QuiltCollection::write(const Dictionary& record, const Path& file) {
  if (file.empty()) return platform::Error{platform::ErrorKind::NotFound, "The collection has no folder", file};
  if (_saved->isKnown()) {
    const auto written = services().propertyLists->replaceDictionary(record, file, _saved->identity());
    if (!written) return written.error();
    _saved->note(record, *written);
    return {};
  }
  const Result<void> written = services().propertyLists->writeDictionary(record, file);
  if (written) _saved->note(record, SavedRecord::identityOf(file));
  return written;
}

bool QuiltCollection::takeOverChanges(const Dictionary& mine, ConflictChoice inConflict) {
  const Path file = _collectionFilepath();
  const auto refuse = [&file](const std::string& what) {
    FDYLogger::logCritical(
        "Failed to update collection at path \"%@\": \"Another program has changed %@ since it was read; nothing is "
        "overwritten\"",
        file, what);
    return false;
  };
  const platform::FileIdentity identity = SavedRecord::identityOf(file);
  if (identity == platform::FileIdentity{}) {  // taken away: there is nothing to overwrite
    _saved->noteNothing();
    return true;
  }
  const Result<Dictionary> theirs = services().propertyLists->readDictionary(file);
  if (!theirs) {
    if (inConflict != ConflictChoice::KeepMine) return refuse("the whole record");
    _saved->note({}, identity);
    return true;
  }
  const RecordMerge merge = _saved->merge(mine, *theirs, inConflict);
  if (!merge.conflicts.empty()) {
    std::string all;
    for (const std::string& conflict : merge.conflicts) all += (all.empty() ? "" : ", ") + conflict;
    return refuse(all);
  }
  if (merge.takesOver())
    FDYLogger::logWarning("Another program has changed the collection at path \"%@\": its changes are kept", path());
  const platform::ThreadIdentity before = _takingOver.exchange(platform::currentThreadIdentity());
  apply(merge.theirs);
  Dictionary unknown = _unknownEntries.get();
  for (const auto& [key, value] : platform::entriesBeyond(kRecordKeys, merge.theirs)) unknown.set(key, value);
  for (const std::string& key : merge.removed) {
    if (key == "CreationDate") setCreationDate(std::nullopt);
    if (key == "Title") setTitle(std::nullopt);
    if (key == "Description") setDescription(std::nullopt);
    if (key == "Author") setAuthor(std::nullopt);
    if (key == "Copyright") setCopyright(std::nullopt);
    if (key == "Keywords") setKeywords(std::nullopt);
    if (key == "Category") setCategory(std::nullopt);
    if (key == "AdvisoryLabel") setAdvisoryLabel(std::nullopt);
    if (key == "PreferredThemePath") setPreferredTheme(nullptr);
    if (key == "LastPublishURL") setLastPublishURL(std::nullopt);
    unknown.remove(key);
  }
  _unknownEntries.store(std::move(unknown));
  _takingOver = before;
  _saved->note(*theirs, identity);
  return true;
}

void QuiltCollection::invalidateCaches() {
  _documents.walk([](const std::shared_ptr<QuiltDocument>& document) {
    document->invalidateCaches();
    return true;
  });
}

// Poster image

Path QuiltCollection::posterImagePath() const {
  const Path file = _posterImageFilepath();
  return services().files->fileExistsAtPath(file) ? file : Path();
}

std::shared_ptr<ImageWrapper> QuiltCollection::posterImage() {
  if (path().empty()) return nullptr;
  const std::lock_guard guard(_posterMutex);
  if (!_posterImage)
    if (const Path file = posterImagePath(); !file.empty()) _posterImage = ImageWrapper::imageWithPath(file);
  return _posterImage;
}

void QuiltCollection::setPosterImage(const std::shared_ptr<ImageWrapper>& image) {
  willChangeValueForKey("posterImage");
  {
    const std::lock_guard guard(_posterMutex);
    _posterImage = nullptr;
    if (!path().empty()) {
      if (image)
        _posterImage = savedPosterImage(image);
      else
        deletePosterImage();
    }
  }
  didChangeValueForKey("posterImage");
}

std::shared_ptr<ImageWrapper> QuiltCollection::savedPosterImage(const std::shared_ptr<ImageWrapper>& image) const {
  const Path file = _posterImageFilepath();
  if (!image->saveAsPNGAtURL(Url::fileUrl(file))) {
    FDYLogger::logCritical("Failed to update poster image for collection at path \"%@\"", _collectionFilepath());
    return nullptr;
  }
  // The copy is read from our own file: the given image may refer to a file that its owner moves or deletes.
  const auto copy = ImageWrapper::imageWithPath(file);
  return copy ? copy : image;
}

void QuiltCollection::deletePosterImage() const {
  const Path file = posterImagePath();
  if (file.empty()) return;
  if (const Result<void> removed = services().files->removeItem(file, path()); !removed)
    FDYLogger::logCritical("Failed to clear poster image: %@", fullDescription(removed.error()));
}

}  // namespace quilt
