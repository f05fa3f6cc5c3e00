// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>

#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/vips/VipsImages.h"
#include "quilt/platform/vips/VipsInspector.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/ScratchFolder.h"
#include "tests/support/SimpleFiles.h"

namespace quilt::platform {
namespace {

using namespace quilt::support;

struct KnownImage {
  const char* name;
  Size size;
};

void PrintTo(const KnownImage& image, std::ostream* stream) { *stream << image.name; }

class ImageCorpusTest : public ::testing::TestWithParam<KnownImage> {
 protected:
  std::shared_ptr<SimpleFiles> files = std::make_shared<SimpleFiles>();
  ScopedService<FileManager> installedFiles{&Services::files, files};
  ScratchFolder folder;
  VipsImages images;
};

TEST_P(ImageCorpusTest, IsReadScaledAndWritten) {
  const std::filesystem::path file = corpusImage(GetParam().name);
  if (file.empty()) GTEST_SKIP() << "no media corpus";
  const Result<std::shared_ptr<ImageWrapper>> opened = images.imageWithPath(file);
  ASSERT_TRUE(opened) << opened.error().text;
  const std::shared_ptr<ImageWrapper> image = *opened;
  EXPECT_EQ(image->size(), GetParam().size);
  const std::shared_ptr<ImageWrapper> small = image->convertToSD();
  EXPECT_LE(small->size().width, 640);
  EXPECT_LE(small->size().height, 480);
  const Result<Bitmap> bitmap = small->bitmap();
  ASSERT_TRUE(bitmap) << bitmap.error().text;
  EXPECT_EQ(static_cast<double>(bitmap->width), small->size().width);
  EXPECT_EQ(static_cast<double>(bitmap->height), small->size().height);
  const auto [low, high] = std::minmax_element(bitmap->pixels.begin(), bitmap->pixels.end());
  EXPECT_LT(*low, *high) << "a picture of one level";
  ASSERT_TRUE(small->saveAsJPGAtPath(folder / "a.jpg"));
  ASSERT_TRUE(small->saveAsPNGAtURL(Url::fileUrl(folder / "a.png")));
  EXPECT_EQ((*images.imageWithPath(folder / "a.jpg"))->size(), small->size());
  EXPECT_EQ((*images.imageWithPath(folder / "a.png"))->size(), small->size());
}

INSTANTIATE_TEST_SUITE_P(
    Files, ImageCorpusTest,
    ::testing::Values(KnownImage{"jpeg-12mp.jpg", {4000, 3000}}, KnownImage{"jpeg-12mp-orientation3.jpg", {4000, 3000}},
                      KnownImage{"jpeg-landscape-orientation6.jpg", {1800, 1200}},
                      KnownImage{"jpeg-portrait-orientation5.jpg", {1200, 1800}},
                      KnownImage{"jpeg-cmyk.jpg", {100, 100}}, KnownImage{"jpeg-640x480.jpg", {640, 480}},
                      KnownImage{"png-640x480.png", {640, 480}}, KnownImage{"png-16bit.png", {290, 442}},
                      KnownImage{"png-alpha.png", {128, 128}}, KnownImage{"png-animated.png", {128, 64}},
                      KnownImage{"png-palette.png", {290, 442}}, KnownImage{"tiff-cmyk.tiff", {157, 151}},
                      KnownImage{"tiff-multipage.tif", {4670, 6170}}, KnownImage{"tiff-rgb-16bit.tif", {290, 442}},
                      KnownImage{"tiff-rgb-16bit-small.tiff", {157, 151}}, KnownImage{"gif-128.gif", {128, 128}},
                      KnownImage{"gif-animated.gif", {85, 77}}, KnownImage{"gif-animated-245.gif", {245, 245}},
                      KnownImage{"bmp-128.bmp", {128, 128}}, KnownImage{"bmp-24bit-v5.bmp", {435, 353}},
                      KnownImage{"icns-basic.icns", {512, 512}}, KnownImage{"icns-pillow2.icns", {512, 512}},
                      KnownImage{"jp2-10mp-balloon.jp2", {2717, 3701}}, KnownImage{"heic-photo.heic", {4000, 1848}}),
    [](const auto& info) {
      std::string name = info.param.name;
      std::replace_if(
          name.begin(), name.end(), [](char c) { return !std::isalnum(c); }, '_');
      return name;
    });

// Damaged files: an answer in bounded time and memory, and no crash; the sanitizers watch.
class DamagedImageTest : public ::testing::TestWithParam<const char*> {
 protected:
  std::shared_ptr<SimpleFiles> files = std::make_shared<SimpleFiles>();
  ScopedService<FileManager> installedFiles{&Services::files, files};
  ScratchFolder folder;
};

TEST_P(DamagedImageTest, AnswersAPictureOrAnError) {
  const std::filesystem::path file = corpusImage(GetParam());
  if (file.empty()) GTEST_SKIP() << "no media corpus";
  const Result<std::shared_ptr<ImageWrapper>> opened = VipsImages().imageWithPath(file);
  if (!opened) {
    EXPECT_TRUE(opened.error().kind == ErrorKind::Damaged || opened.error().kind == ErrorKind::Unsupported);
    EXPECT_FALSE(opened.error().text.empty());
    EXPECT_EQ(opened.error().file, file);
    return;
  }
  const std::shared_ptr<ImageWrapper> small = (*opened)->convertToSD();
  const Result<Bitmap> bitmap = small->bitmap();
  EXPECT_TRUE(!bitmap || static_cast<double>(bitmap->width) == small->size().width);
  const Result<void> saved = small->saveAsPNGAtURL(Url::fileUrl(folder / "a.png"));
  EXPECT_EQ(saved.hasValue(), bitmap.hasValue());
  EXPECT_EQ(std::filesystem::exists(folder / "a.png"), saved.hasValue());
}

INSTANTIATE_TEST_SUITE_P(Files, DamagedImageTest,
                         ::testing::Values("bad-bmp-really-big.bmp", "bad-icns-oom.icns", "bad-gif-truncated.gif",
                                           "bad-jp2-truncated.jp2", "bad-jpeg-oss-fuzz.jpeg", "bad-jpeg-overflow1.jpg",
                                           "bad-jpeg-truncated.jpg", "bad-jpeg-truncated-10000.jpg",
                                           "bad-png-broken-stream.png", "bad-png-palette-index.png",
                                           "bad-png-truncated.png", "bad-tiff-crash-1.tif", "bad-tiff-crash-2.tif",
                                           "bad-tiff-overflow.tiff"),
                         [](const auto& info) {
                           std::string name = info.param;
                           std::replace_if(
                               name.begin(), name.end(), [](char c) { return !std::isalnum(c); }, '_');
                           return name;
                         });

TEST(ImageLimitsTest, ThreeMillionByTwoMillionPixelsAreRefusedAtOnce) {
  const std::filesystem::path file = corpusImage("bad-bmp-really-big.bmp");
  if (file.empty()) GTEST_SKIP() << "no media corpus";
  const Result<std::shared_ptr<ImageWrapper>> image = VipsImages().imageWithPath(file);
  ASSERT_FALSE(image);
  EXPECT_EQ(image.error().text, "The image is larger than any that is read.");
}

}  // namespace
}  // namespace quilt::platform
