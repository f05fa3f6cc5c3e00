// SPDX-License-Identifier: Apache-2.0
// What every Images and every ImageWrapper promises; VipsImagesTest looks at the pixels.
#include <gmock/gmock.h>

#include "quilt/platform/absent/Absent.h"
#include "quilt/platform/vips/VipsImages.h"
#include "tests/support/Candidate.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/SimpleFiles.h"

namespace quilt::platform {
namespace {

using support::expectTellingError;
using ::testing::ElementsAre;

using Images_ = support::Candidate<Images>;
const Images_ kVips{"Vips", [] { return std::make_shared<VipsImages>(); }};
const Images_ kNoVips{"Absent", [] { return std::make_shared<AbsentImages>(); }};

/// Holds of a build with images and of one without.
using ImagesFailureContract = support::ContractTest<Images>;
INSTANTIATE_TEST_SUITE_P(Implementations, ImagesFailureContract, ::testing::Values(kVips, kNoVips),
                         support::candidateName);

TEST_P(ImagesFailureContract, WhatIsNoImageIsRefusedWithItsFile) {
  for (const Path& file : {writeFile(folder() / "words.png", "words"), writeFile(folder() / "empty.png", ""),
                           folder() / "missing.png", folder()})
    expectTellingError(service->imageWithPath(file), file);
  expectTellingError(service->imageWithData({}), {});
  const std::string words = "words";
  expectTellingError(service->imageWithData({reinterpret_cast<const unsigned char*>(words.data()), words.size()}), {});
  expectTellingError(service->imageWithBitmap({10, 10, {}}), {});
}

TEST_P(ImagesFailureContract, TheLoadersOfTheInstalledServiceAnswerNull) {
  const ScopedService<Images> images(&Services::images, service);
  EXPECT_EQ(nullptr, ImageWrapper::imageWithPath(folder() / "missing.png"));
  EXPECT_EQ(nullptr, ImageWrapper::imageWithURL(Url::fileUrl(writeFile(folder() / "words.png", "words"))));
  EXPECT_EQ(nullptr, ImageWrapper::imageWithURL(*Url::parse("https://example.org/a.png")));
}

/// Holds of every implementation that makes images.
class ImagesContract : public support::ContractTest<Images> {
 protected:
  std::shared_ptr<ImageWrapper> image(std::size_t width, std::size_t height) const {
    const auto made = service->imageWithBitmap(support::quadrants(width, height));
    EXPECT_TRUE(made);
    return made ? *made : nullptr;
  }
  std::shared_ptr<ImageWrapper> read(const Path& file) const {
    const auto made = service->imageWithPath(file);
    EXPECT_TRUE(made) << made.error().text;
    return made ? *made : nullptr;
  }
};
using ImagesContractThreadTest = ImagesContract;
INSTANTIATE_TEST_SUITE_P(Implementations, ImagesContract, ::testing::Values(kVips), support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, ImagesContractThreadTest, ::testing::Values(kVips), support::candidateName);

TEST_P(ImagesContract, GradesFitTheirSizeKeepTheRatioAndNeverEnlarge) {
  EXPECT_EQ((Size{640, 320}), image(2000, 1000)->convertToSD()->size());
  EXPECT_EQ((Size{1280, 640}), image(2000, 1000)->convertToHD()->size());
  EXPECT_EQ((Size{20, 10}), image(20, 10)->convertToHD()->size());
}

TEST_P(ImagesContract, AnImageIsImmutable) {
  const auto original = image(800, 600);
  const auto pixels = original->bitmap();
  static_cast<void>(original->convertToSD());
  ASSERT_TRUE(original->saveAsJPGAtPath(folder() / "a.jpg"));
  EXPECT_EQ((Size{800, 600}), original->size());
  EXPECT_EQ(pixels->pixels, original->bitmap()->pixels);
}

TEST_P(ImagesContract, WhatIsSavedReadsBackInItsSize) {
  const auto original = image(80, 60);
  ASSERT_TRUE(original->saveAsJPGAtPath(folder() / "a.jpg"));
  ASSERT_TRUE(original->saveAsPNGAtURL(Url::fileUrl(folder() / "a.png")));
  EXPECT_EQ((Size{80, 60}), read(folder() / "a.jpg")->size());
  EXPECT_EQ(original->bitmap()->pixels, read(folder() / "a.png")->bitmap()->pixels);
  EXPECT_THAT(namesIn(folder()), ElementsAre("a.jpg", "a.png"));
}

TEST_P(ImagesContract, ASaveThatFailsLeavesWhatWasThere) {
  const auto original = image(80, 60);
  const Path jpg = writeFile(folder() / "a.jpg", "old"), png = writeFile(folder() / "a.png", "old");
  {
    const auto failing = std::make_shared<support::SimpleFiles>();
    failing->failWrites = Error{ErrorKind::NoSpace, "The disk is full", jpg};
    const ScopedService<FileManager> files(&Services::files, failing);
    EXPECT_FALSE(original->saveAsJPGAtPath(jpg));
    EXPECT_FALSE(original->saveAsPNGAtURL(Url::fileUrl(png)));
  }
  EXPECT_FALSE(original->saveAsJPGAtPath(folder() / "missing/a.jpg"));
  EXPECT_EQ("old", readFile(jpg));
  EXPECT_EQ("old", readFile(png));
  EXPECT_THAT(namesIn(folder()), ElementsAre("a.jpg", "a.png"));
}

TEST_P(ImagesContractThreadTest, ThreadsShareOneImage) {
  ASSERT_TRUE(image(1600, 1200)->saveAsJPGAtPath(folder() / "a.jpg"));
  const auto shared = read(folder() / "a.jpg");
  support::onThreads([&] {
    EXPECT_EQ((Size{640, 480}), shared->convertToSD()->size());
    const auto pixels = shared->convertToSD()->bitmap();
    ASSERT_TRUE(pixels);
    EXPECT_EQ(640U * 480U * 4U, pixels->pixels.size());
  });
}

}  // namespace
}  // namespace quilt::platform
