// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <map>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using support::Lines;
using support::warning;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

/// Packages from strangers: whatever their records and links say, no operation reads, writes or deletes anything
/// outside of the package.
class QuiltDocumentHostileTest : public support::DocumentFixture {
 protected:
  QuiltDocumentHostileTest() {
    // What the packages point at: laid out so that a path that escapes finds what it is looking for.
    for (const char* name : {"media", "sources", "derivatives", "previews", "audiosamples", "controllers", "Glance"})
      writeFile(outside() / name / "precious", name);
    writeFile(outside() / "ITEM/sources/SOURCE/precious", "item");
    writePicture(outside() / "picture.png");
    writePicture(outside() / "poster.png");
    writePicture(outside() / "poster.jpg");
    writePicture(outside() / "0.jpg");
    writePicture(outside() / "Thumbnail.png");
    writeFile(outside() / "DERIVATIVE.asc", "samples");
    writeFile(folder() / "precious", "beside the package");
  }

  Path outside() const { return folder() / "outside"; }

  static void writePicture(const Path& file) {
    const bool isJpeg = file.extension() == ".jpg";
    const auto image = picture(11, 7);
    ASSERT_TRUE((isJpeg ? image->saveAsJPGAtPath(file) : image->saveAsPNGAtURL(Url::fileUrl(file))).hasValue());
  }

  /// Every file of the test's folder that does not lie in the package, with a digest of its content.
  std::map<std::string, std::size_t> world() const {
    std::map<std::string, std::size_t> files;
    for (auto entry = std::filesystem::recursive_directory_iterator(folder());
         entry != std::filesystem::recursive_directory_iterator(); ++entry) {
      if (entry->path() == package()) {
        entry.disable_recursion_pending();
        continue;
      }
      const bool isFile = entry->is_regular_file() && !entry->is_symlink();
      files[entry->path().native()] = isFile ? std::hash<std::string>()(readFile(entry->path())) : 0;
    }
    return files;
  }

  /// Everything that a host may do with a document, one after the other.
  static void exercise(const std::shared_ptr<QuiltDocument>& document) {
    document->posterImage();
    document->update();
    document->glanceUpdate();
    document->removeAllBrokenMedia();
    document->removeAllBrokenMediaExtra();
    for (const auto& item : document->media()) {
      item->posterImage();
      for (const auto& source : item->sources()) {
        source->thumbnailImage();
        for (const auto& preview : source->previews()) {
          preview->image();
          preview->setIsFlattened(false);
        }
      }
    }
    document->flattenWithProgressionBlock({});
    document->convertToFormat("480p", {});
    document->finalizeWithProgressionBlock({});
    document->invalidateCaches();
    document->reload();
    document->updatePosterImage(picture(5, 5));
    for (const auto& item : document->media()) {
      item->invalidatePosterImage();
      for (const auto& source : item->sources()) source->setDirty(true);
      item->removeAllSources();
      item->removeAllExtras();
    }
    document->removeAllEmptyMedia();
    document->removeAllMedia();
    document->update();
  }

  static Dictionary derivativeRecord(const std::string& filename = "DERIVATIVE.png") {
    return {{"UUID", "DERIVATIVE"},
            {"Filename", filename},
            {"ContentType", "public.png"},
            {"CompatibilityTags", Array{"Desktop"}},
            {"IsFlattened", true}};
  }
  static Dictionary sourceRecord(const Dictionary& derivative = derivativeRecord()) {
    return {{"UUID", "SOURCE"},
            {"Derivatives", Array{derivative}},
            {"Previews", Array{Dictionary{{"UUID", "PREVIEW"}, {"Index", 0}, {"IsFlattened", true}}}},
            {"AudioSamples", Dictionary{{"UUID", "DERIVATIVE"}, {"IsFlattened", true}}}};
  }
  static Dictionary documentRecord(const Dictionary& source = sourceRecord()) {
    return {{"UUID", "DOCUMENT"},
            {"Title", "Hostile"},
            {"Media", Array{Dictionary{{"UUID", "ITEM"}, {"Sources", Array{source}}}}}};
  }

  /// A package whose item lies where it should, with a picture as its content.
  void writeOrdinaryPackage() const {
    const Path source = package() / "media/ITEM/sources/SOURCE";
    for (const char* name : {"derivatives", "previews", "audiosamples"})
      std::filesystem::create_directories(source / name);
    writePicture(source / "derivatives/DERIVATIVE.png");
    writePicture(source / "previews/0.jpg");
    writeFile(source / "audiosamples/DERIVATIVE.asc", "samples");
    writePicture(package() / "media/ITEM/poster.jpg");
  }

