// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/collections/QuiltCollection.h"
#include "quilt/collections/UnfinishedItem.h"
#include "quilt/platform/base/CleanUp.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"

namespace quilt {

using platform::FDYLogger;
using platform::FDYMedia;
using platform::Result;
using platform::services;

namespace {

constexpr const char* kCannotCreate = "Failed to create a new empty document at path \"%@\"";

template <class Item>
bool contains(const std::vector<Item>& list, const Item& item) {
  return std::find(list.begin(), list.end(), item) != list.end();
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

void QuiltCollection::addDocument(const std::shared_ptr<QuiltDocument>& document) { _documents.append(document); }

void QuiltCollection::removeDocument(const std::shared_ptr<QuiltDocument>& document, bool andDelete) {
  if (!document) return;
  const platform::Uninterrupted whole;
  const platform::MonitorLock lock = _documents.lock();
  if (andDelete) deletePackage(document->path());
  _documents.remove(document);
}

void QuiltCollection::deletePackage(const Path& package) const {
  platform::FileManager& files = *services().files;
  sweepLevel(path());
  if (package.empty() || !files.fileExistsAtPath(package)) return;
  if (const Result<void> removed = files.removeItem(package, path()); !removed)
    FDYLogger::logWarning("Failed to remove document at path \"%@\": \"%@\"", package, removed.error());
}

void QuiltCollection::removeAllDocumentsAndDelete(bool andDelete) {
  const platform::Uninterrupted whole;
  const platform::MonitorLock lock = _documents.lock();
  for (const auto& document : documents()) removeDocument(document, andDelete);
}

void QuiltCollection::removeAllBrokenDocuments() {
  const platform::Uninterrupted whole;
  const platform::MonitorLock lock = _documents.lock();
  for (const auto& document : documents())
    if (document->isClassic() && document->mediaCount() == 0) removeDocument(document, !recordNamesMedia(*document));
}

// Making documents

Path QuiltCollection::packagePath(const std::string& uuid) const {
  const std::string name = platform::withExtension(uuid, kQuiltDocumentExtension);
  return platform::isPlainComponent(uuid) && platform::isPlainComponent(name) ? inFolder(name) : Path();
}

std::shared_ptr<QuiltDocument> QuiltCollection::newDocumentWithType(const Text& type) {
  return newDocumentWithType(type, std::nullopt);
}

std::shared_ptr<QuiltDocument> QuiltCollection::newDocumentWithType(const Text& type, const Text& title) {
  const platform::Uninterrupted whole;
  const Path package = packagePath(platform::generateUUID());
  const auto fail = [&package]() -> std::shared_ptr<QuiltDocument> {
    FDYLogger::logCritical(kCannotCreate, package);
    return nullptr;
  };
  if (package.empty()) return fail();
  UnfinishedItem unfinished(package);
  const auto document = QuiltDocument::initWithPath(package);
  if (!document) return fail();
  document->setAuthor(author());
  document->setTheme(preferredTheme());
  document->setType(type);
  if (title) document->setTitle(title);
  if (!document->update() || !unfinished.finish()) return fail();
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
  return importDocumentFromPath(path, withUUID, std::nullopt, withProgressionBlock);
}

std::shared_ptr<QuiltDocument> QuiltCollection::importDocumentFromPath(const Path& path, const Text& withUUID,
                                                                       const Text& orTitle,
                                                                       const ProgressionBlock& withProgressionBlock) {
  const Path package = packagePath(withUUID ? *withUUID : platform::generateUUID());
  // A package that was there before is not this import's to delete.
  const bool isNewPackage = !services().files->fileExistsAtPath(package);
  std::optional<UnfinishedItem> unfinished;
  if (isNewPackage && !package.empty()) unfinished.emplace(package);
  const auto document = package.empty() ? nullptr : QuiltDocument::initWithPath(package);
  const auto fail = [&]() -> std::shared_ptr<QuiltDocument> {
    FDYLogger::logCritical(kCannotCreate, path);
    return nullptr;
  };
  if (!document) return fail();
  const platform::OnException discardDocument([&] {
    if (contains(documents(), document)) removeDocument(document, isNewPackage);
    if (isNewPackage) (void)services().files->removeItem(package, this->path());
  });

  const Text identifier = platform::FDYTypePreferredIdentifier(path);
  if (identifier && contains(QuiltDocument::allSupportedImportUTIs(), *identifier)) {
    const auto medium = FDYMedia::initWithPath(path);
    if (!medium) return fail();
    fillFromMedium(*document, *medium, *identifier, path);
    if (!platform::report(withProgressionBlock, 10)) return fail();
  }
  if (orTitle && document->title().value_or("").empty()) document->setTitle(orTitle);
  if (!document->update()) return fail();
  addDocument(document);

  const bool flattened = document->flattenWithProgressionBlock([&withProgressionBlock](double percentage) {
    return platform::report(withProgressionBlock, percentage * 9 / 10 + 10);
  });
  if (flattened && (!unfinished || unfinished->finish())) return document;
  FDYLogger::logCritical("Failed to flatted...");
  removeDocument(document, isNewPackage);
  return fail();
}

}  // namespace quilt
