// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/vips/VipsImages.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/ScratchFolder.h"
#include "tests/support/SimpleFiles.h"

namespace quilt::platform {
namespace {

using namespace quilt::support;
using ::testing::HasSubstr;

constexpr int kJPEGTolerance = 12;  // of 255; what the compression may change in a flat area

class VipsImagesTest : public ::testing::Test {
 protected:
  std::shared_ptr<ImageWrapper> open(const std::filesystem::path& file) {
    Result<std::shared_ptr<ImageWrapper>> image = images.imageWithPath(file);
    EXPECT_TRUE(image) << (image ? "" : image.error().text);
    return image ? *image : nullptr;
  }
  std::shared_ptr<ImageWrapper> open(const std::string& bytes) {
    Result<std::shared_ptr<ImageWrapper>> image =
        images.imageWithData({reinterpret_cast<const unsigned char*>(bytes.data()), bytes.size()});
    EXPECT_TRUE(image) << (image ? "" : image.error().text);
    return image ? *image : nullptr;
  }
  std::shared_ptr<ImageWrapper> open(const Bitmap& bitmap) { return *images.imageWithBitmap(bitmap); }

  Bitmap pixels(const ImageWrapper& image) {
    Result<Bitmap> bitmap = image.bitmap();
    EXPECT_TRUE(bitmap) << (bitmap ? "" : bitmap.error().text);
    if (!bitmap) return {};
    EXPECT_EQ((Size{static_cast<double>(bitmap->width), static_cast<double>(bitmap->height)}), image.size());
    EXPECT_EQ(bitmap->pixels.size(), bitmap->width * bitmap->height * 4);
    return *bitmap;
  }

  void expectQuadrants(const Bitmap& bitmap, int tolerance = kJPEGTolerance) {
    const auto corner = [&](std::size_t x, std::size_t y) {
      return pixelAt(bitmap, bitmap.width * x / 4, bitmap.height * y / 4);
    };
    EXPECT_LE(distance(corner(1, 1), kRed), tolerance);
    EXPECT_LE(distance(corner(3, 1), kGreen), tolerance);
    EXPECT_LE(distance(corner(1, 3), kBlue), tolerance);
    EXPECT_LE(distance(corner(3, 3), kWhite), tolerance);
  }