  /// Puts a link in the place of what is there.
  static void link(const Path& place, const Path& to) {
    std::filesystem::remove_all(place);
    std::filesystem::create_directories(place.parent_path());
    std::filesystem::create_symlink(to, place);
  }

  static const std::vector<std::string>& hostileNames() {
    static const std::vector<std::string> names = {
        "..", "", "../outside", "/etc", "a/../../../..", std::string(300, 'n')};
    return names;
  }
};

TEST_F(QuiltDocumentHostileTest, TheOrdinaryPackageOfTheseTestsWorks) {
  writeOrdinaryPackage();
  const auto document = opened(documentRecord());
  ASSERT_NE(document, nullptr);
  const auto item = document->mediaAtIndex(0);
  EXPECT_EQ(item->posterImage()->size().width, 11);
  EXPECT_EQ(item->sourceAtIndex(0)->previewAtIndex(0)->image()->size().width, 11);
  const auto before = world();
  exercise(document);
  EXPECT_EQ(document->mediaCount(), 0u);
  EXPECT_THAT(treeOf(package() / "media"), IsEmpty());
  EXPECT_EQ(world(), before);
}

// ---- Names

TEST_F(QuiltDocumentHostileTest, AnItemWhoseIdentityIsNoPlainNameIsRefused) {
  for (const std::string& name : hostileNames()) {
    writeOrdinaryPackage();
    Dictionary record = documentRecord();
    record.set("Media",
               Array{Dictionary{{"UUID", name}, {"Sources", Array{sourceRecord()}}}, Dictionary{{"UUID", "GOOD"}}});
    const auto before = world();
    takeLines();
    const auto document = opened(record);
    ASSERT_NE(document, nullptr) << name;
    EXPECT_EQ(takeProblems(),
              Lines{warning("Refused the record of a media item: \"" + name + "\" is no plain file name")});
    EXPECT_EQ(document->mediaCount(), 1u) << name;
    exercise(document);
    EXPECT_EQ(world(), before) << name;
  }
}

TEST_F(QuiltDocumentHostileTest, ASourceWhoseIdentityIsNoPlainNameIsRefused) {
  for (const std::string& name : hostileNames()) {
    writeOrdinaryPackage();
    Dictionary source = sourceRecord();
    source.set("UUID", name);
    Dictionary record = documentRecord();
    const Dictionary item = {
        {"UUID", "ITEM"}, {"Sources", Array{source}}, {"Extras", Array{source}}, {"AudioCommentarySource", source}};
    record.set("Media", Array{item});
    const auto before = world();
    const auto document = opened(record);
    ASSERT_NE(document, nullptr) << name;
    EXPECT_EQ(document->mediaAtIndex(0)->sourcesCount(), 0u) << name;
    EXPECT_EQ(document->mediaAtIndex(0)->extraCount(), 0u) << name;
    EXPECT_EQ(document->mediaAtIndex(0)->audioCommentarySource(), nullptr) << name;
    exercise(document);
    EXPECT_EQ(world(), before) << name;
  }
}

TEST_F(QuiltDocumentHostileTest, ADerivativeWhoseFilenameOrIdentityIsNoPlainNameIsRefused) {
  for (const std::string& name : hostileNames()) {
    for (const char* key : {"Filename", "UUID"}) {
      writeOrdinaryPackage();
      Dictionary derivative = derivativeRecord();
      derivative.set(key, name);
      const auto before = world();
      const auto document = opened(documentRecord(sourceRecord(derivative)));
      ASSERT_NE(document, nullptr) << name;
      EXPECT_EQ(document->mediaAtIndex(0)->sourceAtIndex(0)->derivativeCount(), 0u) << key << " " << name;
      exercise(document);
      EXPECT_EQ(world(), before) << key << " " << name;
    }
  }
}

TEST_F(QuiltDocumentHostileTest, PreviewsAndSamplesWhoseIdentityIsNoPlainNameAreRefused) {
  for (const std::string& name : hostileNames()) {
    writeOrdinaryPackage();
    Dictionary source = sourceRecord();
    source.set("Previews", Array{Dictionary{{"UUID", name}, {"IsFlattened", true}}});
    source.set("AudioSamples", Dictionary{{"UUID", name}, {"SampleURL", "x"}, {"IsFlattened", true}});
    const auto before = world();
    const auto document = opened(documentRecord(source));
    ASSERT_NE(document, nullptr) << name;
    EXPECT_THAT(document->mediaAtIndex(0)->sourceAtIndex(0)->previews(), IsEmpty()) << name;
    EXPECT_EQ(document->mediaAtIndex(0)->sourceAtIndex(0)->audioSamples(), nullptr) << name;
    exercise(document);
    EXPECT_EQ(world(), before) << name;
  }
}

