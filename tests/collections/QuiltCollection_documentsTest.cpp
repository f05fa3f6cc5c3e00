// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <cstdlib>

#include "quilt/collections/QuiltCollection.h"
#include "quilt/platform/testing/FailNthFileManager.h"
#include "quilt/platform/testing/ForwardingFileManager.h"
#include "tests/support/FaultyServices.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/ModelFixture.h"
#include "tests/support/PlistByPython.h"

namespace quilt {
namespace {

using platform::Error;
using platform::ErrorKind;
using platform::FileKind;
using platform::MediaFacts;
using platform::Result;
using platform::ScopedService;
using platform::Services;
using platform::services;
using support::critical;
using support::dateOf;
using support::debug;
using support::Line;
using support::Lines;
using support::TestClock;
using support::warning;
using ::testing::AllOf;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::Ge;
using ::testing::IsEmpty;
using ::testing::Le;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;

class FailingDocumentFiles final : public platform::ForwardingFileManager {
 public:
  using ForwardingFileManager::ForwardingFileManager;
  std::string failCreateOf;  ///< the last component
  bool failRemove = false;
  bool failCopy = false;

  Result<void> createDirectoryAtPath(const Path& path) override {
    if (!failCreateOf.empty() && path.native().ends_with(failCreateOf)) return support::kFault;
    return ForwardingFileManager::createDirectoryAtPath(path);
  }
  Result<void> removeItem(const Path& path, const Path& within) override {
    if (failRemove) return Error{ErrorKind::PermissionDenied, "Permission denied.", path};
    return ForwardingFileManager::removeItem(path, within);
  }
  int copyfile(const Path& source, const Path& destination, platform::CopyCallback callback, void* context) override {
    return failCopy ? -1 : ForwardingFileManager::copyfile(source, destination, callback, context);
  }
};

/// Fails the writes after a number of them.
class FailingPropertyLists final : public platform::PropertyLists {
 public:
  int writesLeft = 0;

  Result<platform::PropertyList> parse(std::string_view bytes) const override { return _real->parse(bytes); }
  std::string serialize(const platform::PropertyList& value) const override { return _real->serialize(value); }
  Result<Dictionary> readDictionary(const Path& path) const override { return _real->readDictionary(path); }
  Result<void> writeDictionary(const Dictionary& dictionary, const Path& path) override {
    if (writesLeft-- <= 0) return support::kFault;
    return _real->writeDictionary(dictionary, path);
  }

 private:
  std::shared_ptr<platform::PropertyLists> _real = services().propertyLists;
};

/// Sees the same in every file.
class SeesFacts final : public platform::MediaInspector {
 public:
  explicit SeesFacts(MediaFacts facts) : _facts(std::move(facts)) {}
  Result<MediaFacts> inspect(const Path&) const override { return _facts; }

 private:
  MediaFacts _facts;
};

class SeesNothing final : public platform::MediaInspector {
 public:
  Result<MediaFacts> inspect(const Path&) const override { return support::kFault; }
};

class QuiltCollectionDocumentsTest : public support::ModelFixture {
 protected:
  QuiltCollectionDocumentsTest() : collection(QuiltCollection::initWithPath(folder() / "collection")) {}

  Path path() const { return folder() / "collection"; }
  Path packageOf(const std::string& uuid) const { return path() / (uuid + ".qpk"); }

  std::shared_ptr<QuiltDocument> add(const std::string& uuid, const std::string& created = "2020-01-01T00:00:00Z") {
    auto document = QuiltDocument::init();
    document->setIsProcessing(true);
    document->setUuid(uuid);
    document->setCreationDate(dateOf(created));
    document->setIsProcessing(false);
    collection->addDocument(document);
    return document;
  }
  /// A package on disk that the collection holds.
  std::shared_ptr<QuiltDocument> addPackage(const Path& package) {
    auto document = QuiltDocument::initWithPath(package);
    EXPECT_TRUE(document && document->update());
    collection->addDocument(document);
    takeLines();
    return document;
  }
  std::vector<std::string> uuids(const std::vector<std::shared_ptr<QuiltDocument>>& documents) {
    std::vector<std::string> all;
    for (const auto& document : documents) all.push_back(document->uuid());
    return all;
  }
  std::vector<std::string> packages() {
    std::vector<std::string> names = namesIn(path());
    std::erase(names, "collection.plist");
    return names;
  }

