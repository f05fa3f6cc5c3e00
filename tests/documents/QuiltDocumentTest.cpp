// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"
#include "tests/support/PlistByPython.h"

namespace quilt {
namespace {

using platform::PropertyList;
using platform::Services;
using support::critical;
using support::dateOf;
using support::debug;
using support::FaultyFiles;
using support::Installed;
using support::Lines;
using support::treeByPython;
using support::warning;
using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::IsEmpty;

class QuiltDocumentTest : public support::DocumentFixture {
 protected:
  static Dictionary fullRecord() {
    return {{"Version", "1.0"},
            {"UUID", "11111111-2222-4333-8444-555555555555"},
            {"Title", "Tales"},
            {"Description", "Old & new"},
            {"Author", "Ann"},
            {"Keywords", "one, two"},
            {"Category", "Fiction"},
            {"AdvisoryLabel", "Clean"},
            {"jukeboxOrder", 7},
            {"CreationDate", dateOf("2020-01-02T03:04:05Z")},
            {"ModifiedDate", dateOf("2021-01-02T03:04:05Z")},
            {"Type", "Movie"},
            {"LastPublishURL", "https://example.org/tales"}};
  }

  /// What loading the record gives, as text: "Title=Tales".
  static std::vector<std::string> fieldsOf(const QuiltDocument& document) {
    std::vector<std::string> fields;
    const auto text = [&fields](const char* name, const Text& value) {
      fields.push_back(std::string(name) + "=" + value.value_or("none"));
    };
    const auto date = [&text](const char* name, const std::optional<Date>& value) {
      text(name, value ? Text(platform::formatIso8601(*value)) : std::nullopt);
    };
    text("Title", document.title());
    text("Description", document.description());
    text("Author", document.author());
    text("Keywords", document.keywords());
    text("Category", document.category());
    text("AdvisoryLabel", document.advisoryLabel());
    text("jukeboxOrder", std::to_string(document.jukeboxOrder()));
    date("CreationDate", document.creationDate());
    date("ModifiedDate", document.modifiedDate());
    text("Type", document.type());
    text("LastPublishURL", document.lastPublishURL());
    return fields;
  }
};

// ---- A new document

TEST_F(QuiltDocumentTest, AFreshDocumentHasAnIdentityAndNothingElse) {
  const auto document = QuiltDocument::init();
  EXPECT_EQ(document->uuid().size(), 36u);
  EXPECT_NE(document->uuid(), QuiltDocument::init()->uuid());
  EXPECT_EQ(document->path(), Path());
  EXPECT_EQ(document->uti(), std::nullopt);
  EXPECT_THAT(fieldsOf(*document),
              ElementsAre("Title=none", "Description=none", "Author=none", "Keywords=none", "Category=none",
                          "AdvisoryLabel=none", "jukeboxOrder=0", "CreationDate=none", "ModifiedDate=none", "Type=none",
                          "LastPublishURL=none"));
  EXPECT_EQ(document->posterImageVersion(), 1u);
  EXPECT_EQ(document->mediaCount(), 0u);
  EXPECT_EQ(document->theme(), nullptr);
  EXPECT_FALSE(document->isProcessing());
  EXPECT_EQ(document->collectionOwner(), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltDocumentTest, EveryPlaceIsEmptyWithoutAPath) {
  const auto document = QuiltDocument::init();
  for (const Path& place :
       {document->propertiesPath(), document->mediaFolderPath(), document->posterImagePath(),
        document->dataControllerPath(), document->localizationControllerPath(), document->jukeboxArtworkPath(),
        document->jukeboxMetadataPath(), document->glanceThumbnailPath()})
    EXPECT_EQ(place, Path());
}

TEST_F(QuiltDocumentTest, EveryFileHasItsPlaceInThePackage) {
  const auto document = QuiltDocument::init();
  document->setPath("/library/a.qpk");
  EXPECT_EQ(document->propertiesPath(), "/library/a.qpk/properties.plist");
  EXPECT_EQ(document->mediaFolderPath(), "/library/a.qpk/media");
  EXPECT_EQ(document->posterImagePath(), "/library/a.qpk/poster.png");
  EXPECT_EQ(document->dataControllerPath(), "/library/a.qpk/controllers/data.js");
  EXPECT_EQ(document->localizationControllerPath(), "/library/a.qpk/controllers/localizable.js");
  EXPECT_EQ(document->jukeboxArtworkPath(), "/library/a.qpk/JukeboxArtwork");
  EXPECT_EQ(document->jukeboxMetadataPath(), "/library/a.qpk/JukeboxMetadata.plist");
  EXPECT_EQ(document->glanceThumbnailPath(), "/library/a.qpk/Glance/Thumbnail.png");
}

TEST_F(QuiltDocumentTest, ANewPackageIsAnEmptyFolderWithTheDatesOfNow) {
  const Path path = folder() / "deep/down/new.qpk";
  const auto document = QuiltDocument::initWithPath(path);
  ASSERT_NE(document, nullptr);
  EXPECT_EQ(document->path(), path);
  EXPECT_EQ(document->uti(), "qpk");
  EXPECT_EQ(document->creationDate(), clock().now());
  EXPECT_EQ(document->modifiedDate(), clock().now());
  EXPECT_FALSE(document->hasBeenModified());
  EXPECT_THAT(treeOf(path), IsEmpty());
  EXPECT_EQ(takeLines(), Lines{debug("Created new document at \"" + path.native() + "\"")});
}

TEST_F(QuiltDocumentTest, APackageFolderThatCannotBeMadeGivesNoDocument) {
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = support::anyPath();
  EXPECT_EQ(QuiltDocument::initWithPath(package()), nullptr);
  // The second placeholder has lost its percent sign, so the error is not printed.
  EXPECT_EQ(takeLines(), Lines{warning("Failed to create document at path \"" + package().native() + "\": \"@\"")});
  EXPECT_FALSE(std::filesystem::exists(package()));
}

// ---- Kinds of documents

TEST_F(QuiltDocumentTest, MovieAndAudioAreClassic) {
  const auto document = QuiltDocument::init();
  document->setType(kQuiltDocumentTypeClassicMovie);
  EXPECT_TRUE(document->isClassic());
  EXPECT_FALSE(document->isStaticDocument());
  document->setType(kQuiltDocumentTypeClassicAudio);
  EXPECT_TRUE(document->isClassic());
}

TEST_F(QuiltDocumentTest, PdfAndEpubAreStaticDocuments) {
  const auto document = QuiltDocument::init();
  document->setType(kQuiltDocumentTypeFilePDF);
  EXPECT_TRUE(document->isStaticDocument());
  EXPECT_FALSE(document->isClassic());
  document->setType(kQuiltDocumentTypeFileEPUB);
  EXPECT_TRUE(document->isStaticDocument());
}

TEST_F(QuiltDocumentTest, AStaticFileIsNeitherStaticDocumentNorClassic) {
  const auto document = QuiltDocument::init();
  document->setType(kQuiltDocumentTypeStaticFile);
  EXPECT_FALSE(document->isStaticDocument());
  EXPECT_FALSE(document->isClassic());
}

TEST_F(QuiltDocumentTest, ADocumentWithoutTypeIsOfNoKind) {
  const auto document = QuiltDocument::init();
  EXPECT_FALSE(document->isStaticDocument());
  EXPECT_FALSE(document->isClassic());
}

TEST_F(QuiltDocumentTest, NoDocumentSaysThatItIsInteractive) {
  const auto document = QuiltDocument::init();
  for (const char* type :
       {kQuiltDocumentTypeInteractive, kQuiltDocumentTypeClassicMovie, kQuiltDocumentTypeStaticFile}) {
    document->setType(type);
    EXPECT_FALSE(document->isInteractive()) << type;
  }
}

TEST_F(QuiltDocumentTest, TheTypesAndNamesAreThoseOfTheFiles) {
  EXPECT_STREQ(kQuiltDocumentTypeInteractive, "Interactive");
  EXPECT_STREQ(kQuiltDocumentTypeClassicMovie, "Movie");
  EXPECT_STREQ(kQuiltDocumentTypeClassicAudio, "Audio");
  EXPECT_STREQ(kQuiltDocumentTypeFilePDF, "PDF");
  EXPECT_STREQ(kQuiltDocumentTypeFileEPUB, "EPUB");
  EXPECT_STREQ(kQuiltDocumentTypeStaticFile, "Static");
  EXPECT_STREQ(kQuiltDocumentExtension, "qpk");
  EXPECT_STREQ(kQuiltDocumentPropertiesFilename, "properties.plist");
}

// ---- What may be imported

TEST_F(QuiltDocumentTest, TheClassicTypesComeBeforeTheStaticOnes) {
  namespace types = platform::types;
  const std::vector<std::string> classic = {"public.aiff-audio",
                                            "public.aifc-audio",
                                            types::kM4A,
                                            types::kMP3,
                                            types::kMPEG4Audio,
                                            types::kProtectedMPEG4Audio,
                                            types::kMovieContainer,
                                            types::kMPEG4,
                                            types::kMPEG,
                                            types::kProtectedMPEG4Video,
                                            types::kM4V,
                                            "public.3gpp"};
  const std::vector<std::string> documents = {types::kPDF, types::kEPUB, "org.idpf.epub-container"};
  EXPECT_EQ(QuiltDocument::allSupportedClassicImportUTIs(), classic);
  EXPECT_EQ(QuiltDocument::allSupportedStaticDocumentImportUTIs(), documents);
  std::vector<std::string> all = classic;
  all.insert(all.end(), documents.begin(), documents.end());
  EXPECT_EQ(QuiltDocument::allSupportedImportUTIs(), all);
}

TEST_F(QuiltDocumentTest, AnImageOrAMissingFileCannotBeImported) {
  EXPECT_FALSE(QuiltDocument::canImportFromPath(pictureFile(4, 4)));
  EXPECT_FALSE(QuiltDocument::canImportFromPath(folder() / "missing.mp4"));
}

TEST_F(QuiltDocumentTest, APdfCanBeImported) {
  EXPECT_TRUE(QuiltDocument::canImportFromPath(writeFile(folder() / "a.pdf", "%PDF-1.4\n")));
}

// ---- Loading

TEST_F(QuiltDocumentTest, EveryKeyIsReadBack) {
  const auto document = opened(fullRecord());
  ASSERT_NE(document, nullptr);
  EXPECT_EQ(document->uuid(), "11111111-2222-4333-8444-555555555555");
  EXPECT_THAT(
      fieldsOf(*document),
      ElementsAre("Title=Tales", "Description=Old & new", "Author=Ann", "Keywords=one, two", "Category=Fiction",
                  "AdvisoryLabel=Clean", "jukeboxOrder=7", "CreationDate=2020-01-02T03:04:05Z",
                  "ModifiedDate=2021-01-02T03:04:05Z", "Type=Movie", "LastPublishURL=https://example.org/tales"));
  EXPECT_EQ(document->uti(), "qpk");
  EXPECT_FALSE(document->isProcessing());
  EXPECT_EQ(takeLines(), Lines{debug("Loaded document at \"" + package().native() + "\"")});
}

TEST_F(QuiltDocumentTest, AKeyThatIsMissingLeavesItsFieldAlone) {
  const auto complete = fieldsOf(*opened(fullRecord(), "complete"));
  const auto fresh = fieldsOf(*QuiltDocument::init());
  for (const auto& [key, value] : fullRecord()) {
    if (key == "Version" || key == "UUID") continue;
    Dictionary record = fullRecord();
    record.remove(key);
    const auto document = opened(record, "without-" + key);
    ASSERT_NE(document, nullptr) << key;
    std::vector<std::string> expected = complete;
    for (std::size_t i = 0; i < expected.size(); ++i)
      if (expected[i].starts_with(key + "=")) expected[i] = fresh[i];
    EXPECT_EQ(fieldsOf(*document), expected) << key;
  }
}

TEST_F(QuiltDocumentTest, AValueOfTheWrongKindCountsAsMissing) {
  const auto complete = fieldsOf(*opened(fullRecord(), "complete"));
  const auto fresh = fieldsOf(*QuiltDocument::init());
  for (const auto& [key, value] : fullRecord()) {
    if (key == "Version" || key == "UUID") continue;
    for (const PropertyList& wrong : {PropertyList(true), PropertyList(Array{1}), PropertyList(Dictionary{{"a", 1}})}) {
      Dictionary record = fullRecord();
      record.set(key, wrong);
      const auto document = opened(record, "wrong");
      ASSERT_NE(document, nullptr) << key;
      std::vector<std::string> expected = complete;
      for (std::size_t i = 0; i < expected.size(); ++i)
        if (expected[i].starts_with(key + "=")) expected[i] = fresh[i];
      EXPECT_EQ(fieldsOf(*document), expected) << key;
    }
  }
}

TEST_F(QuiltDocumentTest, AUuidOfTheWrongKindKeepsTheFreshIdentity) {
  Dictionary record = fullRecord();
  record.set("UUID", 5);
  EXPECT_EQ(opened(record)->uuid().size(), 36u);
}

TEST_F(QuiltDocumentTest, AFileWithOnlyAVersionLoads) {
  const auto document = opened({});
  ASSERT_NE(document, nullptr);
  EXPECT_EQ(document->uuid().size(), 36u);
  EXPECT_EQ(document->title(), std::nullopt);
  EXPECT_EQ(document->jukeboxOrder(), 0);
  EXPECT_NE(document->uuid(), opened({})->uuid());
}

TEST_F(QuiltDocumentTest, AnotherVersionIsRefusedWithoutALine) {
  for (const PropertyList& version : {PropertyList("1.1"), PropertyList("2.0"), PropertyList(""), PropertyList("1"),
                                      PropertyList(1.0), PropertyList(Array{"1.0"})}) {
    EXPECT_EQ(opened({{"Version", version}, {"Title", "T"}}), nullptr);
    EXPECT_THAT(takeLines(), IsEmpty());
  }
}

TEST_F(QuiltDocumentTest, AFileWithoutVersionIsRefusedWithoutALine) {
  writeRecord(package() / "properties.plist", {{"Title", "T"}});
  EXPECT_EQ(QuiltDocument::initWithPath(package()), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltDocumentTest, AFolderWithoutPropertiesIsNoDocument) {
  std::filesystem::create_directories(package());
  EXPECT_EQ(QuiltDocument::initWithPath(package()), nullptr);
  EXPECT_EQ(takeLines(), Lines{warning("Failed to open document at path \"" + package().native() +
                                       "\": \"Properties file cannot be found\"")});
  EXPECT_THAT(treeOf(package()), IsEmpty());
}

TEST_F(QuiltDocumentTest, AFileInThePackagesPlaceIsNoDocument) {
  writeFile(package(), "a file");
  EXPECT_EQ(QuiltDocument::initWithPath(package()), nullptr);
  EXPECT_EQ(takeLines(), Lines{warning("Failed to open document at path \"" + package().native() +
                                       "\": \"Properties file cannot be found\"")});
  EXPECT_EQ(readFile(package()), "a file");
}

TEST_F(QuiltDocumentTest, APropertiesFileThatCannotBeReadIsReported) {
  for (const char* content :
       {"", "no property list", "<?xml version=\"1.0\"?><plist version=\"1.0\"><array/></plist>"}) {
    writeFile(package() / "properties.plist", content);
    EXPECT_EQ(QuiltDocument::initWithPath(package()), nullptr);
    EXPECT_EQ(takeLines(), Lines{warning("Failed to open document at path \"" + package().native() +
                                         "\": \"Properties file cannot be read\"")});
    EXPECT_EQ(readFile(package() / "properties.plist"), content);
  }
}

TEST_F(QuiltDocumentTest, AFolderInThePropertiesPlaceIsReported) {
  std::filesystem::create_directories(package() / "properties.plist");
  EXPECT_EQ(QuiltDocument::initWithPath(package()), nullptr);
  EXPECT_EQ(takeLines(), Lines{warning("Failed to open document at path \"" + package().native() +
                                       "\": \"Properties file cannot be read\"")});
}

TEST_F(QuiltDocumentTest, APropertiesFileCutShortNeverOpensAsAnotherDocument) {
  const auto document = opened(fullRecord());
  const std::string whole = readFile(package() / "properties.plist");
  for (std::size_t length = 0; length < whole.size(); length += 7) {
    writeFile(package("cut") / "properties.plist", whole.substr(0, length));
    const auto cut = QuiltDocument::initWithPath(package("cut"));
    if (cut) {
      EXPECT_EQ(fieldsOf(*cut), fieldsOf(*document)) << length;
    }
    EXPECT_EQ(readFile(package("cut") / "properties.plist"), whole.substr(0, length));
  }
}

TEST_F(QuiltDocumentTest, MediaThatIsNoArrayDoesNotLoadAndNothingIsDeleted) {
  for (const PropertyList& media : {PropertyList("none"), PropertyList(3), PropertyList(Dictionary{{"0", "a"}})}) {
    writeFile(package() / "media/item/sources/movie.mp4", "movie");
    const Dictionary record = {{"Version", "1.0"}, {"Title", "T"}, {"Media", media}};
    EXPECT_EQ(opened(record), nullptr);
    EXPECT_EQ(takeLines(), Lines{warning("Failed to open document at path \"" + package().native() +
                                         "\": \"Properties file cannot be read\"")});
    EXPECT_EQ(readRecord(package() / "properties.plist"), record);
    EXPECT_EQ(readFile(package() / "media/item/sources/movie.mp4"), "movie");
  }
}

TEST_F(QuiltDocumentTest, ARefusedMediaRecordIsDroppedWithoutALine) {
  const Dictionary good = {{"UUID", "A"}, {"Title", "kept"}};
  const auto document = opened({{"Media", Array{"no record", good, 5, Array{}}}});
  ASSERT_NE(document, nullptr);
  EXPECT_EQ(document->mediaCount(), 1u);
  EXPECT_EQ(document->mediaAtIndex(0)->title(), "kept");
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltDocumentTest, LoadingSavesNothing) {
  const auto document = opened({{"Media", Array{Dictionary{{"UUID", "A"}}}}, {"Title", "T"}});
  ASSERT_NE(document, nullptr);
  EXPECT_EQ(saved(*document),
            (Dictionary{{"Media", Array{Dictionary{{"UUID", "A"}}}}, {"Title", "T"}, {"Version", "1.0"}}));
}

TEST_F(QuiltDocumentTest, LoadedItemsKnowTheirDocument) {
  const auto document = opened({{"Media", Array{Dictionary{{"UUID", "A"}}, Dictionary{{"UUID", "B"}}}}});
  ASSERT_EQ(document->mediaCount(), 2u);
  EXPECT_EQ(document->mediaAtIndex(0)->documentOwner(), document);
  EXPECT_EQ(document->mediaAtIndex(1)->path(), package() / "media/B");
}

TEST_F(QuiltDocumentTest, WhatOutsideReadersAreToldIsIgnoredWhenRead) {
  const auto document = opened({{"DocumentDuration", 99.5}, {"IsFlattened", true}});
  EXPECT_EQ(document->duration(), 0);
  EXPECT_FALSE(document->isFlattened());
  EXPECT_EQ(document->dictionary().real("DocumentDuration"), 0);
  EXPECT_EQ(document->dictionary().boolean("IsFlattened"), false);
}

TEST_F(QuiltDocumentTest, TheThemeIsOpenedFromItsPath) {
  const Path bundle = themeBundle();
  const auto document = opened({{"ThemePath", bundle.native()}});
  ASSERT_NE(document->theme(), nullptr);
  EXPECT_EQ(document->theme()->localizedName(), "Plain");
  EXPECT_EQ(document->dictionary().string("ThemePath"), bundle.native());
}

TEST_F(QuiltDocumentTest, ADocumentLoadsWithoutAThemeThatCannotBeOpened) {
  const auto document = opened({{"ThemePath", (folder() / "missing.qth").native()}, {"Title", "T"}});
  ASSERT_NE(document, nullptr);
  EXPECT_EQ(document->theme(), nullptr);
  EXPECT_EQ(document->title(), "T");
}

TEST_F(QuiltDocumentTest, TheIdentityIsReadWithoutOpening) {
  opened(fullRecord());
  takeLines();
  EXPECT_EQ(QuiltDocument::uuidForDocumentAtPath(package()), "11111111-2222-4333-8444-555555555555");
  EXPECT_EQ(QuiltDocument::uuidForDocumentAtPath(package("missing")), std::nullopt);
  writeFile(package("damaged") / "properties.plist", "damaged");
  EXPECT_EQ(QuiltDocument::uuidForDocumentAtPath(package("damaged")), std::nullopt);
  opened({}, "nameless");
  EXPECT_EQ(QuiltDocument::uuidForDocumentAtPath(package("nameless")), std::nullopt);
}

// ---- The record

TEST_F(QuiltDocumentTest, TheRecordOfAnEmptyDocumentHasTheKeysThatAreAlwaysWritten) {
  const auto document = QuiltDocument::init();
  document->setIsProcessing(true);  // or the fall-back title would save, and the save stamp a date
  const Dictionary record = document->dictionary();
  EXPECT_EQ(record, (Dictionary{{"Version", "1.0"},
                                {"UUID", document->uuid()},
                                {"Title", "Untitled Episode"},
                                {"jukeboxOrder", 0},
                                {"DocumentDuration", 0.0},
                                {"IsFlattened", false}}));
}

TEST_F(QuiltDocumentTest, AnotherReaderSeesTheWholeRecordInItsOrder) {
  const Path bundle = themeBundle();
  const auto document = made();
  document->setIsProcessing(true);
  document->setUuid("DOCUMENT");
  document->setTitle("Tales");
  document->setDescription("<Old> & \"new\" – ünïcode");
  document->setAuthor("Ann");
  document->setKeywords("one, two");
  document->setCategory("Fiction");
  document->setAdvisoryLabel("Clean");
  document->setJukeboxOrder(-9223372036854775807);
  document->setTheme(QuiltTheme::initWithPath(bundle));
  document->setCreationDate(dateOf("2020-01-02T03:04:05Z"));
  document->setType("Movie");
  document->setLastPublishURL("https://example.org/tales");

  const auto item = QuiltMedia::init();
  item->setUuid("ITEM");
  item->setTitle("First");
  item->setDescription("of all");
  document->addMedia(item);

  const auto source = webSource();
  source->setUuid("SOURCE");
  source->setTitle("Link");
  source->setDescription("ignored");
  source->setTimecode(12.25);
  source->derivativeAtIndex(0)->setUuid("DERIVATIVE");
  item->addSource(source);
  const auto preview = QuiltMediaPreview::initWithImageWrapper(picture(20, 10));
  preview->setUuid("PREVIEW");
  preview->setTitle("Still");
  preview->setContent("Text of it");
  preview->setIndex(0);
  preview->setTimecode(3.5);
  source->addPreview(preview);
  const auto samples = QuiltMediaAudioSamples::init();
  samples->setUuid("DERIVATIVE");
  samples->setSourceURL(Url::fileUrl("/outside/sound file.mp3"));
  samples->setSampleURL(Url::fileUrl("/elsewhere/SAMPLES.asc"));
  samples->setIsFlattened(true);
  writeFile(source->audioSamplesFolderPath() / "DERIVATIVE.asc", std::string(1024 * 1024, 's'));
  source->addAudioSamples(samples);

  const auto extra = QuiltMediaExtra::init();
  extra->setUuid("EXTRA");
  item->addExtra(extra);
  const auto commentary = QuiltMediaSource::init();
  commentary->setUuid("COMMENTARY");
  item->setAudioCommentarySource(commentary);
  document->setIsProcessing(false);
  clock().advance(std::chrono::hours(1));
  ASSERT_TRUE(document->update());

  const std::vector<std::string> expected = {
      "Version str 1.0",
      "UUID str DOCUMENT",
      "Title str Tales",
      "Description str <Old> & \"new\" – ünïcode",
      "Author str Ann",
      "Keywords str one, two",
      "Category str Fiction",
      "AdvisoryLabel str Clean",
      "jukeboxOrder int -9223372036854775807",
      "ThemePath str " + bundle.native(),
      "CreationDate datetime 2020-01-02T03:04:05Z",
      "ModifiedDate datetime 2026-03-05T15:07:09Z",
      "Type str Movie",
      "Media list 1",
      "Media.0 dict 12",
      "Media.0.UUID str ITEM",
      "Media.0.Title str First",
      "Media.0.Description str of all",
      "Media.0.Sources list 1",
      "Media.0.Sources.0 dict 11",
      "Media.0.Sources.0.UUID str SOURCE",
      "Media.0.Sources.0.ContentCategory str Web",
      "Media.0.Sources.0.Derivatives list 1",
      "Media.0.Sources.0.Derivatives.0 dict 9",
      "Media.0.Sources.0.Derivatives.0.UUID str DERIVATIVE",
      "Media.0.Sources.0.Derivatives.0.URL str https://example.org/",
      "Media.0.Sources.0.Derivatives.0.ContentType str public.url",
      "Media.0.Sources.0.Derivatives.0.CompatibilityTags list 3",
      "Media.0.Sources.0.Derivatives.0.CompatibilityTags.0 str Desktop",
      "Media.0.Sources.0.Derivatives.0.CompatibilityTags.1 str 720p",
      "Media.0.Sources.0.Derivatives.0.CompatibilityTags.2 str 480p",
      "Media.0.Sources.0.Derivatives.0.IsFlattened bool True",
      "Media.0.Sources.0.Derivatives.0.TotalSizeInMegaBytes float 0.0",
      "Media.0.Sources.0.Derivatives.0.Height float 0.0",
      "Media.0.Sources.0.Derivatives.0.Width float 0.0",
      "Media.0.Sources.0.Derivatives.0.Duration float 0.0",
      "Media.0.Sources.0.Previews list 1",
      "Media.0.Sources.0.Previews.0 dict 10",
      "Media.0.Sources.0.Previews.0.UUID str PREVIEW",
      "Media.0.Sources.0.Previews.0.Title str Still",
      "Media.0.Sources.0.Previews.0.Content str Text of it",
      "Media.0.Sources.0.Previews.0.Index int 0",
      "Media.0.Sources.0.Previews.0.Timecode float 3.5",
      "Media.0.Sources.0.Previews.0.Width float 20.0",
      "Media.0.Sources.0.Previews.0.Height float 10.0",
      "Media.0.Sources.0.Previews.0.IsFlattened bool False",
      "Media.0.Sources.0.Previews.0.Filename str 0.jpg",
      "Media.0.Sources.0.Previews.0.RelativePath str media/ITEM/sources/SOURCE/previews/0.jpg",
      "Media.0.Sources.0.AudioSamples dict 5",
      "Media.0.Sources.0.AudioSamples.UUID str DERIVATIVE",
      "Media.0.Sources.0.AudioSamples.SampleFilename str SAMPLES.asc",
      "Media.0.Sources.0.AudioSamples.SourceURL str file:///outside/sound%20file.mp3",
      "Media.0.Sources.0.AudioSamples.IsFlattened bool True",
      "Media.0.Sources.0.AudioSamples.TotalSizeInMegaBytes float 1.0",
      "Media.0.Sources.0.Title str Link",
      "Media.0.Sources.0.Description str Link",
      "Media.0.Sources.0.Timecode float 12.25",
      "Media.0.Sources.0.IsFlattened bool True",
      "Media.0.Sources.0.TotalSizeInMegaBytes float 1.0",
      "Media.0.Sources.0.Dirty bool False",
      "Media.0.Extras list 1",
      "Media.0.Extras.0 dict 4",
      "Media.0.Extras.0.UUID str EXTRA",
      "Media.0.Extras.0.IsFlattened bool False",
      "Media.0.Extras.0.TotalSizeInMegaBytes float 0.0",
      "Media.0.Extras.0.Dirty bool False",
      "Media.0.AudioCommentarySource dict 4",
      "Media.0.AudioCommentarySource.UUID str COMMENTARY",
      "Media.0.AudioCommentarySource.IsFlattened bool False",
      "Media.0.AudioCommentarySource.TotalSizeInMegaBytes float 0.0",
      "Media.0.AudioCommentarySource.Dirty bool False",
      "Media.0.IsFlattened bool False",
      "Media.0.TotalSizeInMegaBytes float 1.0",
      "Media.0.ContentCategory str Web",
      "Media.0.PosterImagePath str media/ITEM/poster.jpg",
      "Media.0.PosterImageWidth float 20.0",
      "Media.0.PosterImageHeight float 10.0",
      "LastPublishURL str https://example.org/tales",
      "DocumentDuration float 0.0",
      "IsFlattened bool False"};
  EXPECT_THAT(treeByPython(document->propertiesPath()), ElementsAreArray(expected));
}

TEST_F(QuiltDocumentTest, ADocumentIsTheSameAfterSavingAndOpening) {
  const auto document = opened(fullRecord());
  addWebItem(*document, "Link");
  ASSERT_TRUE(document->update());
  const auto again = reopened(*document);
  EXPECT_EQ(fieldsOf(*again), fieldsOf(*document));
  EXPECT_EQ(again->dictionary(), saved(*document));
}

TEST_F(QuiltDocumentTest, WhatANewerVersionWroteIsKeptAtEveryLevelAfterOurs) {
  const auto withNews = [](Dictionary record) {
    record.append("News", Dictionary{{"b", Array{1, "two", true}}, {"a", 2.5}});
    return record;
  };
  const Dictionary derivative = withNews({{"UUID", "D"},
                                          {"URL", "https://example.org/"},
                                          {"ContentType", "public.url"},
                                          {"CompatibilityTags", Array{"Desktop"}},
                                          {"IsFlattened", true}});
  const Dictionary preview = withNews({{"UUID", "P"}, {"Index", 0}});
  const Dictionary samples = withNews({{"UUID", "D"}, {"IsFlattened", true}});
  const Dictionary source = withNews(
      {{"UUID", "S"}, {"Derivatives", Array{derivative}}, {"Previews", Array{preview}}, {"AudioSamples", samples}});
  const Dictionary extra = withNews({{"UUID", "E"}});
  const Dictionary commentary = withNews({{"UUID", "C"}});
  const Dictionary item = withNews(
      {{"UUID", "I"}, {"Sources", Array{source}}, {"Extras", Array{extra}}, {"AudioCommentarySource", commentary}});
  const auto document = opened(withNews({{"UUID", "X"}, {"Media", Array{item}}}));
  ASSERT_NE(document, nullptr);
  document->setTitle("Edited");

  const auto lastOf = [](const Dictionary& record) { return std::prev(record.end()); };
  const Dictionary news = *withNews({}).dictionary("News");
  const auto expectNews = [&](const Dictionary* record, const char* level) {
    ASSERT_NE(record, nullptr) << level;
    EXPECT_EQ(lastOf(*record)->first, "News") << level;
    EXPECT_EQ(*record->dictionary("News"), news) << level;
  };
  const Dictionary record = saved(*document);
  expectNews(&record, "document");
  const Dictionary* savedItem = record.array("Media")->front().as<Dictionary>();
  expectNews(savedItem, "item");
  const Dictionary* savedSource = savedItem->array("Sources")->front().as<Dictionary>();
  expectNews(savedSource, "source");
  expectNews(savedSource->array("Derivatives")->front().as<Dictionary>(), "derivative");
  expectNews(savedSource->array("Previews")->front().as<Dictionary>(), "preview");
  expectNews(savedSource->dictionary("AudioSamples"), "samples");
  expectNews(savedItem->array("Extras")->front().as<Dictionary>(), "extra");
  expectNews(savedItem->dictionary("AudioCommentarySource"), "commentary");
}

TEST_F(QuiltDocumentTest, AMissingTitleBecomesTheFallBackWhenTheRecordIsBuilt) {
  const auto document = made();
  ASSERT_TRUE(document->update());
  EXPECT_EQ(saved(*document).string("Title"), "Untitled Episode");
  EXPECT_EQ(document->title(), "Untitled Episode");
}

TEST_F(QuiltDocumentTest, BuildingTheRecordOfAnUntitledDocumentSavesIt) {
  const auto document = made();
  takeLines();
  document->dictionary();
  EXPECT_EQ(saved(*document).string("Title"), "Untitled Episode");
  EXPECT_EQ(takeLines(), Lines{debug("Updating document because KVO deteched a change for the title")});
}

}  // namespace
}  // namespace quilt
