// SPDX-License-Identifier: Apache-2.0
#include "quilt/collections/QuiltCollection.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <new>

#include "quilt/collections/QuiltCollectionsController.h"
#include "quilt/collections/UnfinishedItem.h"
#include "quilt/platform/base/CleanUp.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"

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

QuiltCollection::QuiltCollection() = default;

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
  return initWithPath(path, std::nullopt);
}

std::shared_ptr<QuiltCollection> QuiltCollection::initWithPath(const Path& path, const Text& newTitle) {
  auto collection = init();
  collection->setPath(path);
  platform::FileManager& files = *services().files;
  if (files.fileExistsAtPath(path)) {
    if (!collection->loadDictionary() || !collection->_loadDocuments()) return nullptr;
    collection->removeAllBrokenDocuments();
    return collection;
  }
  UnfinishedItem unfinished(path);
  if (const Result<void> made = files.createDirectoryAtPath(path); !made) {
    FDYLogger::logCritical("Failed to create collection at path \"%@\": \"%@\"", path, made.error());
    return nullptr;
  }
  if (newTitle) collection->_title.store(newTitle);
  if (!collection->update() || !unfinished.finish()) {
    FDYLogger::logCritical("Failed to create collection at path \"%@\"", path);
    return nullptr;
  }
  return collection;
}

void QuiltCollection::saveWhenChanged() {
  for (const std::string_view key : kSavedProperties)
    _observations.push_back(observe(key, [this](const platform::ChangeNotice&) {
      if (!isLoading()) update();
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
  const platform::Uninterrupted whole;
  setModifiedDate(creationDate());
  update();
}

// Loading and saving

bool QuiltCollection::loadDictionary() {
  const Result<Dictionary> read = services().propertyLists->readDictionary(_collectionFilepath());
  if (!read) {
    FDYLogger::logWarning("Failed to load collection at path \"%@\": \"Collection dictionary is invalid\"", path());
    return false;
  }
  const Dictionary& record = *read;
  platform::withCleanUp([&] { apply(record); }, [this] { setIsLoading(false); });
  return true;
}

void QuiltCollection::apply(const Dictionary& record) {
  const platform::Uninterrupted whole;
  setIsLoading(true);
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
  _unknownEntries.store(platform::entriesBeyond(kRecordKeys, record));
}

bool QuiltCollection::_loadDocuments() {
  const platform::Uninterrupted whole;
  const Path folder = path();
  if (folder.empty()) {
    FDYLogger::logCritical("Failed to load collection: \"Collection path is invalid\"");
    return false;
  }
  FDYLogger::logDebug("Loading collection \"%@\"...", title());
  sweepLevel(folder);
  const platform::FileManager& files = *services().files;
  const Result<std::vector<std::string>> names = files.contentsOfDirectoryAtPath(folder);
  if (!names) {
    FDYLogger::logWarning("Failed to load collection at path \"%@\": \"%@\"", folder, names.error());
    return false;
  }
  for (const std::string& name : platform::finishedNames(*names)) {
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

bool QuiltCollection::update() {
  if (isLoading()) return true;
  const platform::Uninterrupted whole;
  setModifiedDate(services().clock->now());

  const Path file = _collectionFilepath();
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

  // Threads that save at once may arrive here in any order; the newest record must be the one that stays.
  const std::lock_guard guard(_saving);
  if (turn < _newestSaved) return true;
  if (file.empty() || !services().propertyLists->writeDictionary(record, file)) {
    FDYLogger::logCritical("Failed to update collection at path \"%@\"", file);
    return false;
  }
  _newestSaved = turn;
  return true;
}

void QuiltCollection::invalidateCaches() {
  const platform::Uninterrupted whole;
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
  const platform::Uninterrupted whole;
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