  VipsImages images;
  std::shared_ptr<SimpleFiles> files = std::make_shared<SimpleFiles>();
  ScopedService<FileManager> installedFiles{&Services::files, files};
  ScratchFolder folder;
};

TEST_F(VipsImagesTest, TheHeaderAloneTellsEverySize) {
  // The compressed pixels are noise: whoever decoded them would see it.
  std::string jpeg = encode(quadrants(2000, 1000), {});
  const std::size_t scan = jpeg.find("\xFF\xDA");
  ASSERT_NE(scan, std::string::npos);
  jpeg.resize(scan + 14);
  const auto image = open(writeFile(folder / "half.jpg", jpeg));
  ASSERT_TRUE(image);
  EXPECT_EQ(image->size(), (Size{2000, 1000}));
  EXPECT_EQ(image->convertToHD()->size(), (Size{1280, 640}));
  EXPECT_EQ(image->convertToSD()->size(), (Size{640, 320}));
}

TEST_F(VipsImagesTest, ConvertingNeverOpensTheFileAgain) {
  const auto image = open(writeFile(folder / "a.png", encode(quadrants(2000, 1000), {.suffix = ".png"})));
  std::filesystem::remove(folder / "a.png");
  const auto small = image->convertToHD()->convertToSD();
  EXPECT_EQ(small->size(), (Size{640, 320}));
  const Result<Bitmap> bitmap = small->bitmap();
  ASSERT_FALSE(bitmap);
  EXPECT_EQ(bitmap.error().kind, ErrorKind::NotFound);
}

TEST_F(VipsImagesTest, FitsKeepTheRatioRoundToTheNearestPixelAndNeverEnlarge) {
  const struct {
    Size image, sd, hd;
  } cases[] = {{{1920, 1080}, {640, 360}, {1280, 720}}, {{640, 480}, {640, 480}, {640, 480}},
               {{641, 480}, {640, 479}, {641, 480}},    {{100, 50}, {100, 50}, {100, 50}},
               {{480, 4000}, {58, 480}, {86, 720}},     {{5000, 2}, {640, 1}, {1280, 1}},
               {{1000, 667}, {640, 427}, {1000, 667}}};
  for (const auto& [size, sd, hd] : cases) {
    const auto image = open(quadrants(static_cast<std::size_t>(size.width), static_cast<std::size_t>(size.height)));
    EXPECT_EQ(image->size(), size);
    EXPECT_EQ(image->convertToSD()->size(), sd);
    EXPECT_EQ(image->convertToHD()->size(), hd);
  }
}

TEST_F(VipsImagesTest, WhatIsDecodedHasThePromisedSizeWhateverTheRatio) {
  for (std::size_t width = 641; width < 5400; width += 397) {
    for (const std::size_t height : {3U, 479U, 481U, 777U}) {
      const auto image = open(encode(quadrants(width, height), {}));
      pixels(*image->convertToSD());
      pixels(*image->convertToHD()->convertToSD());
    }
  }
}

TEST_F(VipsImagesTest, EveryOrientationIsApplied) {
  // By orientation: where the stored upper left and upper right come from, as the corners of the displayed picture.
  for (int orientation = 1; orientation <= 8; ++orientation) {
    SCOPED_TRACE(orientation);
    const bool turned = orientation >= 5;
    // Painted so that the displayed picture is quadrants(1000, 600).
    const std::size_t width = turned ? 600 : 1000;
    const std::size_t height = turned ? 1000 : 600;
    const Bitmap shown = quadrants(1000, 600);
    const Bitmap stored = paint(width, height, [&](std::size_t x, std::size_t y) {
      const std::size_t flippedX = width - 1 - x;
      const std::size_t flippedY = height - 1 - y;
      switch (orientation) {
        case 1:
          return pixelAt(shown, x, y);
        case 2:
          return pixelAt(shown, flippedX, y);
        case 3:
          return pixelAt(shown, flippedX, flippedY);
        case 4:
          return pixelAt(shown, x, flippedY);
        case 5:
          return pixelAt(shown, y, x);
        case 6:
          return pixelAt(shown, flippedY, x);
        case 7:
          return pixelAt(shown, flippedY, flippedX);
        default:
          return pixelAt(shown, y, flippedX);
      }
    });
    for (const char* suffix : {".jpg", ".tif"}) {
      SCOPED_TRACE(suffix);
      const auto image = open(encode(stored, {.suffix = suffix, .orientation = orientation}));
      EXPECT_EQ(image->size(), (Size{1000, 600}));
      expectQuadrants(pixels(*image));
      EXPECT_EQ(image->convertToSD()->size(), (Size{640, 384}));
      expectQuadrants(pixels(*image->convertToSD()));

      // Once: the note is gone from what is written.
      ASSERT_TRUE(image->saveAsJPGAtPath(folder / "upright.jpg"));
      const auto upright = open(folder / "upright.jpg");
      EXPECT_EQ(upright->size(), (Size{1000, 600}));
      expectQuadrants(pixels(*upright));
    }
  }
}

TEST_F(VipsImagesTest, EveryKindOfPixelBecomesPlainRGB) {
  const Encoding kinds[] = {{.suffix = ".png"},
                            {.suffix = ".png[palette=true]"},
                            {.suffix = ".png[interlace=true]"},
                            {.suffix = ".jpg[interlace=true]"},
                            {.suffix = ".png", .colour = "rgb16"},
                            {.suffix = ".tif", .colour = "rgb16"},
                            {.suffix = ".tif[compression=lzw,tile=true]"},
                            {.suffix = ".tif[compression=deflate,pyramid=true]"},
                            {.suffix = ".webp[lossless=true]"},
                            {.suffix = ".gif"},
                            {.suffix = ".jp2[lossless=true]"}};
  for (const Encoding& kind : kinds) {
    SCOPED_TRACE(kind.suffix + " " + kind.colour);
    const auto image = open(encode(quadrants(1500, 900), kind));
    EXPECT_EQ(image->size(), (Size{1500, 900}));
    expectQuadrants(pixels(*image));
    expectQuadrants(pixels(*image->convertToSD()));
  }
}

TEST_F(VipsImagesTest, PrintColoursAreConverted) {
  // Print has no pure red, green and blue, so the colours only have to be recognisable.
  for (const char* suffix : {".jpg", ".tif"}) {
    const auto image = open(encode(quadrants(1500, 900), {.suffix = suffix, .colour = "cmyk"}));
    const Bitmap small = pixels(*image->convertToSD());
    const Rgba red = pixelAt(small, 100, 100);
    EXPECT_GT(red[0], 180);
    EXPECT_LT(red[1], 90);
    const Rgba white = pixelAt(small, 600, 350);
    EXPECT_LE(distance(white, kWhite), kJPEGTolerance);
    ASSERT_TRUE(image->saveAsJPGAtPath(folder / "print.jpg"));
    EXPECT_LE(distance(pixelAt(pixels(*open(folder / "print.jpg")), 300, 200), red), 2 * kJPEGTolerance);
  }
}

TEST_F(VipsImagesTest, GreyStaysGrey) {
  const Bitmap ramp = paint(256, 10, [](std::size_t x, std::size_t) {
    const auto level = static_cast<std::uint8_t>(x);
    return Rgba{level, level, level, 255};
  });
  for (const Encoding& kind :
       {Encoding{.suffix = ".png", .colour = "b-w"}, Encoding{.suffix = ".png", .colour = "grey16"},
        Encoding{.suffix = ".tif", .colour = "grey16"}}) {
    SCOPED_TRACE(kind.suffix + " " + kind.colour);
    const Bitmap read = pixels(*open(encode(ramp, kind)));
    for (std::size_t x = 0; x < 256; ++x) EXPECT_LE(distance(pixelAt(read, x, 5), pixelAt(ramp, x, 5)), 2) << x;
  }
}

TEST_F(VipsImagesTest, AProfileIsAppliedAndNotWritten) {
  const Bitmap red = paint(1000, 1000, [](std::size_t, std::size_t) { return Rgba{230, 40, 30, 255}; });
  const auto image = open(encode(red, {.suffix = ".png", .profile = "p3"}));
  EXPECT_LE(distance(pixelAt(pixels(*image), 9, 9), pixelAt(red, 9, 9)), 3);
  ASSERT_TRUE(image->saveAsJPGAtPath(folder / "plain.jpg"));
  EXPECT_THAT(bytesOf(folder / "plain.jpg"), ::testing::Not(HasSubstr("ICC_PROFILE")));
}

TEST_F(VipsImagesTest, TransparencyIsKeptInPNGAndLaidOnWhiteInJPEG) {
  const Bitmap half = paint(200, 100, [](std::size_t x, std::size_t) {
    return x < 100 ? Rgba{0, 0, 0, 0} : Rgba{0, 0, 255, 128};
  });
  for (const auto& image : {open(half), open(encode(half, {.suffix = ".png"}))}) {
    EXPECT_EQ(pixelAt(pixels(*image), 150, 50), (Rgba{0, 0, 255, 128}));
    ASSERT_TRUE(image->saveAsPNGAtURL(Url::fileUrl(folder / "a.png")));
    EXPECT_EQ(pixelAt(pixels(*open(folder / "a.png")), 150, 50), (Rgba{0, 0, 255, 128}));
    EXPECT_EQ(pixelAt(pixels(*open(folder / "a.png")), 50, 50)[3], 0);
    ASSERT_TRUE(image->saveAsJPGAtPath(folder / "a.jpg"));
    const Bitmap jpeg = pixels(*open(folder / "a.jpg"));
    EXPECT_LE(distance(pixelAt(jpeg, 50, 50), kWhite), kJPEGTolerance);
    EXPECT_LE(distance(pixelAt(jpeg, 150, 50), {127, 127, 255, 255}), kJPEGTolerance);
  }
}

TEST_F(VipsImagesTest, ScalingDoesNotBleedTheColourOfTransparentPixels) {
  const Bitmap stripes = paint(1280, 960, [](std::size_t x, std::size_t) {
    return x % 2 == 0 ? Rgba{255, 0, 0, 255} : Rgba{0, 255, 0, 0};
  });
  const Rgba mixed = pixelAt(pixels(*open(stripes)->convertToSD()), 300, 200);
  EXPECT_GT(mixed[0], 240);
  EXPECT_LT(mixed[1], 15);
  EXPECT_NEAR(mixed[3], 128, 15);
}

TEST_F(VipsImagesTest, AnUnscaledJPEGIsCopiedByteForByte) {
  const std::string jpeg = encode(quadrants(600, 400), {});
  const auto image = open(writeFile(folder / "from.jpg", jpeg));
  for (const auto& same : {image, image->convertToSD(), image->convertToHD()->convertToSD(), open(jpeg)}) {
    std::filesystem::remove(folder / "to.jpg");
    ASSERT_TRUE(same->saveAsJPGAtPath(folder / "to.jpg"));
    EXPECT_EQ(bytesOf(folder / "to.jpg"), jpeg);
  }
}

TEST_F(VipsImagesTest, AJPEGThatHasToChangeIsNotCopied) {
  const Encoding changing[] = {{.orientation = 6}, {.colour = "cmyk"}, {.profile = "p3"}};
  for (const Encoding& encoding : changing) {
    const std::string jpeg = encode(quadrants(600, 400), encoding);
    ASSERT_TRUE(open(jpeg)->saveAsJPGAtPath(folder / "to.jpg"));
    EXPECT_NE(bytesOf(folder / "to.jpg"), jpeg);
  }
  const std::string large = encode(quadrants(1281, 400), {});
  ASSERT_TRUE(open(large)->convertToHD()->saveAsJPGAtPath(folder / "to.jpg"));
  EXPECT_EQ(open(folder / "to.jpg")->size(), (Size{1280, 400}));
}

TEST_F(VipsImagesTest, SavingGoesThroughTheFileManagerWhole) {
  const auto image = open(quadrants(800, 600))->convertToSD();
  files->failWrites = Error{ErrorKind::NoSpace, "The disk is full.", folder / "a"};
  for (const Result<void>& saved :
       {image->saveAsJPGAtPath(folder / "a"), image->saveAsPNGAtURL(Url::fileUrl(folder / "a"))}) {
    ASSERT_FALSE(saved);
    EXPECT_EQ(saved.error().text, "The disk is full.");
  }
  EXPECT_EQ(files->writes, 2);
  EXPECT_FALSE(std::filesystem::exists(folder / "a"));
}

TEST_F(VipsImagesTest, PNGIsSavedToFilesOnly) {
  const Result<void> saved = open(quadrants(8, 8))->saveAsPNGAtURL(*Url::parse("http://localhost/a.png"));
  ASSERT_FALSE(saved);
  EXPECT_EQ(saved.error().kind, ErrorKind::Unsupported);
}

TEST_F(VipsImagesTest, NamesAreNamesNotOptionsOrAddresses) {
  for (const char* name :
       {"photo[1].jpg", "a.jpg[page=3]", "-i", "$(x)", "|x", "concat:a.jpg", "no extension", "a.txt"}) {
    const auto image = open(writeFile(folder / name, encode(quadrants(700, 500), {})));
    ASSERT_TRUE(image) << name;
    EXPECT_EQ(image->convertToSD()->size(), (Size{640, 457})) << name;
    expectQuadrants(pixels(*image->convertToSD()));
  }
}

TEST_F(VipsImagesTest, WhatIsNoImageIsRefusedWithASentence) {
  const auto error = [&](const std::filesystem::path& path) {
    const Result<std::shared_ptr<ImageWrapper>> image = images.imageWithPath(path);
    EXPECT_FALSE(image);
    return image ? Error{} : image.error();
  };
  EXPECT_EQ(error(folder / "missing.jpg").kind, ErrorKind::NotFound);
  EXPECT_EQ(error(folder.path()).kind, ErrorKind::Unsupported);
  EXPECT_EQ(error("/dev/zero").kind, ErrorKind::Unsupported);
  const Error text = error(writeFile(folder / "a.jpg", "<svg xmlns='http://www.w3.org/2000/svg'/>"));
  EXPECT_EQ(text.kind, ErrorKind::Unsupported);
  EXPECT_EQ(text.text, "This is no image of a kind that is read.");
  EXPECT_EQ(text.file, folder / "a.jpg");
  EXPECT_EQ(error(writeFile(folder / "b.jpg", "")).kind, ErrorKind::Unsupported);
  const Error damaged = error(writeFile(folder / "c.jpg", "\xFF\xD8\xFF\xE0 and then nothing of a picture"));
  EXPECT_EQ(damaged.kind, ErrorKind::Damaged);
  EXPECT_THAT(damaged.text, HasSubstr("The image is damaged"));
}

TEST_F(VipsImagesTest, AFileReplacedByAnotherPictureIsNoticed) {
  const auto image = open(writeFile(folder / "a.jpg", encode(quadrants(600, 400), {})));
  writeFile(folder / "a.jpg", encode(quadrants(500, 400), {}));
  for (const Result<void>& saved :
       {image->saveAsJPGAtPath(folder / "b.jpg"), image->saveAsPNGAtURL(Url::fileUrl(folder / "b.png"))}) {
    ASSERT_FALSE(saved);
    EXPECT_EQ(saved.error().text, "The image was replaced by another after it was opened.");
  }
}

TEST_F(VipsImagesTest, BitmapsThatDoNotFillTheirSizeAreRefused) {
  EXPECT_FALSE(images.imageWithBitmap({10, 10, std::vector<std::uint8_t>(399)}));
  EXPECT_FALSE(images.imageWithBitmap({0, 10, {}}));
  EXPECT_FALSE(images.imageWithBitmap({1U << 20, 1U << 20, {}}));
}

TEST_F(VipsImagesTest, ACutFileShowsWhatIsThere) {
  for (const char* suffix : {".jpg", ".png[compression=0]"}) {
    const std::string whole = encode(quadrants(800, 600), {.suffix = suffix});
    const auto image = open(whole.substr(0, whole.size() * 6 / 10));
    ASSERT_TRUE(image);
    const Bitmap small = pixels(*image->convertToSD());
    ASSERT_EQ(small.width, 640U) << suffix;
    EXPECT_LE(distance(pixelAt(small, 100, 100), kRed), kJPEGTolerance) << suffix;
  }
}

TEST_F(VipsImagesTest, SizesBeyondTheLimitsAreRefusedFromTheHeader) {
  std::string png = encode(quadrants(8, 8), {.suffix = ".png"});
  // The header chunk: 100,001 × 8. The check sum that follows it is made to fit.
  png.replace(16, 4, std::string("\x00\x01\x86\xA1", 4));
  std::uint32_t sum = 0xFFFFFFFF;
  for (std::size_t i = 12; i < 29; ++i) {
    sum ^= static_cast<unsigned char>(png[i]);
    for (int bit = 0; bit < 8; ++bit) sum = sum & 1 ? sum >> 1 ^ 0xEDB88320 : sum >> 1;
  }
  sum = ~sum;
  for (std::size_t i = 0; i < 4; ++i) png[29 + i] = static_cast<char>(sum >> (24 - 8 * i));
  const Result<std::shared_ptr<ImageWrapper>> image =
      images.imageWithData({reinterpret_cast<const unsigned char*>(png.data()), png.size()});
  ASSERT_FALSE(image);
  EXPECT_EQ(image.error().text, "The image is larger than any that is read.");
}

TEST_F(VipsImagesTest, DescriptorsDoNotGrow) {
  const auto path = writeFile(folder / "a.jpg", encode(quadrants(900, 700), {}));
  std::vector<std::shared_ptr<ImageWrapper>> kept{open(path)};
  ASSERT_TRUE(kept[0]->convertToSD()->saveAsJPGAtPath(folder / "b.jpg"));
  const std::size_t before = openDescriptors();
  for (int i = 0; i < 300; ++i) {
    kept.push_back(open(path)->convertToSD());
    if (i % 10 != 0) continue;
    ASSERT_TRUE(kept.back()->saveAsJPGAtPath(folder / "b.jpg"));
  }
  EXPECT_EQ(openDescriptors(), before);
}

TEST_F(VipsImagesTest, CapabilitiesNameTheLibraryAndEveryFormat) {
  const std::vector<Capability> all = VipsImages::capabilities();
  ASSERT_EQ(all.size(), 10U);
  EXPECT_THAT(all[0].version, HasSubstr("."));
  for (const Capability& capability : all) EXPECT_EQ(capability.present, capability.remedy.empty()) << capability.name;
}

}  // namespace
}  // namespace quilt::platform