  // Files to import
  Path pdf() {
    return writeFile(folder() / "paper.pdf",
                     "%PDF-1.4\n1 0 obj<</Type/Catalog/Pages 2 0 R>>endobj\n"
                     "2 0 obj<</Type/Pages/Kids[3 0 R]/Count 1>>endobj\n"
                     "3 0 obj<</Type/Page/Parent 2 0 R/MediaBox[0 0 200 100]>>endobj\n"
                     "trailer<</Root 1 0 R>>\n%%EOF\n");
  }
  Path epub() {
    const Path file = folder() / "book.epub";
    const Path script = writeFile(folder() / "epub.py", R"(
import sys, zipfile
with zipfile.ZipFile(sys.argv[1], "w") as book:
    book.writestr("mimetype", "application/epub+zip", zipfile.ZIP_STORED)
    book.writestr("META-INF/container.xml", '<?xml version="1.0"?><container version="1.0" '
        'xmlns="urn:oasis:names:tc:opendocument:xmlns:container"><rootfiles><rootfile full-path="book.opf" '
        'media-type="application/oebps-package+xml"/></rootfiles></container>')
    book.writestr("book.opf", '<?xml version="1.0"?><package xmlns="http://www.idpf.org/2007/opf" version="3.0" '
        'unique-identifier="id"><metadata xmlns:dc="http://purl.org/dc/elements/1.1/"><dc:identifier id="id">1'
        '</dc:identifier><dc:title>Book</dc:title><dc:language>en</dc:language></metadata><manifest><item id="one" '
        'href="one.xhtml" media-type="application/xhtml+xml"/></manifest><spine><itemref idref="one"/></spine>'
        '</package>')
    book.writestr("one.xhtml", '<html xmlns="http://www.w3.org/1999/xhtml"><head><title>One</title></head>'
        '<body><p>Once.</p></body></html>')
)");
    EXPECT_EQ(std::system(("python3 '" + script.native() + "' '" + file.native() + "'").c_str()), 0);
    return file;
  }
  static std::string cannotCreate(const Path& file) {
    return "Failed to create a new empty document at path \"" + file.native() + "\"";
  }
  static Lines saves(std::initializer_list<const char*> keys) {
    Lines lines;
    for (const std::string key : keys)
      lines.push_back(debug("Updating document because KVO deteched a change for the " + key));
    return lines;
  }

