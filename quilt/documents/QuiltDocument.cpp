// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/QuiltDocument.h"

#include <algorithm>
#include <utility>

#include "quilt/collections/QuiltCollection.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/SavedRecord.h"

namespace quilt {

using platform::FDYLogger;
using platform::services;
namespace types = platform::types;

namespace {

constexpr const char* kFormatVersion = "1.0";

constexpr std::string_view kDocumentKeys[] = {
    "Version",  "UUID",          "Title",          "Description",      "Author",       "Keywords",
    "Category", "AdvisoryLabel", "jukeboxOrder",   "ThemePath",        "CreationDate", "ModifiedDate",
    "Type",     "Media",         "LastPublishURL", "DocumentDuration", "IsFlattened"};

constexpr const char* kObservedKeys[] = {"title",    "description",   "author",        "keywords",
                                         "category", "advisoryLabel", "jukeboxOrder",  "theme",
                                         "type",     "creationDate",  "lastPublishURL"};

/// The keys whose changes save the document. "type" is observed and saves nothing; "isClassic" never changes by itself.
constexpr std::string_view kSavingKeys[] = {"title",        "description",    "author",       "keywords",
                                            "category",     "advisoryLabel",  "jukeboxOrder", "theme",
                                            "creationDate", "lastPublishURL", "isClassic"};

/// Reads a properties file, unless it is a link that leads out of the package.
platform::Result<Dictionary> readPropertiesOf(const Path& package, const Path& file) {
  const Path folder = platform::standardizedPath(package);
  if (file.parent_path() == folder && !services().files->isConfined(file, folder))
    return platform::Error{platform::ErrorKind::Unsafe, "The file leads out of the document", file};
  return services().propertyLists->readDictionary(file);
}

}  // namespace

// ---- Construction

QuiltDocument::QuiltDocument() : _saved(std::make_shared<SavedRecord>()) {
  _uuid.store(platform::generateUUID());
  for (const char* key : kObservedKeys) {
    _observations.push_back(observe(key, [this](const platform::ChangeNotice& notice) {
      observeValueForKeyPath(notice.key, notice.object, notice.phase, nullptr);
    }));
  }
}

std::shared_ptr<QuiltDocument> QuiltDocument::init() {
  struct Made final : QuiltDocument {};
  return std::make_shared<Made>();
}

std::shared_ptr<QuiltDocument> QuiltDocument::initWithPath(const Path& path) {
  auto document = init();
  document->setPath(path);
  document->setUti(platform::pathExtension(path));
  if (services().files->fileExistsAtPath(path)) return document->loadDictionary() ? document : nullptr;

  if (const auto created = services().files->createDirectoryAtPath(path); !created) {
    FDYLogger::logWarning("Failed to create document at path \"%@\": \"@\"", path, created.error());
    return nullptr;
  }
  const Date now = services().clock->now();
  document->_saved->noteNothing();
  // Stored, not set: a setter would save, and an empty package has no properties file until it is first changed.
  document->_creationDate.store(now);
  document->_modifiedDate.store(now);
  FDYLogger::logDebug("Created new document at \"%@\"", path);
  return document;
}

Text QuiltDocument::uuidForDocumentAtPath(const Path& path) {
  const auto record = readPropertiesOf(path, platform::standardizedPath(path / kQuiltDocumentPropertiesFilename));
  return record ? record->string("UUID") : std::nullopt;
}

const std::vector<std::string>& QuiltDocument::allSupportedStaticDocumentImportUTIs() {
  static const std::vector<std::string> list = {types::kPDF, types::kEPUB, types::kEPUBContainer};
  return list;
}

const std::vector<std::string>& QuiltDocument::allSupportedClassicImportUTIs() {
  return QuiltMediaDerivative::classicSupportedUTIs();
}

const std::vector<std::string>& QuiltDocument::allSupportedImportUTIs() {
  static const std::vector<std::string> list = [] {
    std::vector<std::string> all = allSupportedClassicImportUTIs();
    const auto& documents = allSupportedStaticDocumentImportUTIs();
    all.insert(all.end(), documents.begin(), documents.end());
    return all;
  }();
  return list;
}

bool QuiltDocument::canImportFromPath(const Path& path) {
  const Text identifier = platform::FDYTypePreferredIdentifier(path);
  const auto& list = allSupportedImportUTIs();
  return identifier && std::find(list.begin(), list.end(), *identifier) != list.end();
}

// ---- Kinds

bool QuiltDocument::isClassic() const {
  const Text kind = type();
  return kind == kQuiltDocumentTypeClassicMovie || kind == kQuiltDocumentTypeClassicAudio;
}

bool QuiltDocument::isStaticDocument() const {
  const Text kind = type();
  return kind == kQuiltDocumentTypeFilePDF || kind == kQuiltDocumentTypeFileEPUB;
}

// ---- Places in the package

Path QuiltDocument::inPackage(std::initializer_list<const char*> components) const {
  Path place = path();
  if (place.empty()) return {};
  for (const char* component : components) place /= component;
  return place;
}

Path QuiltDocument::propertiesPath() const { return inPackage({kQuiltDocumentPropertiesFilename}); }
Path QuiltDocument::mediaFolderPath() const { return inPackage({"media"}); }
Path QuiltDocument::posterImagePath() const { return inPackage({"poster.png"}); }
Path QuiltDocument::dataControllerPath() const { return inPackage({"controllers", "data.js"}); }
Path QuiltDocument::localizationControllerPath() const { return inPackage({"controllers", "localizable.js"}); }
Path QuiltDocument::jukeboxArtworkPath() const { return inPackage({"JukeboxArtwork"}); }
Path QuiltDocument::jukeboxMetadataPath() const { return inPackage({"JukeboxMetadata.plist"}); }
Path QuiltDocument::glanceThumbnailPath() const { return inPackage({"Glance", "Thumbnail.png"}); }

std::string QuiltDocument::displayTitle() const {
  const Text name = title();
  return name && !name->empty() ? *name : untitledEpisode();
}

// ---- Loading

bool QuiltDocument::loadDictionary() { return loadDictionaryAtPath(platform::standardizedPath(propertiesPath())); }

bool QuiltDocument::loadDictionaryAtPath(const Path& path) {
  setIsProcessing(true);
  const bool loaded = readProperties(path);
  setIsProcessing(false);
  if (loaded) FDYLogger::logDebug("Loaded document at \"%@\"", this->path());
  return loaded;
}

bool QuiltDocument::readProperties(const Path& file) {
  if (!services().files->fileExistsAtPath(file)) {
    FDYLogger::logWarning("Failed to open document at path \"%@\": \"Properties file cannot be found\"", path());
    return false;
  }
  const platform::FileIdentity identity = SavedRecord::identityOf(file);
  auto record = readPropertiesOf(path(), file);
  // Media of a wrong kind is damage, not an empty list: opening it as empty would lose the items at the next save.
  const auto isUsable = [](const Dictionary& dictionary) {
    return !dictionary.contains("Media") || dictionary.array("Media") != nullptr;
  };
  if (!record || !isUsable(*record)) {
    FDYLogger::logWarning("Failed to open document at path \"%@\": \"Properties file cannot be read\"", path());
    return false;
  }
  if (record->string("Version") != kFormatVersion) return false;
  if (file == platform::standardizedPath(propertiesPath())) _saved->note(*record, identity);
  apply(*std::move(record));
  return true;
}

void QuiltDocument::apply(Dictionary record) {
  if (Text text = record.takeString("UUID")) setUuid(*std::move(text));
  if (Text text = record.takeString("Title")) setTitle(std::move(text));
  if (Text text = record.takeString("Description")) setDescription(std::move(text));
  if (Text text = record.takeString("Author")) setAuthor(std::move(text));
  if (Text text = record.takeString("Keywords")) setKeywords(std::move(text));
  if (Text text = record.takeString("Category")) setCategory(std::move(text));
  if (Text text = record.takeString("AdvisoryLabel")) setAdvisoryLabel(std::move(text));
  if (const auto order = record.integer("jukeboxOrder")) setJukeboxOrder(*order);
  if (const Text themePath = record.string("ThemePath")) setTheme(QuiltTheme::initWithPath(*themePath));
  if (const auto date = record.date("CreationDate")) setCreationDate(date);
  if (const auto date = record.date("ModifiedDate")) setModifiedDate(date);
  if (Text text = record.takeString("Type")) setType(std::move(text));
  if (Array* items = record.array("Media")) {
    const auto self = shared(this);
    for (auto& item : *items)
      if (auto* entry = item.as<Dictionary>()) addMedia(QuiltMedia::initWithDictionary(std::move(*entry), self));
  }
  if (Text text = record.takeString("LastPublishURL")) setLastPublishURL(std::move(text));
  _unknownEntries = platform::entriesBeyond(kDocumentKeys, record);
}

void QuiltDocument::reload() {
  const auto record = readPropertiesOf(path(), platform::standardizedPath(propertiesPath()));
  const auto written = record ? record->date("ModifiedDate") : std::nullopt;
  const auto known = modifiedDate();
  if (!written || (known && *written <= *known)) return;
  FDYLogger::logDebug("Reload detected that something has changed in document with UUID \"%@\"", uuid());
  invalidateCaches();
  loadDictionary();
  posterImage();
  setPosterImageVersion(posterImageVersion() + 1);
  // Nothing of the list changes; whoever shows the collection's documents looks again.
  if (const auto collection = collectionOwner()) collection->changeOnMainThread("documents", [] {});
}

// ---- Saving

Dictionary QuiltDocument::dictionary() {
  if (!title()) setTitle(untitledEpisode());
  Dictionary record;
  const auto set = [&record](const char* key, const Text& text) {
    if (text) record.append(key, *text);
  };
  record.append("Version", kFormatVersion);
  record.append("UUID", uuid());
  set("Title", title());
  set("Description", description());
  set("Author", author());
  set("Keywords", keywords());
  set("Category", category());
  set("AdvisoryLabel", advisoryLabel());
  record.append("jukeboxOrder", jukeboxOrder());
  if (const auto chosen = theme()) record.append("ThemePath", chosen->path().native());
  if (const auto date = creationDate()) record.append("CreationDate", *date);
  if (const auto date = modifiedDate()) record.append("ModifiedDate", *date);
  set("Type", type());
  Array items;
  _media.walk([&items](const auto& item) {
    items.emplace_back(item->dictionary());
    return true;
  });
  if (!items.empty()) record.append("Media", std::move(items));
  set("LastPublishURL", lastPublishURL());
  record.append("DocumentDuration", duration());
  record.append("IsFlattened", isFlattened());
  platform::appendAll(record, _unknownEntries);
  return record;
}

bool QuiltDocument::writeProperties(ConflictChoice inConflict) {
  constexpr int kAttempts = 20;  // each is one more hand that was faster
  for (int attempt = 0; attempt < kAttempts; ++attempt) {
    // First, and also without a file to write to: the record gives an untitled document its title.
    Dictionary record = dictionary();
    const Path file = propertiesPath();
    if (file.empty()) return false;
    if (!_saved->isKnown()) {
      if (!services().propertyLists->writeDictionary(record, file)) return false;
      _saved->note(record, SavedRecord::identityOf(file));
      return true;
    }
    const auto written = services().propertyLists->replaceDictionary(record, file, _saved->identity());
    if (written) {
      _saved->note(record, *written);
      return true;
    }
    if (written.error().kind != platform::ErrorKind::Changed) return false;
    if (!takeOverChanges(std::move(record), inConflict)) return false;
  }
  return false;
}

bool QuiltDocument::isBusy() const {
  // A save on another thread is not refused but waited for: refusing would lose the change that asks for this one. It
  // may begin or end while this looks, and counts when it is seen before or after.
  const auto isAnothers = [](platform::ThreadIdentity saver) {
    return saver != nullptr && saver != platform::currentThreadIdentity();
  };
  const bool wasSaving = isAnothers(_savingThread);
  if (!isProcessing()) return false;
  return !wasSaving && !isAnothers(_savingThread);
}

std::optional<platform::MonitorLock> QuiltDocument::beginProcessing() {
  if (isBusy()) return std::nullopt;
  auto lock = _media.lock();
  if (_isProcessing.exchange(true)) return std::nullopt;
  return lock;
}

bool QuiltDocument::update(ConflictChoice inConflict) {
  const std::optional<bool> saved = saveUnlessBusy(inConflict);
  if (!saved)
    FDYLogger::logCritical("Failed to update document at path \"%@\": \"Document is already being processed\"",
                           propertiesPath());
  return saved.value_or(false);
}

void QuiltDocument::saveChange() { saveUnlessBusy(ConflictChoice::Refuse); }

std::optional<bool> QuiltDocument::saveUnlessBusy(ConflictChoice inConflict) {
  if (isBusy()) return std::nullopt;
  const auto lock = _media.lock();
  // Known before the document is processing, so that no thread takes this save for a long operation.
  const platform::ThreadIdentity before = _savingThread.exchange(platform::currentThreadIdentity());
  const bool isFree = !_isProcessing.exchange(true);
  bool written = false;
  if (isFree) {
    setModifiedDate(services().clock->now());
    written = writeProperties(inConflict);
    if (!written)
      FDYLogger::logCritical("Failed to update document at path \"%@\": \"Properties cannot be written\"",
                             propertiesPath());
    setIsProcessing(false);
  }
  _savingThread = before;
  if (!isFree) return std::nullopt;
  return written;
}

void QuiltDocument::observeValueForKeyPath(std::string_view keyPath, platform::Object& /*ofObject*/,
                                           platform::ChangePhase /*change*/, void* /*context*/) {
  if (std::find(std::begin(kSavingKeys), std::end(kSavingKeys), keyPath) == std::end(kSavingKeys)) return;
  if (isBusy()) return;
  FDYLogger::logDebug("Updating document because KVO deteched a change for the %@", keyPath);
  saveChange();
}

// ---- Dates and caches

bool QuiltDocument::hasBeenModified() const {
  const auto modified = modifiedDate();
  const auto created = creationDate();
  if (!modified || !created) return false;
  return std::chrono::duration_cast<std::chrono::seconds>(*created - *modified).count() != 0;
}

void QuiltDocument::resetModifiedDate() {
  setModifiedDate(creationDate());
  if (!isProcessing()) update();
}

void QuiltDocument::invalidateCaches() {
  setPosterImage(nullptr);
  performBlockOnMedia([](const auto& item) {
    item->invalidateCaches();
    return true;
  });
}

}  // namespace quilt
