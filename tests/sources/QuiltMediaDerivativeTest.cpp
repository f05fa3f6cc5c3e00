// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/QuiltMediaDerivative.h"

#include <gmock/gmock.h>

#include <cmath>

#include "quilt/platform/base/Paths.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/PackageFixture.h"

namespace quilt {
namespace {

using support::debug;
using support::Lines;
using support::MediaSpec;
using support::warning;
using ::testing::ElementsAre;

class QuiltMediaDerivativeTest : public support::PackageFixture {
 protected:
  static std::vector<std::string> tagsOf(const Path& file) {
    const auto derivative = QuiltMediaDerivative::initWithPath(file);
    EXPECT_NE(derivative, nullptr) << file;
    return derivative ? *derivative->compatibilityTags() : std::vector<std::string>();
  }

  static MediaSpec movie(int width, int height) {
    MediaSpec spec;
    spec.width = width;
    spec.height = height;
    spec.duration = 0.2;
    return spec;
  }

  std::shared_ptr<QuiltMediaSource> source = addEmptySource();

  std::shared_ptr<QuiltMediaDerivative> read(const Dictionary& record) const {
    return QuiltMediaDerivative::initWithDictionary(record, source);
  }
};

// ---- Classification

TEST_F(QuiltMediaDerivativeTest, AacSuitsEveryTargetAndMp3OnlyTheDesktop) {
  EXPECT_THAT(tagsOf(support::makeMedia(support::m4aSound())), ElementsAre("Desktop", "720p", "480p"));
  EXPECT_THAT(tagsOf(support::makeMedia(support::mp3Sound())), ElementsAre("Desktop"));
}

TEST_F(QuiltMediaDerivativeTest, ASmallH264MovieWithAacIs480pAlone) {
  EXPECT_THAT(tagsOf(support::makeMedia(movie(640, 480))), ElementsAre("480p"));
}

TEST_F(QuiltMediaDerivativeTest, ASmallH264MovieWithoutSoundIs480pToo) {
  MediaSpec silent = movie(640, 480);
  silent.sound = "";
  EXPECT_THAT(tagsOf(support::makeMedia(silent)), ElementsAre("480p"));
}

TEST_F(QuiltMediaDerivativeTest, AnotherSoundCodecMakesAMovieDesktopOnly) {
  MediaSpec withMp3 = movie(640, 480);
  withMp3.audioCodec = "libmp3lame";
  EXPECT_THAT(tagsOf(support::makeMedia(withMp3)), ElementsAre("Desktop"));
}

TEST_F(QuiltMediaDerivativeTest, LosslessSoundKeepsAMoviesGrade) {
  MediaSpec lossless = movie(640, 480);
  lossless.extension = "mov";
  lossless.audioCodec = "alac";
  EXPECT_THAT(tagsOf(support::makeMedia(lossless)), ElementsAre("480p"));
}

TEST_F(QuiltMediaDerivativeTest, AnotherVideoCodecMakesAMovieDesktopOnly) {
  MediaSpec other = movie(320, 240);
  other.videoCodec = "mpeg4";
  EXPECT_THAT(tagsOf(support::makeMedia(other)), ElementsAre("Desktop"));
}

TEST_F(QuiltMediaDerivativeTest, MovieSizesAreComparedInclusivelyAndBothSidesMustFit) {
  EXPECT_THAT(tagsOf(support::makeMedia(movie(642, 480))), ElementsAre("720p"));
  EXPECT_THAT(tagsOf(support::makeMedia(movie(640, 482))), ElementsAre("720p"));
  EXPECT_THAT(tagsOf(support::makeMedia(movie(1280, 720))), ElementsAre("720p"));
  EXPECT_THAT(tagsOf(support::makeMedia(movie(1282, 720))), ElementsAre("Desktop"));
  EXPECT_THAT(tagsOf(support::makeMedia(movie(1280, 722))), ElementsAre("Desktop"));
}

TEST_F(QuiltMediaDerivativeTest, PngAndJpegAreGradedBySizeAndOtherImagesAreDesktop) {
  EXPECT_THAT(tagsOf(pictureFile(1920, 1080)), ElementsAre("Desktop"));
  EXPECT_THAT(tagsOf(pictureFile(800, 600, "jpg")), ElementsAre("720p"));
  EXPECT_THAT(tagsOf(pictureFile(640, 480)), ElementsAre("480p"));
  EXPECT_THAT(tagsOf(pictureFile(641, 480)), ElementsAre("720p"));
  EXPECT_THAT(tagsOf(pictureFile(1281, 720)), ElementsAre("Desktop"));
  const Path tiff =
      support::runFfmpeg({"-f", "lavfi", "-i", "color=red:s=16x16", "-frames:v", "1", "-pix_fmt", "rgb24"}, "tiff");
  EXPECT_THAT(tagsOf(tiff), ElementsAre("Desktop"));
}

TEST_F(QuiltMediaDerivativeTest, APictureThatCannotBeLoadedIsRefused) {
  const Path broken = writeFile(folder() / "broken.png", "\x89PNG\r\n\x1a\n and no more");
  EXPECT_EQ(QuiltMediaDerivative::initWithPath(broken), nullptr);
}

TEST_F(QuiltMediaDerivativeTest, APdfSuitsEveryTarget) {
  EXPECT_THAT(tagsOf(writeFile(folder() / "a.pdf", support::makePages(1))), ElementsAre("Desktop", "720p", "480p"));
}

TEST_F(QuiltMediaDerivativeTest, AWebLinkSuitsEveryTargetAndIsFlattened) {
  const Url url = *Url::parse("https://example.org/page?x=1#y");
  const auto link = QuiltMediaDerivative::initWithURL(url);
  ASSERT_NE(link, nullptr);
  EXPECT_THAT(*link->compatibilityTags(), ElementsAre("Desktop", "720p", "480p"));
  EXPECT_TRUE(link->isFlattened());
  EXPECT_EQ(link->contentType(), platform::types::kURL);
  EXPECT_EQ(link->mimetype(), std::nullopt);
  EXPECT_EQ(link->width(), 0);
  const Dictionary record = link->dictionary();
  EXPECT_EQ(record.string("URL"), url.absoluteString());
  EXPECT_FALSE(record.contains("Filename"));
  EXPECT_FALSE(record.contains("RelativePath"));
}

TEST_F(QuiltMediaDerivativeTest, AMovieFileWithSoundAloneIsAudio) {
  MediaSpec sound;
  sound.picture = "";
  const auto derivative = QuiltMediaDerivative::initWithPath(support::makeMedia(sound));
  ASSERT_NE(derivative, nullptr);
  EXPECT_EQ(derivative->contentType(), platform::types::kAudio);
}

TEST_F(QuiltMediaDerivativeTest, ASoundFileWithAPictureTrackIsVideo) {
  const Path asMovie = support::makeMedia(movie(320, 240));
  const Path asSound = folder() / "renamed.m4a";
  std::filesystem::copy_file(asMovie, asSound);
  const auto derivative = QuiltMediaDerivative::initWithPath(asSound);
  EXPECT_EQ(derivative, nullptr) << "the platform's video type is no movie and no audio, so nothing suits it";
}

TEST_F(QuiltMediaDerivativeTest, FactsComeFromTheInspector) {
  const auto derivative = QuiltMediaDerivative::initWithPath(support::makeMedia({}));
  ASSERT_NE(derivative, nullptr);
  EXPECT_EQ(derivative->width(), 320);
  EXPECT_EQ(derivative->height(), 240);
  EXPECT_NEAR(derivative->duration(), 2, 0.05);
  EXPECT_EQ(derivative->mimetype(), "video/mp4");
  EXPECT_EQ(derivative->contentType(), platform::types::kMPEG4);
  EXPECT_FALSE(derivative->isFlattened());
}

TEST_F(QuiltMediaDerivativeTest, TheDebugLinesNameUrlCategoryAndTags) {
  const Path text = writeFile(folder() / "a.txt", "text");
  takeLines();
  EXPECT_TRUE(QuiltMediaDerivative::compatibilityTagsForURL(Url::fileUrl(text), std::nullopt).empty());
  EXPECT_EQ(takeLines(), Lines{debug("Derivative at URL \"" + Url::fileUrl(text).absoluteString() +
                                     "\" as \"(null)\" is compatible with \"\"")});
}

TEST_F(QuiltMediaDerivativeTest, AnUnreadableMovieGetsNoTags) {
  const Path broken = writeFile(folder() / "broken.mp4", "no movie at all");
  takeLines();
  EXPECT_TRUE(QuiltMediaDerivative::compatibilityTagsForURL(Url::fileUrl(broken), Text("Movie")).empty());
  EXPECT_TRUE(QuiltMediaDerivative::compatibilityTagsForURL(Url::fileUrl(broken), Text("Audio")).empty());
}

TEST_F(QuiltMediaDerivativeTest, EachListAcceptsItsOwn) {
  const Url movieFile = Url::fileUrl(support::makeMedia(movie(320, 240)));
  const Url sound = Url::fileUrl(support::makeMedia(support::m4aSound()));
  const Url pdf = Url::fileUrl(writeFile(folder() / "a.pdf", support::makePages(1)));
  const Url text = Url::fileUrl(writeFile(folder() / "a.txt", "text"));
  const Url gone = Url::fileUrl(folder() / "gone");
  const Url link = *Url::parse("https://example.org/");
  EXPECT_TRUE(QuiltMediaDerivative::canInitWithURL(movieFile));
  EXPECT_TRUE(QuiltMediaDerivative::canInitWithURL(pdf));
  EXPECT_TRUE(QuiltMediaDerivative::canInitWithURL(link));
  EXPECT_FALSE(QuiltMediaDerivative::canInitWithURL(text));
  EXPECT_FALSE(QuiltMediaDerivative::canInitWithURL(gone));
  EXPECT_TRUE(QuiltMediaDerivative::canInitWithURLForClassic(movieFile));
  EXPECT_FALSE(QuiltMediaDerivative::canInitWithURLForClassic(pdf));
  EXPECT_TRUE(QuiltMediaDerivative::canInitWithURLOfTypeDocument(pdf));
  EXPECT_TRUE(QuiltMediaDerivative::canInitWithURLOfTypeDocument(sound)) << "an M4A file passes the document test";
  EXPECT_FALSE(QuiltMediaDerivative::canInitWithURLOfTypeDocument(movieFile));
}

TEST_F(QuiltMediaDerivativeTest, TheListsHaveTheirLengthsAndOrder) {
  const auto& classic = QuiltMediaDerivative::classicSupportedUTIs();
  const auto& documents = QuiltMediaDerivative::documentSupportedUTIs();
  const auto& all = QuiltMediaDerivative::allSupportedUTIs();
  EXPECT_EQ(classic.size(), 12u);
  EXPECT_EQ(classic.front(), "public.aiff-audio");
  EXPECT_EQ(classic.back(), "public.3gpp");
  EXPECT_EQ(documents.size(), 20u);
  EXPECT_EQ(documents.front(), platform::types::kPDF);
  EXPECT_EQ(documents.back(), platform::types::kM4A);
  EXPECT_EQ(all.size(), 31u);
  EXPECT_EQ(all[12], platform::types::kPDF);
  EXPECT_EQ(all.back(), platform::types::kBMP);
}

// ---- Record

TEST_F(QuiltMediaDerivativeTest, AFilenameComesBeforeAUrl) {
  const auto derivative = read({{"Filename", "f.mp4"}, {"URL", "https://example.org/"}});
  EXPECT_EQ(derivative->url()->relativePath(), source->derivativesFolderPath() / "f.mp4");
}

TEST_F(QuiltMediaDerivativeTest, SizesAreReadInSinglePrecision) {
  const auto derivative = read({{"Width", 1279.9999999}, {"Height", 0.1}, {"Duration", 3}});
  EXPECT_EQ(derivative->width(), static_cast<double>(1279.9999999F));
  EXPECT_EQ(derivative->height(), static_cast<double>(0.1F));
  EXPECT_EQ(derivative->duration(), 3);
}

TEST_F(QuiltMediaDerivativeTest, AFlattenedFileIsStoredByNameAndFollowsThePackage) {
  const auto derivative = addFlattenedDerivative(*source, {"Desktop"});
  const std::string name = derivative->uuid() + ".bin";
  const Dictionary record = derivative->dictionary();
  EXPECT_EQ(record.string("Filename"), name);
  EXPECT_FALSE(record.contains("URL"));
  EXPECT_EQ(record.string("RelativePath"),
            "media/" + item()->uuid() + "/sources/" + source->uuid() + "/derivatives/" + name);
  document()->setPath(folder() / "moved.qpk");
  EXPECT_EQ(read(record)->url()->relativePath(), source->derivativesFolderPath() / name);
}

TEST_F(QuiltMediaDerivativeTest, KeysStandInTheWrittenOrder) {
  const auto derivative = QuiltMediaDerivative::initWithPath(support::makeMedia({}));
  source->addDerivative(derivative);
  std::vector<std::string> keys;
  for (const auto& [key, value] : derivative->dictionary()) keys.push_back(key);
  EXPECT_THAT(keys, ElementsAre("UUID", "URL", "ContentType", "CompatibilityTags", "MimeType", "IsFlattened",
                                "TotalSizeInMegaBytes", "Height", "Width", "Duration", "RelativePath"));
}

TEST_F(QuiltMediaDerivativeTest, ARecordReadsBackToTheSameRecord) {
  const auto derivative = QuiltMediaDerivative::initWithPath(support::makeMedia({}));
  source->addDerivative(derivative);
  Dictionary record = derivative->dictionary();
  record.set("Duration", 2.0);
  record.append("Later", "kept");
  EXPECT_EQ(read(record)->dictionary(), record);
}

TEST_F(QuiltMediaDerivativeTest, MissingKeysAndWrongKindsKeepTheFreshValues) {
  const auto derivative = read({{"UUID", 1},
                                {"Filename", 2},
                                {"URL", true},
                                {"ContentType", Array{}},
                                {"CompatibilityTags", "Desktop"},
                                {"MimeType", 1.5},
                                {"Width", "wide"},
                                {"IsFlattened", 1}});
  ASSERT_NE(derivative, nullptr);
  EXPECT_EQ(derivative->uuid().size(), 36u);
  EXPECT_EQ(derivative->url(), std::nullopt);
  EXPECT_EQ(derivative->contentType(), std::nullopt);
  EXPECT_EQ(derivative->compatibilityTags(), std::nullopt);
  EXPECT_EQ(derivative->mimetype(), std::nullopt);
  EXPECT_EQ(derivative->width(), 0);
  EXPECT_FALSE(derivative->isFlattened());
}

TEST_F(QuiltMediaDerivativeTest, ANameThatLeadsElsewhereIsRefused) {
  for (const std::string name : {"../../../../../etc/passwd", "..", "/etc/passwd", "a/b", ""})
    EXPECT_EQ(read({{"Filename", name}}), nullptr) << name;
  EXPECT_EQ(read({{"UUID", "../x"}}), nullptr);
}

TEST_F(QuiltMediaDerivativeTest, ALinkOutOfThePackageIsRefused) {
  const Path outside = writeFile(folder() / "secret.txt", "secret");
  std::filesystem::create_directories(source->derivativesFolderPath());
  std::filesystem::create_symlink(outside, source->derivativesFolderPath() / "f.mp4");
  takeLines();
  EXPECT_EQ(read({{"Filename", "f.mp4"}, {"IsFlattened", true}}), nullptr);
  EXPECT_EQ(takeLines(),
            Lines{warning("Refused the file of a source derivative: \"" +
                          (source->derivativesFolderPath() / "f.mp4").native() + "\" leads out of the document")});
}

// ---- Size

TEST_F(QuiltMediaDerivativeTest, AFileThatIsGoneCannotBeSized) {
  const auto derivative = derivativeTagged({"Desktop"});
  derivative->setUrl(Url::fileUrl(folder() / "gone.mp4"));
  takeLines();
  EXPECT_EQ(derivative->totalSizeInMegaBytes(), 0);
  const Lines lines = takeLines();
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_EQ(lines[0].level, platform::LogLevel::Warning);
  EXPECT_TRUE(lines[0].text.starts_with("Source derivative at path \"" + (folder() / "gone.mp4").native() +
                                        "\" cannot be sized: \""));
}

TEST_F(QuiltMediaDerivativeTest, SizeIsComputedInSinglePrecision) {
  const auto derivative = derivativeTagged({"Desktop"});
  derivative->setUrl(Url::fileUrl(writeFile(folder() / "f", std::string(123457, 'x'))));
  EXPECT_EQ(derivative->totalSizeInMegaBytes(), static_cast<double>(123457.0F * 0.0009765625F * 0.0009765625F));
  derivative->setUrl(Url::parse("https://example.org/"));
  EXPECT_EQ(derivative->totalSizeInMegaBytes(), 0);
}

}  // namespace
}  // namespace quilt