  std::shared_ptr<QuiltCollection> collection;
};

// Reading the list

TEST_F(QuiltCollectionDocumentsTest, AnIndexEqualToTheCountAnswersNone) {
  const auto document = add("one");
  EXPECT_EQ(collection->documentsCount(), 1u);
  EXPECT_EQ(collection->documentAtIndex(0), document);
  EXPECT_EQ(collection->documentAtIndex(1), nullptr);
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltCollectionDocumentsTest, AnIdentityFindsTheFirstOfItAndAnUnknownOneNone) {
  add("one");
  const auto two = add("two");
  add("two");
  EXPECT_EQ(collection->documentWithUUID("two"), two);
  EXPECT_EQ(collection->documentWithUUID("three"), nullptr);
  EXPECT_EQ(collection->documentWithUUID("TWO"), nullptr);
}

TEST_F(QuiltCollectionDocumentsTest, AVisitStopsAtTheFirstFalse) {
  EXPECT_TRUE(collection->performBlockOnDocuments([](const auto&) { return false; }));
  for (const char* uuid : {"one", "two", "three"}) add(uuid);
  std::vector<std::string> seen;
  EXPECT_FALSE(collection->performBlockOnDocuments([&](const auto& document) {
    seen.push_back(document->uuid());
    return document->uuid() != "two";
  }));
  EXPECT_THAT(seen, ElementsAre("one", "two"));
  EXPECT_TRUE(collection->performBlockOnDocuments([](const auto&) { return true; }));
}

TEST_F(QuiltCollectionDocumentsTest, TheLastCreatedDocumentsComeNewestFirst) {
  add("b", "2022-01-01T00:00:00Z");
  add("e", "2025-01-01T00:00:00Z");
  add("a", "2021-01-01T00:00:00Z");
  add("d", "2024-01-01T00:00:00Z");
  add("c", "2023-01-01T00:00:00Z");
  EXPECT_THAT(uuids(collection->lastCreatedDocuments(2)), ElementsAre("e", "d"));
  EXPECT_THAT(uuids(collection->lastCreatedDocuments(5)), ElementsAre("e", "d", "c", "b", "a"));
  EXPECT_THAT(uuids(collection->lastCreatedDocuments(10)), ElementsAre("e", "d", "c", "b", "a"));
  EXPECT_THAT(collection->lastCreatedDocuments(0), IsEmpty());
  EXPECT_THAT(uuids(collection->documents()), ElementsAre("b", "e", "a", "d", "c"));
}

TEST_F(QuiltCollectionDocumentsTest, DocumentsWithoutACreationDateComeLast) {
  add("none")->setCreationDate(std::nullopt);
  add("old", "2021-01-01T00:00:00Z");
  EXPECT_THAT(uuids(collection->lastCreatedDocuments(2)), ElementsAre("old", "none"));
}

// Adding and removing

TEST_F(QuiltCollectionDocumentsTest, AddingNoneDoesNothing) {
  collection->addDocument(nullptr);
  collection->removeDocument(nullptr, true);
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltCollectionDocumentsTest, ADocumentAddedTwiceIsHeldTwiceAndRemovedWhole) {
  const auto document = add("one");
  collection->addDocument(document);
  EXPECT_EQ(collection->documentsCount(), 2u);
  collection->removeDocument(document, false);
  EXPECT_EQ(collection->documentsCount(), 0u);
}

TEST_F(QuiltCollectionDocumentsTest, TheOwnerIsSetBeforeTheListChangesAndClearedBeforeItChanges) {
  const auto document = QuiltDocument::init();
  std::vector<std::pair<bool, std::size_t>> seen;  // owned, count
  const auto observation = collection->observe(
      "documents",
      [&](const platform::ChangeNotice&) {
        seen.emplace_back(document->collectionOwner() == collection, collection->documentsCount());
      },
      platform::ObservationOptions::Prior);

  collection->addDocument(document);
  collection->removeDocument(document, false);

  using Seen = std::pair<bool, std::size_t>;
  EXPECT_THAT(seen, ElementsAre(Seen{true, 0}, Seen{true, 1}, Seen{false, 1}, Seen{false, 0}));
}

TEST_F(QuiltCollectionDocumentsTest, RemovingWithoutDeletionKeepsThePackageAndClearsTheOwner) {
  const auto document = addPackage(packageOf("one"));
  collection->removeDocument(document, false);
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_EQ(document->collectionOwner(), nullptr);
  EXPECT_TRUE(std::filesystem::exists(packageOf("one") / "properties.plist"));
}

TEST_F(QuiltCollectionDocumentsTest, RemovingWithDeletionDeletesThePackageWhole) {
  const auto document = addPackage(packageOf("one"));
  writeFile(packageOf("one") / "media/x/file", "bytes");
  collection->removeDocument(document, true);
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_EQ(document->collectionOwner(), nullptr);
  EXPECT_THAT(packages(), IsEmpty());
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltCollectionDocumentsTest, APackageThatIsGoneIsRemovedWithoutAMessage) {
  const auto document = addPackage(packageOf("one"));
  std::filesystem::remove_all(packageOf("one"));
  collection->removeDocument(document, true);
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltCollectionDocumentsTest, APackageThatCannotBeDeletedIsReportedAndLeavesTheList) {
  const auto document = addPackage(packageOf("one"));
  const auto files = std::make_shared<FailingDocumentFiles>(services().files);
  const ScopedService scoped(&Services::files, files);
  files->failRemove = true;

  collection->removeDocument(document, true);

  EXPECT_EQ(takeLines(), Lines{warning("Failed to remove document at path \"" + packageOf("one").native() +
                                       "\": \"Permission denied.\"")});
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_EQ(document->collectionOwner(), nullptr);
}

TEST_F(QuiltCollectionDocumentsTest, APackageOutsideTheFolderIsNeverDeleted) {
  const Path outside = folder() / "elsewhere.qpk";
  const auto document = addPackage(outside);

  collection->removeDocument(document, true);

  const Lines lines = takeLines();
  ASSERT_THAT(lines, SizeIs(1));
  EXPECT_EQ(lines[0].level, platform::LogLevel::Warning);
  EXPECT_TRUE(lines[0].text.starts_with("Failed to remove document at path \"" + outside.native() + "\": \""));
  EXPECT_TRUE(std::filesystem::exists(outside / "properties.plist"));
  EXPECT_EQ(collection->documentsCount(), 0u);
}

TEST_F(QuiltCollectionDocumentsTest, WhatALinkInTheFolderPointsToIsNeverDeleted) {
  const Path outside = folder() / "elsewhere";
  writeRecord(outside / "properties.plist", {{"Version", "1.0"}, {"UUID", "one"}, {"Type", "Movie"}});
  std::filesystem::create_directory_symlink(outside, packageOf("one"));

  // A classic package without media: the clean-up at loading would delete it.
  ASSERT_TRUE(QuiltCollection::initWithPath(path()));

  EXPECT_TRUE(std::filesystem::exists(outside / "properties.plist"));
}

TEST_F(QuiltCollectionDocumentsTest, ADetachedCollectionDeletesNothing) {
  const auto document = addPackage(packageOf("one"));
  const auto detached = QuiltCollection::init();
  detached->addDocument(document);
  detached->removeDocument(document, true);
  EXPECT_TRUE(std::filesystem::exists(packageOf("one") / "properties.plist"));
  EXPECT_THAT(takeLines(), SizeIs(1));
}

TEST_F(QuiltCollectionDocumentsTest, AllDocumentsAreRemovedInOrder) {
  std::vector<std::shared_ptr<QuiltDocument>> documents;
  for (const char* uuid : {"one", "two", "three"}) documents.push_back(addPackage(packageOf(uuid)));
  std::vector<std::size_t> counts;
  const auto observation = collection->observe(
      "documents", [&](const platform::ChangeNotice&) { counts.push_back(collection->documentsCount()); });

  collection->removeAllDocumentsAndDelete(false);
  EXPECT_THAT(counts, ElementsAre(2u, 1u, 0u));
  EXPECT_THAT(packages(), ElementsAre("one.qpk", "three.qpk", "two.qpk"));

  for (const auto& document : documents) collection->addDocument(document);
  collection->removeAllDocumentsAndDelete(true);
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_THAT(packages(), IsEmpty());
}

// Clean-up

TEST_F(QuiltCollectionDocumentsTest, AClassicPackageWithoutMediaIsLostFromDiskWhenTheCollectionLoads) {
  writeRecord(packageOf("movie") / "properties.plist", {{"Version", "1.0"}, {"UUID", "movie"}, {"Type", "Movie"}});
  writeRecord(packageOf("audio") / "properties.plist",
              {{"Version", "1.0"}, {"UUID", "audio"}, {"Type", "Audio"}, {"Media", Array{}}});
  writeRecord(packageOf("paper") / "properties.plist", {{"Version", "1.0"}, {"UUID", "paper"}, {"Type", "PDF"}});
  writeRecord(packageOf("plain") / "properties.plist", {{"Version", "1.0"}, {"UUID", "plain"}});

  const auto loaded = QuiltCollection::initWithPath(path());

  ASSERT_TRUE(loaded);
  EXPECT_EQ(loaded->documentsCount(), 2u);
  EXPECT_THAT(packages(), ElementsAre("paper.qpk", "plain.qpk"));
  EXPECT_THAT(
      takeProblems(),
      UnorderedElementsAre(warning("Removed the empty document at path \"" + packageOf("movie").native() + "\""),
                           warning("Removed the empty document at path \"" + packageOf("audio").native() + "\"")));
}

TEST_F(QuiltCollectionDocumentsTest, APackageWithADamagedMediaListDoesNotLoadAndStaysOnDisk) {
  writeRecord(packageOf("movie") / "properties.plist",
              {{"Version", "1.0"}, {"UUID", "movie"}, {"Type", "Movie"}, {"Media", "damaged"}});
  writeFile(packageOf("movie") / "media/x/film.mp4", "bytes");

  const auto loaded = QuiltCollection::initWithPath(path());

  ASSERT_TRUE(loaded);
  EXPECT_EQ(loaded->documentsCount(), 0u);
  EXPECT_TRUE(std::filesystem::exists(packageOf("movie") / "media/x/film.mp4"));
}

TEST_F(QuiltCollectionDocumentsTest, APackageWhoseMediaRecordsAreAllRefusedStaysOnDisk) {
  writeRecord(packageOf("movie") / "properties.plist", {{"Version", "1.0"},
                                                        {"UUID", "movie"},
                                                        {"Type", "Movie"},
                                                        {"Media", Array{Dictionary{{"UUID", "../../escape"}}}}});
  writeFile(packageOf("movie") / "media/x/film.mp4", "bytes");

  const auto loaded = QuiltCollection::initWithPath(path());

  ASSERT_TRUE(loaded);
  EXPECT_EQ(loaded->documentsCount(), 0u);
  EXPECT_TRUE(std::filesystem::exists(packageOf("movie") / "media/x/film.mp4"));
}

// New documents

TEST_F(QuiltCollectionDocumentsTest, ANewDocumentTakesAuthorAndThemeAndIsSaved) {
  collection->setAuthor("Ann");
  takeLines();

  const auto document = collection->newDocumentWithType(kQuiltDocumentTypeInteractive);

  ASSERT_TRUE(document);
  EXPECT_EQ(document->author(), "Ann");
  EXPECT_EQ(document->theme(), collection->preferredTheme());
  EXPECT_EQ(document->type(), "Interactive");
  EXPECT_EQ(document->collectionOwner(), collection);
  EXPECT_EQ(collection->documentAtIndex(0), document);
  EXPECT_EQ(document->path().parent_path(), path());
  EXPECT_EQ(document->path().extension(), ".qpk");
  EXPECT_EQ(document->path().stem().native().size(), 36u);
  const Dictionary record = readRecord(document->propertiesPath());
  EXPECT_EQ(record.string("Author"), "Ann");
  EXPECT_EQ(record.string("Type"), "Interactive");
  Lines expected{debug("Created new document at \"" + document->path().native() + "\"")};
  for (const Line& line : saves({"author", "theme", "creationDate"})) expected.push_back(line);
  EXPECT_EQ(takeLines(), expected);
}

TEST_F(QuiltCollectionDocumentsTest, ANewDocumentIsAsOldAsItsFirstSave) {
  const auto now = dateOf("2026-03-05T14:07:09Z");
  const ScopedService clock(&Services::clock, std::make_shared<TestClock>(now));
  const auto document = collection->newDocumentWithType(kQuiltDocumentTypeInteractive);
  ASSERT_TRUE(document);
  EXPECT_EQ(document->creationDate(), now);
  EXPECT_FALSE(document->hasBeenModified());
}

TEST_F(QuiltCollectionDocumentsTest, ANewDocumentThatCannotBeMadeIsReportedWithItsPath) {
  const auto files = std::make_shared<FailingDocumentFiles>(services().files);
  const ScopedService scoped(&Services::files, files);
  files->failCreateOf = ".qpk";

  EXPECT_FALSE(collection->newDocumentWithType(kQuiltDocumentTypeInteractive));

  const Lines lines = takeLines();
  ASSERT_THAT(lines, SizeIs(2));
  EXPECT_EQ(lines[0].level, platform::LogLevel::Warning);
  const std::string target =
      lines[0].text.substr(lines[0].text.find('"') + 1, packageOf(std::string(36, 'x')).native().size());
  EXPECT_EQ(lines[0], warning("Failed to create document at path \"" + target + "\": \"@\""));
  EXPECT_EQ(lines[1], critical(cannotCreate(target)));
  EXPECT_TRUE(target.starts_with(path().native()) && target.ends_with(".qpk")) << target;
  EXPECT_EQ(collection->documentsCount(), 0u);
}

TEST_F(QuiltCollectionDocumentsTest, ANewDocumentThatCannotBeSavedIsReportedWithItsPath) {
  const auto lists = std::make_shared<FailingPropertyLists>();
  const ScopedService scoped(&Services::propertyLists, lists);
  lists->writesLeft = 2;  // those of the author and the theme

  EXPECT_FALSE(collection->newDocumentWithType(kQuiltDocumentTypeInteractive));

  const Path package = path() / packages().at(0);
  EXPECT_EQ(takeProblems(),
            (Lines{critical("Failed to update document at path \"" + (package / "properties.plist").native() +
                            "\": \"Properties cannot be written\""),
                   critical(cannotCreate(package))}));
  EXPECT_EQ(collection->documentsCount(), 0u);
}

TEST_F(QuiltCollectionDocumentsTest, ADetachedCollectionHasNoPlaceForDocuments) {
  const auto detached = QuiltCollection::init();
  EXPECT_FALSE(detached->newDocumentWithType(kQuiltDocumentTypeInteractive));
  EXPECT_EQ(takeLines(), Lines{critical("Failed to create a new empty document at path \"(null)\"")});
  const Path file = pdf();
  EXPECT_FALSE(detached->importDocumentFromPath(file, nullptr));
  EXPECT_EQ(takeLines(), Lines{critical(cannotCreate(file))});
}

// Import

TEST_F(QuiltCollectionDocumentsTest, AMovieIsImportedWithItsMetadataAndCopiedIntoThePackage) {
  support::MediaSpec spec;
  spec.tags = {{"title", "Film"}, {"artist", "Ann"}, {"comment", "A test"}};
  const Path file = support::makeMedia(spec);
  std::vector<double> reported;

  const auto document = collection->importDocumentFromPath(file, "film", [&](double percentage) {
    reported.push_back(percentage);
    return true;
  });

  ASSERT_TRUE(document);
  EXPECT_EQ(document->path(), packageOf("film"));
  EXPECT_EQ(document->type(), "Movie");
  EXPECT_EQ(document->title(), "Film");
  EXPECT_EQ(document->author(), "Ann");
  EXPECT_EQ(document->collectionOwner(), collection);
  EXPECT_EQ(collection->documents(), std::vector{document});
  ASSERT_EQ(document->mediaCount(), 1u);
  EXPECT_EQ(document->mediaAtIndex(0)->title(), "Film");
  ASSERT_EQ(document->mediaAtIndex(0)->sourcesCount(), 1u);
  EXPECT_TRUE(document->isFlattened());
  const auto main = document->mediaAtIndex(0)->sourceAtIndex(0)->mainDerivative();
  ASSERT_TRUE(main && main->url());
  EXPECT_TRUE(main->url()->relativePath().native().starts_with(packageOf("film").native()));
  EXPECT_EQ(readFile(main->url()->relativePath()), readFile(file));

  ASSERT_GE(reported.size(), 4u);
  EXPECT_THAT(reported, Each(AllOf(Ge(10.0), Le(100.0))));
  EXPECT_EQ(reported[0], 10.0);  // the item is set up
  EXPECT_EQ(reported[1], 10.0);  // the copy begins
  EXPECT_EQ(reported.back(), 100.0);
  EXPECT_TRUE(std::is_sorted(reported.begin(), reported.end()));
  EXPECT_THAT(takeProblems(), IsEmpty());

  const auto again = QuiltCollection::initWithPath(path());
  ASSERT_TRUE(again);
  ASSERT_EQ(again->documentsCount(), 1u);
  EXPECT_EQ(again->documentAtIndex(0)->mediaCount(), 1u);
}

TEST_F(QuiltCollectionDocumentsTest, ImportingSavesTheIdleDocumentAsItsTextsAreSet) {
  const Path file = support::makeMedia({});
  ASSERT_TRUE(collection->importDocumentFromPath(file, "film", nullptr));
  Lines lines = takeLines();
  ASSERT_GE(lines.size(), 4u);
  lines.resize(4);
  Lines expected{debug("Created new document at \"" + packageOf("film").native() + "\"")};
  for (const Line& line : saves({"title", "description", "author"})) expected.push_back(line);
  EXPECT_EQ(lines, expected);
}

TEST_F(QuiltCollectionDocumentsTest, ASoundFileIsImportedAsAudio) {
  const auto document = collection->importDocumentFromPath(support::makeMedia(support::m4aSound()), nullptr);
  ASSERT_TRUE(document);
  EXPECT_EQ(document->type(), "Audio");
  EXPECT_EQ(document->path().stem().native().size(), 36u);
}

TEST_F(QuiltCollectionDocumentsTest, AMovieContainerWithSoundAloneIsImportedAsAudio) {
  support::MediaSpec spec;
  spec.picture.clear();
  const auto document = collection->importDocumentFromPath(support::makeMedia(spec), nullptr);
  ASSERT_TRUE(document);
  EXPECT_EQ(document->type(), "Audio");
}

TEST_F(QuiltCollectionDocumentsTest, APDFFileIsImportedAsPDFWithOneItemOfOneSource) {
  const Path file = pdf();
  const auto document = collection->importDocumentFromPath(file, nullptr);
  ASSERT_TRUE(document);
  EXPECT_EQ(document->type(), "PDF");
  ASSERT_EQ(document->mediaCount(), 1u);
  ASSERT_EQ(document->mediaAtIndex(0)->sourcesCount(), 1u);
  const auto main = document->mediaAtIndex(0)->sourceAtIndex(0)->mainDerivative();
  ASSERT_TRUE(main && main->url());
  EXPECT_EQ(readFile(main->url()->relativePath()), readFile(file));
}

TEST_F(QuiltCollectionDocumentsTest, AnEPUBFileIsImportedAsEPUB) {
  const auto document = collection->importDocumentFromPath(epub(), nullptr);
  ASSERT_TRUE(document);
  EXPECT_EQ(document->type(), "EPUB");
  EXPECT_EQ(document->mediaCount(), 1u);
}

TEST_F(QuiltCollectionDocumentsTest, AnotherStaticDocumentIsImportedAsStatic) {
  MediaFacts facts;
  facts.mimeType = "application/octet-stream";
  const ScopedService inspector(&Services::inspector, std::make_shared<SeesFacts>(facts));
  const auto document = collection->importDocumentFromPath(pdf(), nullptr);
  ASSERT_TRUE(document);
  EXPECT_EQ(document->type(), "Static");
}

TEST_F(QuiltCollectionDocumentsTest, AStaticDocumentWithoutAMediaTypeIsImportedAsStatic) {
  const ScopedService inspector(&Services::inspector, std::make_shared<SeesFacts>(MediaFacts{}));
  const auto document = collection->importDocumentFromPath(pdf(), nullptr);
  ASSERT_TRUE(document);
  EXPECT_EQ(document->type(), "Static");
}

TEST_F(QuiltCollectionDocumentsTest, AClassicFileWithNeitherPictureNorSoundKeepsTheDefaultType) {
  const Path file = support::makeMedia({});
  const ScopedService inspector(&Services::inspector, std::make_shared<SeesFacts>(MediaFacts{}));
  const auto document = collection->importDocumentFromPath(file, nullptr);
  ASSERT_TRUE(document);
  EXPECT_EQ(document->type(), std::nullopt);
}

TEST_F(QuiltCollectionDocumentsTest, AFileThatIsNotImportableYieldsAnEmptyDocument) {
  const Path file = writeFile(folder() / "notes.txt", "text");
  std::vector<double> reported;
  const auto document = collection->importDocumentFromPath(file, [&](double percentage) {
    reported.push_back(percentage);
    return true;
  });
  ASSERT_TRUE(document);
  EXPECT_EQ(document->type(), std::nullopt);
  EXPECT_EQ(document->mediaCount(), 0u);
  EXPECT_EQ(collection->documentsCount(), 1u);
  EXPECT_TRUE(std::filesystem::exists(document->propertiesPath()));
  EXPECT_THAT(reported, ElementsAre(10.0, 100.0));  // the copy's 0 and 100
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltCollectionDocumentsTest, ABlockThatAnswersFalseAtTenMakesTheImportFail) {
  const Path file = pdf();
  std::vector<double> reported;
  EXPECT_FALSE(collection->importDocumentFromPath(file, [&](double percentage) {
    reported.push_back(percentage);
    return false;
  }));
  EXPECT_THAT(reported, ElementsAre(10.0));
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_EQ(takeProblems(), Lines{critical(cannotCreate(file))});
  // Nothing is left that the next load would take for a document.
  EXPECT_THAT(packages(), IsEmpty());
}

TEST_F(QuiltCollectionDocumentsTest, AFlattenThatReportsFiftyReachesTheBlockAsFiftyFive) {
  // Two items of which the flatten reports the second at 50: the package was there before, with one item.
  {
    const auto before = QuiltDocument::initWithPath(packageOf("paper"));
    ASSERT_TRUE(before);
    const auto media = QuiltMedia::init();
    media->addSource(QuiltMediaSource::initWithPath(pdf()));
    before->addMedia(media);
    ASSERT_TRUE(before->flattenWithProgressionBlock(nullptr));
  }
  std::vector<double> reported;
  const auto document = collection->importDocumentFromPath(pdf(), "paper", [&](double percentage) {
    reported.push_back(percentage);
    return true;
  });
  ASSERT_TRUE(document);
  EXPECT_EQ(document->mediaCount(), 2u);
  EXPECT_THAT(reported, ::testing::Contains(55.0));
  EXPECT_EQ(reported.back(), 100.0);
}

TEST_F(QuiltCollectionDocumentsTest, ADocumentThatCannotBeMadeIsReportedWithTheSource) {
  const Path file = pdf();
  const auto files = std::make_shared<FailingDocumentFiles>(services().files);
  const ScopedService scoped(&Services::files, files);
  files->failCreateOf = "paper.qpk";
  EXPECT_FALSE(collection->importDocumentFromPath(file, "paper", nullptr));
  EXPECT_EQ(takeLines(),
            (Lines{warning("Failed to create document at path \"" + packageOf("paper").native() + "\": \"@\""),
                   critical(cannotCreate(file))}));
  EXPECT_EQ(collection->documentsCount(), 0u);
}

TEST_F(QuiltCollectionDocumentsTest, AFileThatCannotBeInspectedIsReported) {
  const Path file = pdf();
  const ScopedService inspector(&Services::inspector, std::make_shared<SeesNothing>());
  bool called = false;
  EXPECT_FALSE(collection->importDocumentFromPath(file, "paper", [&](double) { return called = true; }));
  EXPECT_FALSE(called);
  EXPECT_EQ(takeLines(), (Lines{debug("Created new document at \"" + packageOf("paper").native() + "\""),
                                critical(cannotCreate(file))}));
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_THAT(packages(), IsEmpty());
}

TEST_F(QuiltCollectionDocumentsTest, ADocumentThatCannotBeSavedIsReported) {
  const Path file = writeFile(folder() / "notes.txt", "text");
  const auto lists = std::make_shared<FailingPropertyLists>();
  const ScopedService scoped(&Services::propertyLists, lists);
  EXPECT_FALSE(collection->importDocumentFromPath(file, "notes", nullptr));
  EXPECT_EQ(
      takeProblems(),
      (Lines{critical("Failed to update document at path \"" + (packageOf("notes") / "properties.plist").native() +
                      "\": \"Properties cannot be written\""),
             critical(cannotCreate(file))}));
  EXPECT_EQ(collection->documentsCount(), 0u);
}

TEST_F(QuiltCollectionDocumentsTest, AFlattenThatFailsTakesTheDocumentAway) {
  const Path file = pdf();
  const auto files = std::make_shared<FailingDocumentFiles>(services().files);
  const ScopedService scoped(&Services::files, files);
  files->failCopy = true;

  EXPECT_FALSE(collection->importDocumentFromPath(file, "paper", nullptr));

  Lines lines = takeProblems();
  ASSERT_GE(lines.size(), 3u);
  EXPECT_EQ(Lines(lines.end() - 3, lines.end()),
            (Lines{critical("Failed to flatten document at path \"" + packageOf("paper").native() + "\""),
                   critical("Failed to flatted..."), critical(cannotCreate(file))}));
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_THAT(packages(), IsEmpty());
  EXPECT_TRUE(std::filesystem::exists(file));
}

TEST_F(QuiltCollectionDocumentsTest, AFlattenThatIsCancelledTakesTheDocumentAway) {
  const Path file = pdf();
  int calls = 0;
  // Goes on at the item, and at the start of the copy, whose answer counts for nothing.
  EXPECT_FALSE(collection->importDocumentFromPath(file, "paper", [&](double) { return ++calls < 3; }));
  EXPECT_EQ(takeProblems(),
            (Lines{critical("Flattening document at path \"" + packageOf("paper").native() + "\" has been cancelled"),
                   critical("Failed to flatted..."), critical(cannotCreate(file))}));
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_THAT(packages(), IsEmpty());
  EXPECT_TRUE(std::filesystem::exists(file));
}

TEST_F(QuiltCollectionDocumentsTest, AFailedImportIntoAPackageThatWasThereKeepsIt) {
  {
    const auto before = addPackage(packageOf("paper"));
    writeFile(packageOf("paper") / "media/kept", "bytes");
    collection->removeDocument(before, false);
  }
  int calls = 0;
  EXPECT_FALSE(collection->importDocumentFromPath(pdf(), "paper", [&](double) { return ++calls < 3; }));
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_TRUE(std::filesystem::exists(packageOf("paper") / "media/kept"));
}

TEST_F(QuiltCollectionDocumentsTest, AnImportCancelledAtAnyCallLeavesNothing) {
  const Path file = pdf();
  const std::string bytes = readFile(file);
  bool imported = false;
  int cancelled = 0;
  for (int answers = 0; !imported && answers < 100; ++answers) {
    int calls = 0;
    imported = collection->importDocumentFromPath(file, "paper", [&](double) { return ++calls <= answers; }) != nullptr;
    if (imported) break;
    ++cancelled;
    ASSERT_EQ(collection->documentsCount(), 0u) << answers;
    ASSERT_THAT(packages(), IsEmpty()) << answers;
    ASSERT_EQ(readFile(file), bytes) << answers;
  }
  EXPECT_TRUE(imported);
  EXPECT_GT(cancelled, 1);
  EXPECT_EQ(collection->documentsCount(), 1u);
}

TEST_F(QuiltCollectionDocumentsTest, AnImportWithAnyOneFileOperationFailingIsWholeOrLeavesNothing) {
  const Path file = pdf();
  const std::string bytes = readFile(file);
  const auto files = std::make_shared<platform::FailNthFileManager>(services().files);
  const ScopedService scoped(&Services::files, files);
  int failures = 0;
  for (std::size_t nth = 1; nth < 200; ++nth) {
    files->failNth(nth, ErrorKind::NoSpace);
    const auto document = collection->importDocumentFromPath(file, "paper", nullptr);
    const bool reachedTheEnd = files->operations() < nth;
    files->failNth(0, ErrorKind::NoSpace);

    ASSERT_EQ(readFile(file), bytes) << nth;
    if (!document) {
      ++failures;
      ASSERT_EQ(collection->documentsCount(), 0u) << nth;
      ASSERT_THAT(packages(), IsEmpty()) << nth;
      continue;
    }
    // What failed was not needed for the result: the package opens with its item and the file's content.
    const auto reopened = QuiltDocument::initWithPath(packageOf("paper"));
    ASSERT_TRUE(reopened) << nth;
    ASSERT_EQ(reopened->mediaCount(), 1u) << nth;
    const auto main = reopened->mediaAtIndex(0)->sourceAtIndex(0)->mainDerivative();
    ASSERT_TRUE(main && main->url()) << nth;
    ASSERT_EQ(readFile(main->url()->relativePath()), bytes) << nth;
    collection->removeDocument(document, true);
    ASSERT_THAT(packages(), IsEmpty()) << nth;
    if (reachedTheEnd) {
      EXPECT_GT(failures, 1);
      return;
    }
  }
  FAIL() << "the import never came to its end";
}

TEST_F(QuiltCollectionDocumentsTest, AnImportOnADiskThatFailsForEverReportsItAndKeepsTheFile) {
  const Path file = pdf();
  const std::string bytes = readFile(file);
  const auto files = std::make_shared<platform::FailNthFileManager>(services().files);
  const ScopedService scoped(&Services::files, files);
  for (std::size_t nth = 1; nth < 8; ++nth) {
    std::filesystem::remove_all(packageOf("paper"));
    files->failNth(nth, ErrorKind::InputOutput, platform::FailNthFileManager::Repeat::ForEver);
    takeLines();
    EXPECT_FALSE(collection->importDocumentFromPath(file, "paper", nullptr)) << nth;
    files->failNth(0, ErrorKind::InputOutput);
    EXPECT_EQ(takeLines().back(), critical(cannotCreate(file))) << nth;
    EXPECT_EQ(collection->documentsCount(), 0u) << nth;
    EXPECT_EQ(readFile(file), bytes) << nth;
  }
}

TEST_F(QuiltCollectionDocumentsTest, AnIdentityThatIsNoPlainNameIsRefused) {
  const Path file = pdf();
  for (const std::string& uuid : {std::string("../escape"), std::string("a/b"), std::string("/x"), std::string(".."),
                                  std::string(), std::string("a\0b", 3), std::string(300, 'x')}) {
    EXPECT_FALSE(collection->importDocumentFromPath(file, uuid, nullptr)) << uuid;
    EXPECT_EQ(takeLines(), Lines{critical(cannotCreate(file))}) << uuid;
  }
  EXPECT_THAT(namesIn(folder()), ElementsAre("collection", "paper.pdf"));
  EXPECT_THAT(packages(), IsEmpty());
}

}  // namespace
}  // namespace quilt
