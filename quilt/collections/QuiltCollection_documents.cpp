// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/collections/QuiltCollection.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt {

using platform::FDYLogger;
using platform::FDYMedia;
using platform::Result;
using platform::services;

namespace {

constexpr const char* kCannotCreate = "Failed to create a new empty document at path \"%@\"";

bool contains(const std::vector<std::string>& list, const std::string& text) {
  return std::find(list.begin(), list.end(), text) != list.end();
}

/// The type of a document that wraps a file of an importable type; `unchanged` when nothing tells.
Text typeOfImport(const std::string& identifier, const FDYMedia& medium, const Text& unchanged) {
  if (contains(QuiltDocument::allSupportedClassicImportUTIs(), identifier)) {
    if (medium.hasVideo()) return kQuiltDocumentTypeClassicMovie;
    if (medium.hasAudio()) return kQuiltDocumentTypeClassicAudio;
    return unchanged;
  }
  if (contains(QuiltDocument::allSupportedStaticDocumentImportUTIs(), identifier)) {
    const std::string mimeType = medium.mimeType().value_or("");
    if (mimeType.ends_with("pdf")) return kQuiltDocumentTypeFilePDF;
    if (mimeType == "application/epub+zip") return kQuiltDocumentTypeFileEPUB;
    return kQuiltDocumentTypeStaticFile;
  }
  return unchanged;
}

void fillFromMedium(QuiltDocument& document, const FDYMedia& medium, const std::string& identifier, const Path& file) {
  document.setTitle(medium.metadataTitle());
  document.setDescription(medium.metadataInformation());
  document.setAuthor(medium.metadataAuthor());

  const auto source = QuiltMediaSource::initWithPath(file);
  const auto media = QuiltMedia::init();
  media->setTitle(medium.metadataTitle());
  media->setDescription(medium.metadataInformation());
  media->addSource(source);
  document.addMedia(media);

  document.setType(typeOfImport(identifier, medium, document.type()));
}

/// Whether the package's own record names media items: a document that holds none of them was damaged, not left empty.
bool recordNamesMedia(const QuiltDocument& document) {
  const Path file = document.propertiesPath();
  if (file.empty()) return false;
  const Result<Dictionary> record = services().propertyLists->readDictionary(file);
  if (!record) return false;
  const Array* media = record->array("Media");
  return media ? !media->empty() : record->contains("Media");
}

bool holdsFile(const Path& folder) {
  const platform::FileManager& files = *services().files;
  std::vector<Path> pending{folder};
  while (!pending.empty()) {
    const Path item = std::move(pending.back());
    pending.pop_back();
    const platform::FileKind kind = files.kindOfItemAtPath(item);
    if (kind == platform::FileKind::Missing) continue;  // a link that leads nowhere
    if (kind != platform::FileKind::Folder) return true;
    // What cannot be looked into may hold something.
    const auto names = files.contentsOfDirectoryAtPath(item);
    if (!names) return true;
    if (!files.isConfined(item, folder.parent_path())) continue;  // what a link leads to is somebody else's
    for (const std::string& name : *names) pending.push_back(item / name);
  }
  return false;
}

/// Whether somebody put work into a document without media: then it is damaged or unfinished, not empty.
bool holdsWork(const QuiltDocument& document) {
  if (document.path().empty()) return false;
  const Text description = document.description();
  return (description && !description->empty()) || services().files->fileExistsAtPath(document.posterImagePath()) ||
         (services().files->fileExistsAtPath(document.mediaFolderPath()) && holdsFile(document.mediaFolderPath()));
}

}  // namespace

// Reading the list

std::shared_ptr<QuiltDocument> QuiltCollection::documentWithUUID(const std::string& uuid) const {
  return _documents.first([&uuid](const std::shared_ptr<QuiltDocument>& document) { return document->uuid() == uuid; });
}

bool QuiltCollection::performBlockOnDocuments(
    const std::function<bool(const std::shared_ptr<QuiltDocument>&)>& block) const {
  return _documents.walk(block);
}

std::vector<std::shared_ptr<QuiltDocument>> QuiltCollection::lastCreatedDocuments(std::size_t count) const {
  const platform::MonitorLock lock = _documents.lock();
  // The dates are read once: another thread may change one while the list is sorted.
  std::vector<std::pair<std::optional<Date>, std::shared_ptr<QuiltDocument>>> dated;
  for (auto& document : documents()) {
    const std::optional<Date> created = document->creationDate();
    dated.emplace_back(created, std::move(document));
  }
  std::stable_sort(dated.begin(), dated.end(),
                   [](const auto& one, const auto& other) { return one.first > other.first; });
  dated.resize(std::min(dated.size(), count));

  std::vector<std::shared_ptr<QuiltDocument>> newest;
  newest.reserve(dated.size());
  for (auto& [created, document] : dated) newest.push_back(std::move(document));
  return newest;
}

// Changing the list