TEST_F(QuiltDocumentHostileTest, ANulInANameIsRefusedToo) {
  const std::string name("a\0b", 3);
  const auto document = made();
  EXPECT_EQ(QuiltMedia::initWithDictionary({{"UUID", name}}, document), nullptr);
  const auto item = addItem(*document);
  EXPECT_EQ(QuiltMediaSource::initWithDictionary({{"UUID", name}}, item), nullptr);
  EXPECT_EQ(QuiltMediaDerivative::initWithDictionary({{"Filename", name}}, nullptr), nullptr);
}

TEST_F(QuiltDocumentHostileTest, AFlattenedDerivativeOutsideIsNeverDeleted) {
  writeOrdinaryPackage();
  Dictionary derivative = derivativeRecord();
  derivative.remove("Filename");
  derivative.set("URL", Url::fileUrl(outside() / "picture.png").absoluteString());
  const auto before = world();
  const auto document = opened(documentRecord(sourceRecord(derivative)));
  ASSERT_NE(document, nullptr);
  const auto source = document->mediaAtIndex(0)->sourceAtIndex(0);
  takeLines();
  source->removeAllDerivatives();
  EXPECT_EQ(source->derivativeCount(), 0u);
  EXPECT_EQ(takeProblems().size(), 1u) << "the refusal is reported";
  exercise(document);
  EXPECT_EQ(world(), before);
}

// ---- Links

TEST_F(QuiltDocumentHostileTest, AMediaFolderThatIsALinkIsNeitherReadNorWrittenNorEmptied) {
  link(package() / "media", outside());
  writePicture(outside() / "ITEM/poster.jpg");
  writeFile(outside() / "ITEM/sources/SOURCE/derivatives/DERIVATIVE.png", "x");
  const auto before = world();
  const auto document = opened(documentRecord());
  ASSERT_NE(document, nullptr);
  EXPECT_EQ(document->mediaAtIndex(0)->posterImage(), nullptr);
  EXPECT_EQ(document->mediaAtIndex(0)->sourceAtIndex(0)->derivativeCount(), 0u);
  exercise(document);
  EXPECT_EQ(world(), before);
}

TEST_F(QuiltDocumentHostileTest, NewMediaDoNotFollowALinkedMediaFolder) {
  link(package() / "media", outside());
  const auto before = world();
  const auto document = opened({{"UUID", "DOCUMENT"}});
  addPictureItem(*document, 1600, 1200);
  std::map<std::string, std::size_t> expected = before;
  expected[(folder() / "1600x1200.png").native()] = std::hash<std::string>()(readFile(folder() / "1600x1200.png"));
  EXPECT_FALSE(document->flattenWithProgressionBlock({}));
  EXPECT_FALSE(document->convertToFormat("480p", {}));
  EXPECT_FALSE(document->finalizeWithProgressionBlock({}));
  exercise(document);
  EXPECT_EQ(world(), expected);
}

TEST_F(QuiltDocumentHostileTest, ALinkAnywhereBelowTheMediaFolderIsNotFollowed) {
  const std::vector<std::pair<const char*, const char*>> links = {
      {"media/ITEM", "ITEM"},
      {"media/ITEM/sources", "ITEM/sources"},
      {"media/ITEM/sources/SOURCE", "ITEM/sources/SOURCE"},
      {"media/ITEM/sources/SOURCE/derivatives", "derivatives"},
      {"media/ITEM/sources/SOURCE/derivatives/DERIVATIVE.png", "picture.png"},
      {"media/ITEM/sources/SOURCE/previews", "previews"},
      {"media/ITEM/sources/SOURCE/previews/0.jpg", "0.jpg"},
      {"media/ITEM/sources/SOURCE/audiosamples", "audiosamples"},
      {"media/ITEM/sources/SOURCE/audiosamples/DERIVATIVE.asc", "DERIVATIVE.asc"},
      {"media/ITEM/poster.jpg", "poster.jpg"},
      {"media/ITEM/extras", "sources"}};
  for (const auto& [place, to] : links) {
    std::filesystem::remove_all(package());
    writeOrdinaryPackage();
    link(package() / place, outside() / to);
    const auto before = world();
    const auto document = opened(documentRecord());
    ASSERT_NE(document, nullptr) << place;
    exercise(document);
    EXPECT_EQ(world(), before) << place;
  }
}

TEST_F(QuiltDocumentHostileTest, APreviewThatIsALinkShowsNothing) {
  writeOrdinaryPackage();
  link(package() / "media/ITEM/sources/SOURCE/previews/0.jpg", outside() / "0.jpg");
  const auto document = opened(documentRecord());
  EXPECT_EQ(document->mediaAtIndex(0)->sourceAtIndex(0)->previewAtIndex(0)->image(), nullptr);
}

