// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <algorithm>

#include "quilt/sources/QuiltMediaDerivative.h"
#include "quilt/sources/QuiltMediaSource.h"
#include "tests/support/PackageFixture.h"
#include "tests/support/SourceServices.h"

namespace quilt {
namespace {

using platform::Services;
using support::debug;
using support::Installed;
using support::Line;
using support::Lines;
using support::ToldFiles;
using support::ToldInspector;
using support::warning;
using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::IsEmpty;

using Tags = std::vector<std::string>;

/// The tags of files of which a test decides what the inspector sees in them.
class QuiltMediaDerivativeTagsTest : public support::PackageFixture {
 protected:
  const Url url = Url::fileUrl(folder() / "file.mp4");
  const Installed<ToldInspector> inspector{&Services::inspector};

  platform::MediaFacts& facts() { return inspector->facts; }
  Tags tagsAs(const Text& category) { return QuiltMediaDerivative::compatibilityTagsForURL(url, category); }

  Tags tagsOfMovie(double width, double height) {
    facts().hasVideo = true;
    facts().videoCodecName = "H.264";
    facts().width = width;
    facts().height = height;
    return tagsAs("Movie");
  }
  Tags tagsOfSmallMovieWith(const std::string& videoCodec, const Text& audioCodec) {
    facts() = {};
    facts().hasVideo = true;
    facts().videoCodecName = videoCodec;
    facts().hasAudio = audioCodec.has_value();
    facts().audioCodecName = audioCodec.value_or("");
    facts().width = 320;
    facts().height = 240;
    return tagsAs("Movie");
  }
  Tags tagsOfSound(const std::string& codec, bool hasVideo = false) {
    facts() = {};
    facts().hasAudio = true;
    facts().audioCodecName = codec;
    facts().hasVideo = hasVideo;
    return tagsAs("Audio");
  }

