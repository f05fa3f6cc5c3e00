// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <map>
#include <mutex>
#include <thread>

#include "quilt/collections/QuiltCollection.h"
#include "quilt/platform/testing/ForwardingFileManager.h"
#include "tests/support/FailingAllocation.h"
#include "tests/support/FaultyServices.h"
#include "tests/support/ModelFixture.h"
#include "tests/support/PlistByPython.h"

namespace quilt {
namespace {

using platform::Error;
using platform::ErrorKind;
using platform::Result;
using platform::ScopedService;
using platform::Services;
using platform::services;
using support::critical;
using support::dateOf;
using support::debug;
using support::entriesByPython;
using support::FailingAllocation;
using support::keysByPython;
using support::Lines;
using support::TestClock;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

/// Counts and shows the writes, and fails them when asked.
class WatchedPropertyLists final : public platform::PropertyLists {
 public:
  int writes = 0;
  bool fail = false;
  std::function<void(const Dictionary&)> onWrite;

  Result<platform::PropertyList> parse(std::string_view bytes) const override { return _real->parse(bytes); }
  std::string serialize(const platform::PropertyList& value) const override { return _real->serialize(value); }
  Result<Dictionary> readDictionary(const Path& path) const override { return _real->readDictionary(path); }
  Result<void> writeDictionary(const Dictionary& dictionary, const Path& path) override {
    const std::lock_guard guard(_mutex);
    ++writes;
    if (onWrite) onWrite(dictionary);
    if (fail) return support::kFault;
    return _real->writeDictionary(dictionary, path);
  }

 private:
  std::mutex _mutex;
  std::shared_ptr<platform::PropertyLists> _real = services().propertyLists;
};

/// Fails the operations that a test names.
class FailingFiles final : public platform::ForwardingFileManager {
 public:
  using ForwardingFileManager::ForwardingFileManager;
  bool failCreate = false;
  bool failList = false;
  bool failRemove = false;
  std::vector<Path> asked;  ///< every path that was looked at

  platform::FileKind kindOfItemAtPath(const Path& path) const override {
    const_cast<FailingFiles*>(this)->asked.push_back(path);
    return ForwardingFileManager::kindOfItemAtPath(path);
  }
  Result<void> createDirectoryAtPath(const Path& path) override {
    if (failCreate) return support::kFault;
    return ForwardingFileManager::createDirectoryAtPath(path);
  }
  Result<std::vector<std::string>> contentsOfDirectoryAtPath(const Path& path) const override {
    if (failList) return support::kFault;
    return ForwardingFileManager::contentsOfDirectoryAtPath(path);
  }
  Result<void> removeItem(const Path& path, const Path& within) override {
    if (failRemove) return Error{ErrorKind::PermissionDenied, "Permission denied.", path};
    return ForwardingFileManager::removeItem(path, within);
  }
};

/// A picture that cannot be saved.
class UnsavableImage final : public ImageWrapper {
 public:
  platform::Size size() const override { return {1, 1}; }
  std::shared_ptr<ImageWrapper> convertToSD() const override { return nullptr; }
  std::shared_ptr<ImageWrapper> convertToHD() const override { return nullptr; }
  Result<void> saveAsJPGAtPath(const Path&) const override { return support::kFault; }
  Result<void> saveAsPNGAtURL(const Url&) const override { return support::kFault; }
  Result<platform::Bitmap> bitmap() const override { return support::kFault; }
};

class QuiltCollectionTest : public support::ModelFixture {
 protected:
  Path path() const { return folder() / "collection"; }
  Path file() const { return path() / "collection.plist"; }
  Path poster() const { return path() / "poster.png"; }

  std::shared_ptr<QuiltCollection> made() {
    auto collection = QuiltCollection::initWithPath(path());
    EXPECT_TRUE(collection);
    return collection;
  }
  std::shared_ptr<QuiltCollection> loaded(const Dictionary& record) {
    writeRecord(file(), record);
    return QuiltCollection::initWithPath(path());
  }
  static std::shared_ptr<QuiltDocument> documentModifiedAt(std::optional<Date> date) {
    auto document = QuiltDocument::init();
    document->setModifiedDate(date);
    return document;
  }
  static std::shared_ptr<WatchedPropertyLists> watched() { return std::make_shared<WatchedPropertyLists>(); }
  static std::shared_ptr<FailingFiles> failing() { return std::make_shared<FailingFiles>(services().files); }

  /// A theme bundle that loads.
  Path makeTheme(const std::string& name) {
    const Path bundle = folder() / (name + ".qth");
    writeRecord(bundle / "Info.plist", {{"CFBundleIdentifier", "org.quilt.theme." + name},
                                        {"CFBundleDisplayName", name},
                                        {"CFBundleShortVersionString", "1.0"}});
    std::filesystem::create_directories(bundle / "Resources");
    EXPECT_TRUE(picture(8, 8)->saveAsPNGAtURL(Url::fileUrl(bundle / "Resources/Preview.png")));
    return bundle;
  }