TEST_F(QuiltDocumentHostileTest, APosterThatIsALinkIsNotShownAndIsReplacedNotWrittenThrough) {
  const auto document = opened({{"UUID", "DOCUMENT"}});
  link(document->posterImagePath(), outside() / "poster.png");
  const auto before = world();
  takeLines();
  EXPECT_EQ(document->posterImage(), nullptr);
  EXPECT_THAT(takeProblems(), Contains(warning("Document poster image path \"" + document->posterImagePath().native() +
                                               "\" is not a valid image")));
  document->updatePosterImage(picture(5, 5));
  EXPECT_EQ(world(), before);
  EXPECT_FALSE(std::filesystem::is_symlink(document->posterImagePath()));
  EXPECT_EQ(ImageWrapper::imageWithPath(document->posterImagePath())->size().width, 5);
}

TEST_F(QuiltDocumentHostileTest, AThumbnailIsNotWrittenThroughLinks) {
  const auto document = opened({{"UUID", "DOCUMENT"}});
  link(package() / "Glance", outside());
  auto before = world();
  takeLines();
  EXPECT_FALSE(document->glanceUpdate());
  EXPECT_THAT(takeProblems(), Contains(warning("Failed to save Glance thumbnail at path \"" +
                                               document->glanceThumbnailPath().native() + "\"")));
  EXPECT_EQ(world(), before);
  std::filesystem::remove(package() / "Glance");
  link(package() / "Glance/Thumbnail.png", outside() / "Thumbnail.png");
  document->glanceUpdate();
  EXPECT_EQ(world(), before);
}

TEST_F(QuiltDocumentHostileTest, FinalizingAnInteractiveDocumentWritesThroughNoLink) {
  const auto theme = QuiltTheme::initWithPath(themeBundle());
  const std::vector<std::pair<const char*, const char*>> links = {
      {"controllers", "controllers"},    {"controllers/data.js", "precious"},
      {"JukeboxArtwork", "picture.png"}, {"JukeboxMetadata.plist", "media/precious"},
      {"index.html", "media/precious"},  {"Glance", "Glance"}};
  for (const auto& [place, to] : links) {
    std::filesystem::remove_all(package());
    const auto document = opened({{"UUID", "DOCUMENT"}, {"Type", "Interactive"}});
    document->setTheme(theme);
    link(package() / place, outside() / to);
    const auto before = world();
    document->finalizeWithProgressionBlock({});
    EXPECT_EQ(world(), before) << place;
  }
}

TEST_F(QuiltDocumentHostileTest, AThemeWhoseTemplateLinksItsControllersOutIsNotWrittenThrough) {
  const Path bundle = themeBundle();
  link(bundle / "Resources/Template/controllers", outside() / "controllers");
  const auto document = opened({{"UUID", "DOCUMENT"}, {"Type", "Interactive"}});
  document->setTheme(QuiltTheme::initWithPath(bundle));
  const auto before = world();
  document->finalizeWithProgressionBlock({});
  EXPECT_EQ(world(), before);
}

TEST_F(QuiltDocumentHostileTest, PropertiesThatAreALinkAreNotReadAndNotWrittenThrough) {
  writeRecord(outside() / "other.plist", {{"Version", "1.0"}, {"Title", "Of somebody else"}});
  link(package() / "properties.plist", outside() / "other.plist");
  const auto before = world();
  EXPECT_EQ(QuiltDocument::initWithPath(package()), nullptr);
  EXPECT_EQ(world(), before);
  std::filesystem::remove(package() / "properties.plist");
  const auto document = opened({{"UUID", "DOCUMENT"}});
  link(package() / "properties.plist", outside() / "other.plist");
  EXPECT_TRUE(document->update());
  EXPECT_EQ(world(), before);
  EXPECT_FALSE(std::filesystem::is_symlink(package() / "properties.plist"));
}

TEST_F(QuiltDocumentHostileTest, APackageThatIsReachedThroughALinkIsAnOrdinaryPackage) {
  writeOrdinaryPackage();
  writeRecord(package() / "properties.plist", [] {
    Dictionary record = documentRecord();
    record.append("Version", "1.0");
    return record;
  }());
  std::filesystem::create_directory_symlink(package(), folder() / "alias.qpk");
  const auto document = QuiltDocument::initWithPath(folder() / "alias.qpk");
  ASSERT_NE(document, nullptr);
  EXPECT_EQ(document->mediaAtIndex(0)->posterImage()->size().width, 11);
  document->removeAllMedia();
  EXPECT_FALSE(std::filesystem::exists(package() / "media/ITEM"));
}

}  // namespace
}  // namespace quilt