  Line compatible(const std::string& category, const std::string& tags) const {
    return debug("Derivative at URL \"" + url.absoluteString() + "\" as \"" + category + "\" is compatible with \"" +
                 tags + "\"");
  }
};

TEST_F(QuiltMediaDerivativeTagsTest, SizesAreComparedInclusivelyAndBothSidesMustFit) {
  EXPECT_THAT(tagsOfMovie(640, 480), ElementsAre("480p"));
  EXPECT_THAT(tagsOfMovie(641, 480), ElementsAre("720p"));
  EXPECT_THAT(tagsOfMovie(640, 481), ElementsAre("720p"));
  EXPECT_THAT(tagsOfMovie(1280, 720), ElementsAre("720p"));
  EXPECT_THAT(tagsOfMovie(1281, 720), ElementsAre("Desktop"));
  EXPECT_THAT(tagsOfMovie(1280, 721), ElementsAre("Desktop"));
  EXPECT_THAT(tagsOfMovie(480, 640), ElementsAre("720p")) << "upright";
  EXPECT_THAT(tagsOfMovie(0, 0), ElementsAre("480p")) << "an unknown size";
}

TEST_F(QuiltMediaDerivativeTagsTest, OnlyTheKnownCodecsKeepAMovieBelowTheDesktop) {
  EXPECT_THAT(tagsOfSmallMovieWith("H.264", std::nullopt), ElementsAre("480p"));
  EXPECT_THAT(tagsOfSmallMovieWith("H.264", "AAC"), ElementsAre("480p"));
  EXPECT_THAT(tagsOfSmallMovieWith("H.264", "Kestrel Lossless"), ElementsAre("480p"));
  EXPECT_THAT(tagsOfSmallMovieWith("H.264", "MP3"), ElementsAre("Desktop"));
  EXPECT_THAT(tagsOfSmallMovieWith("H.264", "aac"), ElementsAre("Desktop")) << "names are compared exactly";
  EXPECT_THAT(tagsOfSmallMovieWith("HEVC", "AAC"), ElementsAre("Desktop"));
  EXPECT_THAT(tagsOfSmallMovieWith("", std::nullopt), ElementsAre("Desktop"));
}

TEST_F(QuiltMediaDerivativeTagsTest, SoundIsTaggedByItsCodecAndNeverWithAPicture) {
  EXPECT_THAT(tagsOfSound("AAC"), ElementsAre("Desktop", "720p", "480p"));
  EXPECT_THAT(tagsOfSound("Kestrel Lossless"), ElementsAre("Desktop"));
  EXPECT_THAT(tagsOfSound("AAC", /*hasVideo=*/true), IsEmpty());
  facts() = {};
  EXPECT_THAT(tagsAs("Audio"), IsEmpty()) << "no sound in it";
}

TEST_F(QuiltMediaDerivativeTagsTest, DocumentsAndLinksSuitEverythingAndOtherCategoriesNothing) {
  EXPECT_THAT(tagsAs("Document"), ElementsAre("Desktop", "720p", "480p"));
  EXPECT_THAT(tagsAs("Web"), ElementsAre("Desktop", "720p", "480p"));
  for (const Text& other : {Text("Montage"), Text("DualSource"), Text("movie"), Text(""), Text()})
    EXPECT_THAT(tagsAs(other), IsEmpty()) << other.value_or("none");
}

TEST_F(QuiltMediaDerivativeTagsTest, EveryPathEndsWithTheSameLine) {
  tagsOfSound("AAC");
  tagsOfSound("AAC", /*hasVideo=*/true);
  tagsOfSmallMovieWith("H.264", "AAC");
  tagsAs("Image");
  tagsAs("Document");
  tagsAs("Web");
  tagsAs("Montage");
  tagsAs(std::nullopt);
  EXPECT_EQ(takeLines(),
            (Lines{compatible("Audio", "Desktop,720p,480p"), compatible("Audio", ""), compatible("Movie", "480p"),
                   compatible("Image", "Desktop"), compatible("Document", "Desktop,720p,480p"),
                   compatible("Web", "Desktop,720p,480p"), compatible("Montage", ""), compatible("(null)", "")}));
}

TEST_F(QuiltMediaDerivativeTagsTest, AFileIsClassifiedByWhatIsInIt) {
  const Path file = writeFile(folder() / "file.mp4", std::string("\0\0\0\x18"
                                                                 "ftypmp42",
                                                                 12));
  facts().hasAudio = true;
  facts().audioCodecName = "AAC";
  facts().mimeType = "video/mp4";
  facts().duration = 12.25;
  const auto sound = QuiltMediaDerivative::initWithPath(file);
  ASSERT_NE(sound, nullptr);
  EXPECT_EQ(sound->contentType(), platform::types::kAudio);
  EXPECT_THAT(*sound->compatibilityTags(), ElementsAre("Desktop", "720p", "480p"));
  EXPECT_EQ(sound->mimetype(), "video/mp4");
  EXPECT_EQ(sound->duration(), 12.25);
  facts().hasVideo = true;
  const auto movie = QuiltMediaDerivative::initWithPath(file);
  ASSERT_NE(movie, nullptr);
  EXPECT_EQ(movie->contentType(), platform::types::kMPEG4);
}

TEST_F(QuiltMediaDerivativeTagsTest, ASoundFileWithPicturesIsVideoAndSuitsNothing) {
  const Path file = writeFile(folder() / "file.m4a", std::string("\0\0\0\x18"
                                                                 "ftypM4A ",
                                                                 12));
  facts().hasAudio = true;
  facts().hasVideo = true;
  takeLines();
  EXPECT_EQ(QuiltMediaDerivative::initWithPath(file), nullptr);
  const std::string name = Url::fileUrl(file).absoluteString();
  EXPECT_EQ(takeLines(),
            (Lines{debug("Derivative at URL \"" + name + "\" as \"(null)\" is compatible with \"\""),
                   debug("Failed to create source derivative for url \"" + name + "\": \"Not a compatible file\"")}));
}

// ---- Images, by their own file

class QuiltMediaDerivativeFilesTest : public support::PackageFixture {
 protected:
  static Tags tagsOf(const Path& file) {
    return QuiltMediaDerivative::compatibilityTagsForURL(Url::fileUrl(file), Text("Image"));
  }
};

TEST_F(QuiltMediaDerivativeFilesTest, PicturesThatCannotBeLoadedSuitNothing) {
  EXPECT_THAT(tagsOf(writeFile(folder() / "broken.png", "\x89PNG\r\n\x1A\n and no picture")), IsEmpty());
  EXPECT_THAT(tagsOf(writeFile(folder() / "broken.jpg", "\xFF\xD8\xFF and no picture")), IsEmpty());
}

TEST_F(QuiltMediaDerivativeFilesTest, OtherPicturesAreNotEvenLoaded) {
  for (const char* name : {"broken.tiff", "broken.gif", "broken.bmp", "broken.icns", "broken.jp2"})
    EXPECT_THAT(tagsOf(writeFile(folder() / name, "no picture")), ElementsAre("Desktop")) << name;
}

// ---- Lists of types

TEST_F(QuiltMediaDerivativeFilesTest, EveryTypeIsTheClassicOnesThenDocumentsThenImages) {
  Tags expected = QuiltMediaDerivative::classicSupportedUTIs();
  const Tags& documents = QuiltMediaDerivative::documentSupportedUTIs();
  expected.insert(expected.end(), documents.begin(), documents.end() - 1);  // all but the sound at their end
  EXPECT_THAT(QuiltMediaDerivative::allSupportedUTIs(), ElementsAreArray(expected));
}

TEST_F(QuiltMediaDerivativeFilesTest, TheListsStandInTheirOrder) {
  namespace types = platform::types;
  EXPECT_THAT(QuiltMediaDerivative::classicSupportedUTIs(),
              ElementsAre("public.aiff-audio", "public.aifc-audio", types::kM4A, types::kMP3, types::kMPEG4Audio,
                          types::kProtectedMPEG4Audio, types::kMovieContainer, types::kMPEG4, types::kMPEG,
                          types::kProtectedMPEG4Video, types::kM4V, "public.3gpp"));
  EXPECT_THAT(
      QuiltMediaDerivative::documentSupportedUTIs(),
      ElementsAre(types::kPDF, "org.idpf.epub-container", types::kEPUB, types::kPresentation, types::kFlatPresentation,
                  "com.microsoft.powerpoint.ppt", "org.openxmlformats.presentationml.presentation",
                  types::kTextDocument, types::kFlatTextDocument, "com.microsoft.word.doc", "com.microsoft.word.wordml",
                  "org.openxmlformats.wordprocessingml.document", types::kJPEG, types::kJPEG2000, types::kTIFF,
                  types::kGIF, types::kPNG, types::kICNS, types::kBMP, types::kM4A));
  EXPECT_EQ(&QuiltMediaDerivative::allSupportedUTIs(), &QuiltMediaDerivative::allSupportedUTIs()) << "built once";
}

// ---- Record

TEST_F(QuiltMediaDerivativeFilesTest, AFlattenedRecordHasItsKeysInTheirOrder) {
  const auto source = addEmptySource();
  const auto derivative = addFlattenedDerivative(*source, {"Desktop"});
  derivative->setContentType("public.png");
  derivative->setMimetype("image/png");
  std::vector<std::string> keys;
  for (const auto& [key, value] : derivative->dictionary()) keys.push_back(key);
  EXPECT_THAT(keys, ElementsAre("UUID", "Filename", "ContentType", "CompatibilityTags", "MimeType", "IsFlattened",
                                "TotalSizeInMegaBytes", "Height", "Width", "Duration", "RelativePath"));
}

TEST_F(QuiltMediaDerivativeFilesTest, AFreshDerivativeWritesOnlyWhatIsAlwaysWritten) {
  std::vector<std::string> keys;
  for (const auto& [key, value] : QuiltMediaDerivative::init()->dictionary()) keys.push_back(key);
  EXPECT_THAT(keys, ElementsAre("UUID", "IsFlattened", "TotalSizeInMegaBytes", "Height", "Width", "Duration"));
}

TEST_F(QuiltMediaDerivativeFilesTest, AFlattenedLinkIsStoredByItsUrl) {
  const auto source = addEmptySource();
  const auto link = QuiltMediaDerivative::initWithURL(*Url::parse("https://example.org/a.mp4"));
  source->addDerivative(link);
  const auto loaded = QuiltMediaDerivative::initWithDictionary(link->dictionary(), source);
  EXPECT_EQ(loaded->url(), Url::parse("https://example.org/a.mp4"));
  EXPECT_TRUE(loaded->isFlattened());
  EXPECT_EQ(loaded->sourceOwner(), source);
  EXPECT_EQ(loaded->totalSizeInMegaBytes(), 0);
}

TEST_F(QuiltMediaDerivativeFilesTest, AFileThatCannotBeSizedSaysWhy) {
  const auto source = addEmptySource();
  const auto derivative = addFlattenedDerivative(*source, {"Desktop"});
  const Path file = derivative->url()->relativePath();
  const Installed<ToldFiles> files(&Services::files);
  files->failAttributes = support::withExtension("bin");
  takeLines();
  EXPECT_EQ(derivative->totalSizeInMegaBytes(), 0);
  EXPECT_EQ(takeLines(), Lines{warning("Source derivative at path \"" + file.native() +
                                       "\" cannot be sized: \"The disk is full.\"")});
}

}  // namespace
}  // namespace quilt