  Dictionary fullRecord() {
    return {{"UUID", "11111111-2222-4333-8444-555555555555"},
            {"CreationDate", dateOf("2020-01-02T03:04:05Z")},
            {"ModifiedDate", dateOf("2021-01-02T03:04:05Z")},
            {"Title", "Tales"},
            {"Description", "Old & new"},
            {"Author", "Ann"},
            {"Copyright", "© Ann"},
            {"Keywords", "one, two"},
            {"Category", "Fiction"},
            {"AdvisoryLabel", "Clean"},
            {"PreferredThemePath", makeTheme("plain").native()},
            {"LastPublishURL", "https://example.org/tales"}};
  }
};
/// What starts threads; run with the thread sanitizer too.
using QuiltCollectionThreadTest = QuiltCollectionTest;

using Setter = void (*)(QuiltCollection&);
/// The properties that a change of saves, with a change.
const std::vector<std::pair<std::string, Setter>> kSavedProperties = {
    {"title", [](QuiltCollection& c) { c.setTitle("x"); }},
    {"description", [](QuiltCollection& c) { c.setDescription("x"); }},
    {"author", [](QuiltCollection& c) { c.setAuthor("x"); }},
    {"copyright", [](QuiltCollection& c) { c.setCopyright("x"); }},
    {"keywords", [](QuiltCollection& c) { c.setKeywords("x"); }},
    {"category", [](QuiltCollection& c) { c.setCategory("x"); }},
    {"advisoryLabel", [](QuiltCollection& c) { c.setAdvisoryLabel("x"); }},
    {"preferredTheme", [](QuiltCollection& c) { c.setPreferredTheme(nullptr); }},
    {"lastPublishURL", [](QuiltCollection& c) { c.setLastPublishURL("x"); }},
};

// What a record must look like after loading, key by key.
using Look = std::optional<std::string> (*)(const QuiltCollection&);
const std::vector<std::pair<std::string, Look>> kLooks = {
    {"UUID", [](const QuiltCollection& c) { return std::optional(c.uuid()); }},
    {"CreationDate",
     [](const QuiltCollection& c) { return std::optional(platform::formatIso8601(c.creationDate().value())); }},
    {"ModifiedDate",
     [](const QuiltCollection& c) -> std::optional<std::string> {
       if (const auto date = c.modifiedDate()) return platform::formatIso8601(*date);
       return std::nullopt;
     }},
    {"Title", [](const QuiltCollection& c) { return c.title(); }},
    {"Description", [](const QuiltCollection& c) { return c.description(); }},
    {"Author", [](const QuiltCollection& c) { return c.author(); }},
    {"Copyright", [](const QuiltCollection& c) { return c.copyright(); }},
    {"Keywords", [](const QuiltCollection& c) { return c.keywords(); }},
    {"Category", [](const QuiltCollection& c) { return c.category(); }},
    {"AdvisoryLabel", [](const QuiltCollection& c) { return c.advisoryLabel(); }},
    {"PreferredThemePath",
     [](const QuiltCollection& c) -> std::optional<std::string> {
       if (const auto theme = c.preferredTheme()) return theme->path().native();
       return std::nullopt;
     }},
    {"LastPublishURL", [](const QuiltCollection& c) { return c.lastPublishURL(); }},
};

// Construction

TEST_F(QuiltCollectionTest, ADetachedCollectionHasAnIdentityACreationDateAndNothingElse) {
  const auto now = dateOf("2026-03-05T14:07:09Z");
  const ScopedService clock(&Services::clock, std::make_shared<TestClock>(now));

  const auto collection = QuiltCollection::init();

  EXPECT_THAT(collection->uuid(), SizeIs(36));
  EXPECT_NE(collection->uuid(), QuiltCollection::init()->uuid());
  EXPECT_EQ(collection->creationDate(), now);
  EXPECT_EQ(collection->modifiedDate(), std::nullopt);
  EXPECT_EQ(collection->path(), Path());
  for (const auto& [key, look] : kLooks) {
    if (key != "UUID" && key != "CreationDate") {
      EXPECT_EQ(look(*collection), std::nullopt) << key;
    }
  }
  EXPECT_EQ(collection->posterImage(), nullptr);
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_EQ(collection->collectionControllerOwner(), nullptr);
  EXPECT_FALSE(collection->isLoading());
  EXPECT_FALSE(collection->hasBeenModified());
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltCollectionTest, ANewFolderHoldsAFileOfExactlyThreeKeys) {
  const auto collection = QuiltCollection::initWithPath(folder() / "a/b/collection");

  ASSERT_TRUE(collection);
  EXPECT_THAT(namesIn(folder() / "a/b/collection"), ElementsAre("collection.plist"));
  EXPECT_THAT(keysByPython(collection->_collectionFilepath()), ElementsAre("UUID", "CreationDate", "ModifiedDate"));
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltCollectionTest, AFolderWithoutACollectionFileIsRefused) {
  std::filesystem::create_directories(path());

  EXPECT_FALSE(QuiltCollection::initWithPath(path()));
  EXPECT_EQ(takeLines(), Lines{warning("Failed to load collection at path \"" + path().native() +
                                       "\": \"Collection dictionary is invalid\"")});
}

TEST_F(QuiltCollectionTest, APlainFileAtThePathIsRefused) {
  writeFile(path(), "text");

  EXPECT_FALSE(QuiltCollection::initWithPath(path()));
  EXPECT_EQ(takeLines(), Lines{warning("Failed to load collection at path \"" + path().native() +
                                       "\": \"Collection dictionary is invalid\"")});
}

TEST_F(QuiltCollectionTest, AFileThatIsNoDictionaryIsRefusedAndKept) {
  for (const std::string text : {"", "<plist", "<plist version=\"1.0\"><array/></plist>", "no property list"}) {
    writeFile(file(), text);
    EXPECT_FALSE(QuiltCollection::initWithPath(path()));
    EXPECT_EQ(takeLines(), Lines{warning("Failed to load collection at path \"" + path().native() +
                                         "\": \"Collection dictionary is invalid\"")});
    EXPECT_EQ(readFile(file()), text);
  }
}

TEST_F(QuiltCollectionTest, AFileCutAtAnyLengthLoadsOrIsReportedAndStays) {
  writeRecord(file(), fullRecord());
  const std::string whole = readFile(file());
  for (std::size_t length = 0; length < whole.size(); ++length) {
    writeFile(file(), whole.substr(0, length));
    const auto collection = QuiltCollection::initWithPath(path());
    const Lines problems = takeProblems();
    if (!collection) {
      ASSERT_EQ(problems, Lines{warning("Failed to load collection at path \"" + path().native() +
                                        "\": \"Collection dictionary is invalid\"")})
          << length;
    }
    ASSERT_EQ(readFile(file()), whole.substr(0, length)) << length;
  }
}

TEST_F(QuiltCollectionTest, AFileWithAnyByteFlippedLoadsOrIsReportedAndStays) {
  Dictionary record = fullRecord();
  record.remove("PreferredThemePath");
  writeRecord(file(), record);
  const std::string whole = readFile(file());
  for (std::size_t at = 0; at < whole.size(); ++at) {
    std::string damaged = whole;
    damaged[at] = static_cast<char>(damaged[at] ^ 0x15);
    writeFile(file(), damaged);
    const auto collection = QuiltCollection::initWithPath(path());
    const Lines problems = takeProblems();
    if (!collection) {
      ASSERT_EQ(problems, Lines{warning("Failed to load collection at path \"" + path().native() +
                                        "\": \"Collection dictionary is invalid\"")})
          << at;
    } else {
      ASSERT_THAT(problems, IsEmpty()) << at;
    }
    ASSERT_EQ(readFile(file()), damaged) << at;
  }
}

TEST_F(QuiltCollectionTest, AFolderThatCannotBeMadeGivesNone) {
  const auto files = failing();
  const ScopedService scoped(&Services::files, files);
  files->failCreate = true;

  EXPECT_FALSE(QuiltCollection::initWithPath(path()));
  EXPECT_EQ(takeLines(),
            Lines{critical("Failed to create collection at path \"" + path().native() + "\": \"The disk is full.\"")});
}

TEST_F(QuiltCollectionTest, AFirstSaveThatFailsGivesNone) {
  const auto lists = watched();
  const ScopedService scoped(&Services::propertyLists, lists);
  lists->fail = true;

  EXPECT_FALSE(QuiltCollection::initWithPath(path()));
  EXPECT_EQ(takeLines(), (Lines{critical("Failed to update collection at path \"" + file().native() + "\""),
                                critical("Failed to create collection at path \"" + path().native() + "\"")}));
}

TEST_F(QuiltCollectionTest, AFolderThatCannotBeListedGivesNone) {
  made();
  takeLines();
  const auto files = failing();
  const ScopedService scoped(&Services::files, files);
  files->failList = true;

  EXPECT_FALSE(QuiltCollection::initWithPath(path()));
  EXPECT_EQ(takeLines(),
            (Lines{debug("Loading collection \"(null)\"..."),
                   warning("Failed to load collection at path \"" + path().native() + "\": \"The disk is full.\"")}));
}

TEST_F(QuiltCollectionTest, DocumentsOfADetachedCollectionCannotBeLoaded) {
  EXPECT_FALSE(QuiltCollection::init()->_loadDocuments());
  EXPECT_EQ(takeLines(), Lines{critical("Failed to load collection: \"Collection path is invalid\"")});
}

// The record

TEST_F(QuiltCollectionTest, AFullRecordLoadsAndIsWrittenInOrder) {
  const Dictionary record = fullRecord();
  const auto collection = loaded(record);
  ASSERT_TRUE(collection);
  EXPECT_EQ(takeLines(), Lines{debug("Loading collection \"Tales\"...")});

  const ScopedService clock(&Services::clock, std::make_shared<TestClock>(dateOf("2026-03-05T14:07:09Z")));
  ASSERT_TRUE(collection->update());

  EXPECT_THAT(entriesByPython(file()),
              ElementsAre("UUID str 11111111-2222-4333-8444-555555555555", "CreationDate datetime 2020-01-02T03:04:05Z",
                          "ModifiedDate datetime 2026-03-05T14:07:09Z", "Title str Tales", "Description str Old & new",
                          "Author str Ann", "Copyright str © Ann", "Keywords str one, two", "Category str Fiction",
                          "AdvisoryLabel str Clean", "PreferredThemePath str " + (folder() / "plain.qth").native(),
                          "LastPublishURL str https://example.org/tales"));
}

TEST_F(QuiltCollectionTest, AFileWithOnlyATitleKeepsTheFreshIdentityAndTheLoadingTime) {
  const auto now = dateOf("2026-03-05T14:07:09Z");
  const ScopedService clock(&Services::clock, std::make_shared<TestClock>(now));
  const auto lists = watched();
  const ScopedService scoped(&Services::propertyLists, lists);

  const auto collection = loaded({{"Title", "Tales"}});

  ASSERT_TRUE(collection);
  EXPECT_THAT(collection->uuid(), SizeIs(36));
  EXPECT_EQ(collection->creationDate(), now);
  EXPECT_EQ(collection->modifiedDate(), std::nullopt);
  EXPECT_EQ(collection->title(), "Tales");
  EXPECT_EQ(lists->writes, 0);
}

TEST_F(QuiltCollectionTest, EachKeyMayBeMissing) {
  const auto now = dateOf("2026-03-05T14:07:09Z");
  const ScopedService clock(&Services::clock, std::make_shared<TestClock>(now));
  const auto whole = loaded(fullRecord());
  for (const auto& [missing, unused] : kLooks) {
    Dictionary record = fullRecord();
    record.remove(missing);
    const auto collection = loaded(record);
    ASSERT_TRUE(collection) << missing;
    for (const auto& [key, look] : kLooks) {
      if (key != missing) {
        EXPECT_EQ(look(*collection), look(*whole)) << key << " without " << missing;
      } else if (key == "UUID") {
        EXPECT_NE(look(*collection), look(*whole));
        EXPECT_THAT(collection->uuid(), SizeIs(36));
      } else if (key == "CreationDate") {
        EXPECT_EQ(collection->creationDate(), now);
      } else {
        EXPECT_EQ(look(*collection), std::nullopt) << key;
      }
    }
  }
}

TEST_F(QuiltCollectionTest, AValueOfTheWrongKindCountsAsMissing) {
  const auto now = dateOf("2026-03-05T14:07:09Z");
  const ScopedService clock(&Services::clock, std::make_shared<TestClock>(now));
  for (const auto& [wrong, look] : kLooks) {
    Dictionary record = fullRecord();
    record.set(wrong, 7);
    const auto collection = loaded(record);
    ASSERT_TRUE(collection) << wrong;
    if (wrong == "UUID")
      EXPECT_THAT(collection->uuid(), SizeIs(36));
    else if (wrong == "CreationDate")
      EXPECT_EQ(collection->creationDate(), now);
    else
      EXPECT_EQ(look(*collection), std::nullopt) << wrong;
    EXPECT_THAT(takeProblems(), IsEmpty());
  }
}

TEST_F(QuiltCollectionTest, UnknownKeysAreWrittenBackAfterOurs) {
  Dictionary record{{"Shelf", Dictionary{{"Row", 3}, {"Warm", true}}}, {"Title", "Tales"}, {"Spine", 1.5}};
  const auto collection = loaded(record);
  ASSERT_TRUE(collection);

  collection->setAuthor("Ann");

  EXPECT_THAT(keysByPython(file()),
              ElementsAre("UUID", "CreationDate", "ModifiedDate", "Title", "Author", "Shelf", "Spine"));
  const Dictionary written = readRecord(file());
  EXPECT_EQ(*written.find("Shelf"), *record.find("Shelf"));
  EXPECT_EQ(*written.find("Spine"), *record.find("Spine"));
}

TEST_F(QuiltCollectionTest, AVanishedThemeLoadsAsNoneAndTheNextSaveDropsTheKey) {
  const Path theme = folder() / "gone.qth";
  const auto collection = loaded({{"Title", "Tales"}, {"PreferredThemePath", theme.native()}});
  ASSERT_TRUE(collection);
  EXPECT_EQ(collection->preferredTheme(), nullptr);
  // The theme's own complaint, and nothing of the collection's.
  EXPECT_EQ(takeProblems(), Lines{warning("Theme bundle \"" + theme.native() + "\" is an invalid bundle.")});

  ASSERT_TRUE(collection->update());

  EXPECT_THAT(keysByPython(file()), ElementsAre("UUID", "CreationDate", "ModifiedDate", "Title"));
}

TEST_F(QuiltCollectionTest, ATextWithoutContentIsWritten) {
  const auto collection = made();
  collection->setTitle("");
  EXPECT_EQ(readRecord(file()).string("Title"), "");
  collection->setTitle(std::nullopt);
  EXPECT_FALSE(readRecord(file()).contains("Title"));
}

// Saving

TEST_F(QuiltCollectionTest, SettingTheTitleSavesWithANewStamp) {
  const auto clock = std::make_shared<TestClock>(dateOf("2026-03-05T14:07:09Z"));
  const ScopedService scoped(&Services::clock, clock);
  const auto collection = made();
  clock->advance(std::chrono::minutes(1));

  collection->setTitle("Tales");

  EXPECT_EQ(readRecord(file()).string("Title"), "Tales");
  EXPECT_EQ(readRecord(file()).date("ModifiedDate"), dateOf("2026-03-05T14:08:09Z"));
  EXPECT_EQ(readRecord(file()).date("CreationDate"), dateOf("2026-03-05T14:07:09Z"));
}

TEST_F(QuiltCollectionTest, SettingTheTitleWhileLoadingDoesNotSave) {
  const auto collection = made();
  const std::string before = readFile(file());
  collection->setIsLoading(true);

  collection->setTitle("Tales");
  EXPECT_TRUE(collection->update());

  EXPECT_EQ(readFile(file()), before);
}

TEST_F(QuiltCollectionTest, EachDescriptivePropertySavesOnceAlsoWhenItsValueStays) {
  const auto lists = watched();
  const ScopedService scoped(&Services::propertyLists, lists);
  const auto collection = made();
  for (const auto& [key, set] : kSavedProperties)
    for (int i = 0; i < 2; ++i) {
      lists->writes = 0;
      set(*collection);
      EXPECT_EQ(lists->writes, 1) << key;
    }
}

TEST_F(QuiltCollectionTest, SettingTheIdentityOrTheCreationDateReachesTheDiskWithTheNextSave) {
  const auto collection = made();
  const std::string before = readFile(file());
  collection->setUuid("11111111-2222-4333-8444-555555555555");
  collection->setCreationDate(dateOf("2020-01-02T03:04:05Z"));
  EXPECT_EQ(readFile(file()), before);

  ASSERT_TRUE(collection->update());

  EXPECT_EQ(readRecord(file()).string("UUID"), "11111111-2222-4333-8444-555555555555");
  EXPECT_EQ(readRecord(file()).date("CreationDate"), dateOf("2020-01-02T03:04:05Z"));
}

TEST_F(QuiltCollectionTest, OtherChangesDoNotSave) {
  const auto lists = watched();
  const ScopedService scoped(&Services::propertyLists, lists);
  const auto collection = made();
  lists->writes = 0;

  collection->setModifiedDate(dateOf("2020-01-02T03:04:05Z"));
  collection->setPath(collection->path());
  collection->setPosterImage(picture(4, 4));
  const auto document = QuiltDocument::init();
  collection->addDocument(document);
  collection->removeDocument(document, false);

  EXPECT_EQ(lists->writes, 0);
}

TEST_F(QuiltCollectionTest, AFileThatCannotBeWrittenIsReportedAndThePropertiesKeepTheirValues) {
  const auto lists = watched();
  const ScopedService scoped(&Services::propertyLists, lists);
  const auto collection = made();
  const std::string before = readFile(file());
  lists->fail = true;

  collection->setTitle("Tales");

  EXPECT_EQ(takeLines(), Lines{critical("Failed to update collection at path \"" + file().native() + "\"")});
  EXPECT_FALSE(collection->update());
  EXPECT_EQ(collection->title(), "Tales");
  EXPECT_EQ(readFile(file()), before);
  EXPECT_THAT(namesIn(path()), ElementsAre("collection.plist"));
}

TEST_F(QuiltCollectionTest, ARecordThatMemoryDoesNotSufficeForIsReportedWithAFullStop) {
  const auto collection = loaded(fullRecord());
  ASSERT_TRUE(collection);
  const std::string before = readFile(file());
  takeLines();
  // The allocations of the record are in the middle: some before it (the stamp, the path), the writing after it.
  bool reported = false;
  for (std::size_t nth = 1; nth < 10000 && !reported; ++nth) {
    bool updated = false;
    try {
      const FailingAllocation failing(nth);
      updated = collection->update();
    } catch (const std::bad_alloc&) {
      continue;  // before the record was begun
    }
    ASSERT_FALSE(updated) << "no allocation of the record was reached";
    reported = true;
  }
  EXPECT_TRUE(reported);
  EXPECT_EQ(takeLines(), Lines{critical("Failed to update collection at path \"" + file().native() + "\".")});
  EXPECT_EQ(readFile(file()), before);
  EXPECT_TRUE(collection->update());
  EXPECT_EQ(keysByPython(file()).size(), kLooks.size());
}

TEST_F(QuiltCollectionTest, ADetachedCollectionHasNoPlaceToSaveTo) {
  const Path previous = std::filesystem::current_path();
  std::filesystem::current_path(folder());
  const auto collection = QuiltCollection::init();

  EXPECT_FALSE(collection->update());
  collection->setTitle("Tales");
  std::filesystem::current_path(previous);

  EXPECT_EQ(takeLines(), (Lines{critical("Failed to update collection at path \"(null)\""),
                                critical("Failed to update collection at path \"(null)\"")}));
  EXPECT_EQ(collection->title(), "Tales");
  EXPECT_THAT(namesIn(folder()), IsEmpty());
  EXPECT_EQ(collection->_collectionFilepath(), Path());
  EXPECT_EQ(collection->_posterImageFilepath(), Path());
  EXPECT_EQ(collection->posterImagePath(), Path());
}

TEST_F(QuiltCollectionThreadTest, SavesOfSeveralThreadsNeverPutAnOlderStateOverANewerOne) {
  const auto lists = watched();
  const ScopedService scoped(&Services::propertyLists, lists);
  const auto collection = made();
  std::map<std::string, int> newest;
  bool wentBack = false;
  lists->onWrite = [&](const Dictionary& record) {
    for (const char* key : {"Title", "Author", "Keywords"}) {
      const int value = std::stoi(record.string(key).value_or("0"));
      wentBack = wentBack || value < newest[key];
      newest[key] = value;
    }
  };
  const auto repeat = [](const auto& set) {
    for (int i = 0; i <= 60; ++i) set(std::to_string(i));
  };
  std::vector<std::thread> threads;
  threads.emplace_back([&] { repeat([&](const std::string& text) { collection->setTitle(text); }); });
  threads.emplace_back([&] { repeat([&](const std::string& text) { collection->setAuthor(text); }); });
  threads.emplace_back([&] { repeat([&](const std::string& text) { collection->setKeywords(text); }); });
  for (std::thread& thread : threads) thread.join();

  EXPECT_FALSE(wentBack);
  const Dictionary record = readRecord(file());
  EXPECT_EQ(record.string("Title"), "60");
  EXPECT_EQ(record.string("Author"), "60");
  EXPECT_EQ(record.string("Keywords"), "60");
  EXPECT_THAT(namesIn(path()), ElementsAre("collection.plist"));
}

// Dates

TEST_F(QuiltCollectionTest, ADifferenceOfLessThanASecondIsNoModification) {
  const auto collection = QuiltCollection::init();
  const Date created = dateOf("2026-03-05T14:07:09Z");
  collection->setCreationDate(created);
  for (const int sign : {1, -1}) {
    collection->setModifiedDate(created + sign * std::chrono::milliseconds(900));
    EXPECT_FALSE(collection->hasBeenModified());
    collection->setModifiedDate(created + sign * std::chrono::milliseconds(1000));
    EXPECT_TRUE(collection->hasBeenModified());
  }
}

TEST_F(QuiltCollectionTest, TheLatestDocumentStampIsTheModificationDateAndIsWritten) {
  const ScopedService clock(&Services::clock, std::make_shared<TestClock>(dateOf("2026-03-05T14:07:09Z")));
  const auto collection = made();
  collection->addDocument(documentModifiedAt(dateOf("2027-01-01T00:00:00Z")));
  collection->addDocument(documentModifiedAt(dateOf("2029-01-01T00:00:00Z")));
  collection->addDocument(documentModifiedAt(dateOf("2028-01-01T00:00:00Z")));

  EXPECT_EQ(collection->modifiedDate(), dateOf("2029-01-01T00:00:00Z"));
  ASSERT_TRUE(collection->update());
  EXPECT_EQ(readRecord(file()).date("ModifiedDate"), dateOf("2029-01-01T00:00:00Z"));
}

TEST_F(QuiltCollectionTest, TheOwnStampIsTheModificationDateWhenItIsLater) {
  const auto collection = made();
  collection->setModifiedDate(dateOf("2029-01-01T00:00:00Z"));
  collection->addDocument(documentModifiedAt(dateOf("2027-01-01T00:00:00Z")));
  EXPECT_EQ(collection->modifiedDate(), dateOf("2029-01-01T00:00:00Z"));
}

TEST_F(QuiltCollectionTest, ADocumentWithoutADateStartsTheSearchForTheLatestAnew) {
  const auto collection = made();
  collection->setModifiedDate(dateOf("2020-01-01T00:00:00Z"));
  collection->addDocument(documentModifiedAt(dateOf("2029-01-01T00:00:00Z")));
  collection->addDocument(documentModifiedAt(std::nullopt));
  EXPECT_EQ(collection->modifiedDate(), dateOf("2020-01-01T00:00:00Z"));
  collection->addDocument(documentModifiedAt(dateOf("2027-01-01T00:00:00Z")));
  EXPECT_EQ(collection->modifiedDate(), dateOf("2027-01-01T00:00:00Z"));
}

TEST_F(QuiltCollectionTest, WithoutAnOwnStampThereIsNoModificationDate) {
  const auto collection = QuiltCollection::init();
  collection->addDocument(documentModifiedAt(dateOf("2027-01-01T00:00:00Z")));
  EXPECT_EQ(collection->modifiedDate(), std::nullopt);
  EXPECT_FALSE(collection->hasBeenModified());
}

TEST_F(QuiltCollectionTest, ResettingTheModificationDateSavesWithAFreshStamp) {
  const auto clock = std::make_shared<TestClock>(dateOf("2026-03-05T14:07:09Z"));
  const ScopedService scoped(&Services::clock, clock);
  const auto collection = made();
  clock->advance(std::chrono::hours(1));

  collection->resetModifiedDate();

  EXPECT_EQ(collection->modifiedDate(), dateOf("2026-03-05T15:07:09Z"));
  EXPECT_EQ(readRecord(file()).date("ModifiedDate"), dateOf("2026-03-05T15:07:09Z"));
}

TEST_F(QuiltCollectionTest, ResettingTheModificationDateWhileLoadingKeepsTheCreationDate) {
  const auto collection = made();
  collection->setIsLoading(true);
  collection->setCreationDate(dateOf("2001-01-01T00:00:00Z"));
  ASSERT_TRUE(collection->hasBeenModified());
  collection->resetModifiedDate();
  EXPECT_EQ(collection->modifiedDate(), dateOf("2001-01-01T00:00:00Z"));
  EXPECT_FALSE(collection->hasBeenModified());
}

// Observation

TEST_F(QuiltCollectionTest, TheModificationDateDependsOnTheDocuments) {
  EXPECT_THAT(QuiltCollection::keyPathsForValuesAffectingModifiedDate(), ElementsAre("documents"));
  const auto collection = made();
  const auto document = documentModifiedAt(dateOf("2029-01-01T00:00:00Z"));
  std::vector<std::string> seen;
  const auto note = [&](const platform::ChangeNotice& notice) {
    const bool before = notice.phase == platform::ChangePhase::Will;
    seen.push_back((before ? "will " : "did ") + std::string(notice.key) + " " +
                   std::to_string(collection->documentsCount()));
  };
  const auto dates = collection->observe("modifiedDate", note, platform::ObservationOptions::Prior);
  const auto documents = collection->observe("documents", note, platform::ObservationOptions::Prior);

  collection->addDocument(document);
  EXPECT_THAT(seen, ElementsAre("will documents 0", "will modifiedDate 0", "did documents 1", "did modifiedDate 1"));
  seen.clear();
  collection->removeDocument(document, false);
  EXPECT_THAT(seen, ElementsAre("will documents 1", "will modifiedDate 1", "did documents 0", "did modifiedDate 0"));
}

TEST_F(QuiltCollectionThreadTest, AListChangeOnAWorkerIsSeenOnTheMainThread) {
  const auto collection = made();
  std::vector<bool> onMain;
  const auto observation = collection->observe(
      "modifiedDate", [&](const platform::ChangeNotice&) { onMain.push_back(platform::MainThread::isCurrent()); });

  std::atomic<bool> done = false;
  std::thread worker([&] {
    collection->addDocument(QuiltDocument::init());
    done = true;
    platform::MainThread::signal();
  });
  while (!done) platform::MainThread::waitAndRunQueuedBlocks();
  worker.join();

  EXPECT_THAT(onMain, ElementsAre(true));
}

// Poster image

TEST_F(QuiltCollectionTest, ClearingAPosterThatIsNotThereDoesNothing) {
  const auto collection = made();
  collection->setPosterImage(nullptr);
  EXPECT_THAT(namesIn(path()), ElementsAre("collection.plist"));
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltCollectionTest, ThePosterIsWrittenAsPNG) {
  const auto collection = made();
  EXPECT_EQ(collection->posterImagePath(), Path());
  const std::string record = readFile(file());

  collection->setPosterImage(picture(30, 20));

  EXPECT_TRUE(readFile(poster()).starts_with("\x89PNG\r\n\x1a\n"));
  EXPECT_EQ(collection->posterImagePath(), poster());
  ASSERT_TRUE(collection->posterImage());
  EXPECT_EQ(collection->posterImage()->size(), (platform::Size{30, 20}));
  EXPECT_EQ(readFile(file()), record);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltCollectionTest, ThePosterIsReadFromItsFileOnFirstUse) {
  made()->setPosterImage(picture(30, 20));

  const auto collection = QuiltCollection::initWithPath(path());

  ASSERT_TRUE(collection);
  const auto image = collection->posterImage();
  ASSERT_TRUE(image);
  EXPECT_EQ(image->size(), (platform::Size{30, 20}));
  EXPECT_EQ(collection->posterImage(), image);
}

TEST_F(QuiltCollectionTest, ThePosterOutlivesTheFileThatItWasTakenFrom) {
  const Path photo = folder() / "photo.png";
  ASSERT_TRUE(picture(30, 20)->saveAsPNGAtURL(Url::fileUrl(photo)));
  const auto collection = made();
  collection->setPosterImage(ImageWrapper::imageWithPath(photo));
  std::filesystem::remove(photo);

  const auto image = collection->posterImage();

  ASSERT_TRUE(image);
  const auto pixels = image->bitmap();
  ASSERT_TRUE(pixels);
  EXPECT_EQ(pixels->width, 30u);
}

TEST_F(QuiltCollectionTest, ClearingThePosterDeletesItsFile) {
  const auto collection = made();
  collection->setPosterImage(picture(30, 20));
  collection->setPosterImage(nullptr);
  EXPECT_THAT(namesIn(path()), ElementsAre("collection.plist"));
  EXPECT_EQ(collection->posterImage(), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltCollectionTest, APosterThatCannotBeWrittenIsReportedWithTheCollectionFile) {
  const auto collection = made();
  collection->setPosterImage(picture(30, 20));
  const std::string before = readFile(poster());

  collection->setPosterImage(std::make_shared<UnsavableImage>());

  EXPECT_EQ(takeLines(),
            Lines{critical("Failed to update poster image for collection at path \"" + file().native() + "\"")});
  EXPECT_EQ(readFile(poster()), before);
  // The cache is empty: the old poster is read from its file again.
  EXPECT_EQ(collection->posterImage()->size(), (platform::Size{30, 20}));
}

TEST_F(QuiltCollectionTest, APosterThatCannotBeDeletedIsReportedAndStays) {
  const auto collection = made();
  collection->setPosterImage(picture(30, 20));
  const auto files = failing();
  const ScopedService scoped(&Services::files, files);
  files->failRemove = true;

  collection->setPosterImage(nullptr);

  EXPECT_EQ(takeLines(),
            Lines{critical("Failed to clear poster image: Permission denied. (" + poster().native() + ")")});
  EXPECT_TRUE(std::filesystem::exists(poster()));
}

TEST_F(QuiltCollectionTest, ADetachedCollectionKeepsNoPoster) {
  const Path previous = std::filesystem::current_path();
  std::filesystem::current_path(folder());
  const auto collection = QuiltCollection::init();
  collection->setPosterImage(picture(4, 4));
  EXPECT_EQ(collection->posterImage(), nullptr);
  collection->setPosterImage(nullptr);
  std::filesystem::current_path(previous);
  EXPECT_THAT(namesIn(folder()), IsEmpty());
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltCollectionTest, SettingThePosterAnnouncesItOnce) {
  const auto collection = made();
  std::vector<bool> hasPoster;
  const auto observation = collection->observe(
      "posterImage", [&](const platform::ChangeNotice&) { hasPoster.push_back(collection->posterImage() != nullptr); });
  collection->setPosterImage(picture(4, 4));
  collection->setPosterImage(nullptr);
  EXPECT_THAT(hasPoster, ElementsAre(true, false));
}

TEST_F(QuiltCollectionTest, ReleasingACollectionKeepsItsPosterFile) {
  made()->setPosterImage(picture(4, 4));
  EXPECT_TRUE(std::filesystem::exists(poster()));
}

// Documents in the folder

TEST_F(QuiltCollectionTest, DocumentsAreLoadedWhateverTheirExtensionAndWhatIsNoneIsPassedOver) {
  const auto collection = made();
  writeRecord(path() / "one.qpk/properties.plist", {{"Version", "1.0"}, {"UUID", "one"}});
  writeRecord(path() / "two/properties.plist", {{"Version", "1.0"}, {"UUID", "two"}});
  writeRecord(path() / "other.qpk/properties.plist", {{"Version", "2.0"}, {"UUID", "other"}});
  writeFile(path() / "notes.txt", "text");
  takeLines();

  const auto loadedAgain = QuiltCollection::initWithPath(path());

  ASSERT_TRUE(loadedAgain);
  EXPECT_EQ(loadedAgain->documentsCount(), 2u);
  ASSERT_TRUE(loadedAgain->documentWithUUID("one"));
  ASSERT_TRUE(loadedAgain->documentWithUUID("two"));
  EXPECT_EQ(loadedAgain->documentWithUUID("one")->collectionOwner(), loadedAgain);
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltCollectionTest, HiddenNamesAreNeverOfferedToTheDocumentLoader) {
  made();
  const Path hidden = path() / ".hidden.qpk";
  writeRecord(hidden / "properties.plist", {{"Version", "1.0"}, {"UUID", "hidden"}});
  takeLines();
  const auto files = failing();
  const ScopedService scoped(&Services::files, files);

  const auto collection = QuiltCollection::initWithPath(path());

  ASSERT_TRUE(collection);
  EXPECT_EQ(collection->documentsCount(), 0u);
  for (const Path& asked : files->asked) EXPECT_FALSE(asked.native().starts_with(hidden.native())) << asked;
  EXPECT_EQ(takeLines(), Lines{debug("Loading collection \"(null)\"...")});
}

TEST_F(QuiltCollectionTest, InvalidatingCachesReachesEveryDocument) {
  const auto collection = made();
  const auto one = QuiltDocument::init();
  const auto two = QuiltDocument::init();
  for (const auto& document : {one, two}) collection->addDocument(document);
  int dropped = 0;
  const auto count = [&](const platform::ChangeNotice&) { ++dropped; };
  const auto first = one->observe("posterImage", count);
  const auto second = two->observe("posterImage", count);

  collection->invalidateCaches();

  EXPECT_EQ(dropped, 2);
}

}  // namespace
}  // namespace quilt