std::shared_ptr<QuiltDocument> QuiltCollection::openDocument(const Path& package) {
  const Path place = platform::standardizedPath(package);
  const platform::MonitorLock lock = _documents.lock();
  const auto held = _documents.first([&place](const auto& document) { return document->path() == place; });
  if (held) return held;
  const bool isHere = place.parent_path() == platform::standardizedPath(path());
  if (!isHere || services().files->kindOfItemAtPath(place) != platform::FileKind::Folder) {
    FDYLogger::logWarning("Failed to open document at path \"%@\": \"There is no such package in the collection\"",
                          place);
    return nullptr;
  }
  const auto document = QuiltDocument::initWithPath(place);
  addDocument(document);
  return document;
}

void QuiltCollection::addDocument(const std::shared_ptr<QuiltDocument>& document) { _documents.append(document); }

void QuiltCollection::removeDocument(const std::shared_ptr<QuiltDocument>& document, bool andDelete) {
  if (!document) return;
  const platform::MonitorLock lock = _documents.lock();
  if (andDelete) deletePackage(document->path());
  _documents.remove(document);
}

void QuiltCollection::deletePackage(const Path& package) const {
  platform::FileManager& files = *services().files;
  if (package.empty() || !files.fileExistsAtPath(package)) return;
  if (const Result<void> removed = files.removeItem(package, path()); !removed)
    FDYLogger::logWarning("Failed to remove document at path \"%@\": \"%@\"", package, removed.error());
}

void QuiltCollection::removeAllDocumentsAndDelete(bool andDelete) {
  const platform::MonitorLock lock = _documents.lock();
  for (const auto& document : documents()) removeDocument(document, andDelete);
}

void QuiltCollection::removeAllBrokenDocuments() {
  const platform::MonitorLock lock = _documents.lock();
  for (const auto& document : documents()) {
    if (!document->isClassic() || document->mediaCount() != 0) continue;
    if (recordNamesMedia(*document)) {
      FDYLogger::logWarning("Left the damaged document at path \"%@\" out: none of its media can be read",
                            document->path());
      removeDocument(document, false);
    } else if (holdsWork(*document)) {
      FDYLogger::logWarning("Kept the document at path \"%@\" without media: it has a description, a poster or files",
                            document->path());
    } else {
      FDYLogger::logWarning("Removed the empty document at path \"%@\"", document->path());
      removeDocument(document, true);
    }
  }
}

// Making documents

Path QuiltCollection::packagePath(const std::string& uuid) const {
  const std::string name = platform::withExtension(uuid, kQuiltDocumentExtension);
  return platform::isPlainComponent(uuid) && platform::isPlainComponent(name) ? inFolder(name) : Path();
}

std::shared_ptr<QuiltDocument> QuiltCollection::newDocumentWithType(const Text& type) {
  const Path package = packagePath(platform::generateUUID());
  const auto document = package.empty() ? nullptr : QuiltDocument::initWithPath(package);
  if (!document) {
    FDYLogger::logCritical(kCannotCreate, package);
    return nullptr;
  }
  document->setAuthor(author());
  document->setTheme(preferredTheme());
  document->setType(type);
  if (!document->update()) {
    FDYLogger::logCritical(kCannotCreate, package);
    return nullptr;
  }
  document->setCreationDate(document->modifiedDate());
  addDocument(document);
  return document;
}

std::shared_ptr<QuiltDocument> QuiltCollection::importDocumentFromPath(const Path& path,
                                                                       const ProgressionBlock& withProgressionBlock) {
  return importDocumentFromPath(path, std::nullopt, withProgressionBlock);
}

std::shared_ptr<QuiltDocument> QuiltCollection::importDocumentFromPath(const Path& path, const Text& withUUID,
                                                                       const ProgressionBlock& withProgressionBlock) {
  const Path package = packagePath(withUUID ? *withUUID : platform::generateUUID());
  // A package that was there before is not this import's to delete.
  const bool isNewPackage = !services().files->fileExistsAtPath(package);
  const auto document = package.empty() ? nullptr : QuiltDocument::initWithPath(package);
  const auto fail = [&]() -> std::shared_ptr<QuiltDocument> {
    FDYLogger::logCritical(kCannotCreate, path);
    return nullptr;
  };
  const auto discard = [&]() -> std::shared_ptr<QuiltDocument> {
    if (isNewPackage) (void)services().files->removeItem(package, this->path());
    return fail();
  };
  if (!document) return fail();

  const Text identifier = platform::FDYTypePreferredIdentifier(path);
  if (identifier && contains(QuiltDocument::allSupportedImportUTIs(), *identifier)) {
    const auto medium = FDYMedia::initWithPath(path);
    if (!medium) return discard();
    fillFromMedium(*document, *medium, *identifier, path);
    if (!platform::report(withProgressionBlock, 10)) return discard();
  }
  if (!document->update()) return discard();
  addDocument(document);

  const bool flattened = document->flattenWithProgressionBlock([&withProgressionBlock](double percentage) {
    return platform::report(withProgressionBlock, percentage * 9 / 10 + 10);
  });
  if (flattened) return document;
  FDYLogger::logCritical("Failed to flatted...");
  removeDocument(document, isNewPackage);
  return fail();
}

}  // namespace quilt
