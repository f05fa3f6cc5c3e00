// SPDX-License-Identifier: Apache-2.0
// Previews and posters went on reading the outside files that they were made from, and a preview could be recorded
// before it was written; then flattening, and with it every export, failed for good.
#include <gmock/gmock.h>

#include <algorithm>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/FaultyServices.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/MediaFixtures.h"

namespace quilt {
namespace {

using support::kBlue;
using support::kRed;
using support::Rgba;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::SizeIs;

const std::vector<std::string> kDesktopOnly{"Desktop"};

/// Documents that save themselves, made of files in a folder that can go away.
class PicturesTest : public support::DocumentFixture {
 protected:
  PicturesTest() { std::filesystem::create_directories(outside()); }

  Path outside() const { return folder() / "outside"; }
  Path target() const {
    std::filesystem::create_directories(folder() / "exports");
    return folder() / "exports";
  }

  Path coloured(const std::string& name, const Rgba& colour) const {
    const platform::Bitmap bitmap = support::paint(800, 600, [&](auto, auto) { return colour; });
    const std::string suffix = Path(name).extension();
    return support::writeFile(outside() / name, support::encode(bitmap, {.suffix = suffix}));
  }
  Path movie() const { return into("movie.mp4", support::makeMedia(support::silentMovie())); }
  Path sound() const { return into("sound.m4a", support::makeMedia(support::m4aSound())); }
  Path pages() const { return writeFile(outside() / "pages.pdf", support::makePages(3)); }
  std::vector<Path> everyKind() const {
    return {coloured("a.png", kRed),
            coloured("b.jpg", kRed),
            coloured("c.gif", kRed),
            coloured("d.tif", kRed),
            movie(),
            sound(),
            pages()};
  }

  static std::shared_ptr<QuiltMedia> addFile(QuiltDocument& document, const Path& file) {
    const auto source = QuiltMediaSource::initWithPath(file);
    EXPECT_NE(source, nullptr) << file;
    const auto item = QuiltMedia::init();
    item->setTitle(file.stem().native());
    item->addSource(source);
    document.addMedia(item);
    return item;
  }

  /// An interactive document with a theme, saved.
  std::shared_ptr<QuiltDocument> interactive(const std::string& name = "package") {
    auto document = made(name);
    document->setTheme(QuiltTheme::initWithPath(themeBundle()));
    document->setType(kQuiltDocumentTypeInteractive);
    document->setTitle("A title");
    return document;
  }

  static Rgba middleOf(const Path& file) {
    const auto image = ImageWrapper::imageWithPath(file);
    EXPECT_NE(image, nullptr) << file;
    const auto pixels = image ? image->bitmap() : platform::Error{};
    EXPECT_TRUE(pixels) << file;
    return pixels ? support::pixelAt(*pixels, pixels->width / 2, pixels->height / 2) : Rgba{};
  }
  static bool isAbout(const Rgba& colour, const Rgba& expected) { return support::distance(colour, expected) < 40; }

  /// The files that the records of a package's items name and that are not there.
  static std::vector<std::string> missingFiles(const Path& package) {
    std::vector<std::string> missing;
    const std::function<void(const platform::PropertyList&)> look = [&](const platform::PropertyList& value) {
      if (const auto* list = value.as<Array>()) std::for_each(list->begin(), list->end(), look);
      const auto* record = value.as<Dictionary>();
      if (!record) return;
      for (const auto& [key, entry] : *record) {
        const auto* text = entry.as<std::string>();
        const bool isFile = key == "RelativePath" || (key == "PosterImagePath" && record->real("PosterImageWidth") > 0);
        if (text && isFile && !std::filesystem::exists(package / *text)) missing.push_back(*text);
        look(entry);
      }
    };
    look(readRecord(package / "properties.plist"));
    return missing;
  }

  void expectWhole(const Path& package, std::size_t items) {
    ASSERT_FALSE(package.empty()) << ::testing::PrintToString(takeProblems());
    const Dictionary record = readRecord(package / "properties.plist");
    EXPECT_THAT(*record.array("Media"), SizeIs(items));
    EXPECT_THAT(missingFiles(package), IsEmpty());
    EXPECT_TRUE(std::filesystem::exists(package / "poster.png"));
  }

  /// Everything that may be asked of a document whose files are in its package.
  void expectEverythingWorks(QuiltDocument& document) {
    document.performBlockOnMedia([](const auto& item) {
      EXPECT_NE(item->posterImage(), nullptr);
      EXPECT_TRUE(item->posterImage()->bitmap());
      item->performBlockOnSources([](const auto& source) {
        EXPECT_NE(source->thumbnailImage(), nullptr);
        EXPECT_TRUE(source->thumbnailImage()->bitmap());
        for (std::size_t i = 0; i < source->previewCount(); ++i) {
          EXPECT_NE(source->previewAtIndex(i), nullptr);
          EXPECT_TRUE(source->previewAtIndex(i)->image()->bitmap());
        }
        return true;
      });
      item->invalidatePosterImage();
      EXPECT_NE(item->posterImage(), nullptr);
      return true;
    });
    EXPECT_TRUE(document.flattenWithProgressionBlock({}));
    EXPECT_TRUE(document.convertToFormat("480p", {}));
    EXPECT_TRUE(document.finalizeWithProgressionBlock({}));
    EXPECT_THAT(missingFiles(document.path()), IsEmpty());
    const std::size_t count = document.mediaCount();
    expectWhole(document.exportToPath(target(), false, {"Desktop", "480p"}, {}), count);
    const auto other = made("merged-" + std::to_string(++_merged));
    EXPECT_TRUE(document.mergeIntoDocument(other, kDesktopOnly, {}));
    EXPECT_EQ(other->mediaCount(), count);
    EXPECT_TRUE(other->flattenWithProgressionBlock({}));
    EXPECT_THAT(takeProblems(), IsEmpty());
  }

 private:
  Path into(const std::string& name, const Path& file) const {
    return support::writeFile(outside() / name, support::bytesOf(file));
  }
  int _merged = 0;
};

TEST_F(PicturesTest, WhatIsAddedAndSavedIsExportedByAnotherProcess) {
  for (const Path& file : everyKind()) {
    SCOPED_TRACE(file.filename());
    const auto name = file.stem().native();
    const auto document = interactive(name);
    addFile(*document, file);
    addFile(*document, coloured("second.png", kBlue));
    document->setDescription("Saved once more");
    const auto again = reopened(*document);
    ASSERT_NE(again, nullptr);
    expectWhole(again->exportToPath(target(), false, kDesktopOnly, {}), 2);
    EXPECT_THAT(takeProblems(), IsEmpty());
  }
}

TEST_F(PicturesTest, OnceFlattenedADocumentReadsNothingOutside) {
  const auto document = interactive();
  for (const Path& file : everyKind()) addFile(*document, file);
  document->updatePosterImage(ImageWrapper::imageWithPath(coloured("poster.png", kBlue)));
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  std::filesystem::remove_all(outside());
  takeLines();
  expectEverythingWorks(*document);
  EXPECT_TRUE(isAbout(middleOf(document->posterImagePath()), kBlue));

  std::filesystem::create_directories(outside());
  const auto again = reopened(*document);
  ASSERT_NE(again, nullptr);
  std::filesystem::remove_all(outside());
  expectEverythingWorks(*again);
}

TEST_F(PicturesTest, AnOriginalThatIsReplacedLaterChangesNothing) {
  for (const char* name : {"a.png", "b.jpg", "c.gif", "d.tif"}) {
    SCOPED_TRACE(name);
    const auto document = interactive(Path(name).stem());
    const auto item = addFile(*document, coloured(name, kRed));
    ASSERT_TRUE(document->flattenWithProgressionBlock({}));
    coloured(name, kBlue);
    const Path exported = document->exportToPath(target(), false, kDesktopOnly, {});
    expectWhole(exported, 1);
    const Path media = exported / "media" / item->uuid();
    EXPECT_TRUE(isAbout(middleOf(media / "poster.jpg"), kRed));
    EXPECT_TRUE(isAbout(middleOf(media / "sources" / item->sourceAtIndex(0)->uuid() / "previews" / "0.jpg"), kRed));
  }
}

TEST_F(PicturesTest, AMontageIsDrawnAgainFromThePackage) {
  const auto document = interactive();
  const auto item = QuiltMedia::init();
  item->setContentCategory(Text(kQuiltMediaContentCategoryMontage));
  for (const char* name : {"a.png", "b.png"}) item->addSource(QuiltMediaSource::initWithPath(coloured(name, kRed)));
  document->addMedia(item);
  ASSERT_NE(item->posterImage(), nullptr);
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  std::filesystem::remove_all(outside());
  item->invalidatePosterImage();
  ASSERT_NE(item->posterImage(), nullptr);
  const auto pixels = ImageWrapper::imageWithPath(item->posterImagePath())->bitmap();
  ASSERT_TRUE(pixels);
  EXPECT_TRUE(isAbout(support::pixelAt(*pixels, 20, 20), kRed));
}

TEST_F(PicturesTest, TheDocumentsPosterOutlivesTheFileItWasGivenFrom) {
  const auto document = made();
  document->setType(kQuiltDocumentTypeStaticFile);
  addFile(*document, pages());
  document->updatePosterImage(ImageWrapper::imageWithPath(coloured("poster.png", kRed)));
  std::filesystem::remove(outside() / "poster.png");
  const Path exported = document->exportToPath(target(), false, kDesktopOnly, {});
  expectWhole(exported, 1);
  EXPECT_TRUE(isAbout(middleOf(exported / "poster.png"), kRed));
}

TEST_F(PicturesTest, APosterOfADocumentWithoutAPackageIsKeptInMemory) {
  const auto document = QuiltDocument::init();
  document->updatePosterImage(ImageWrapper::imageWithPath(coloured("poster.png", kRed)));
  std::filesystem::remove(outside() / "poster.png");
  const auto pixels = document->posterImage()->bitmap();
  ASSERT_TRUE(pixels);
  EXPECT_TRUE(isAbout(support::pixelAt(*pixels, 10, 10), kRed));
}

TEST_F(PicturesTest, AFileThatIsMovedIntoThePackageTakesItsPendingPreviewAlong) {
  for (const Path& file : {coloured("a.png", kRed), pages()}) {
    SCOPED_TRACE(file.filename());
    const auto document = made(file.stem());
    const auto source = addFile(*document, file)->sourceAtIndex(0);
    ASSERT_NE(source->previewAtIndex(0), nullptr);
    EXPECT_TRUE(source->flattenCopy(/*copy=*/false, {}));
    EXPECT_TRUE(std::filesystem::exists(source->previewAtIndex(0)->path()));
    EXPECT_FALSE(std::filesystem::exists(file));
    EXPECT_THAT(takeProblems(), IsEmpty());
  }
}

TEST_F(PicturesTest, AWrittenPreviewWhoseFileIsGoneIsMadeAgain) {
  const auto document = interactive();
  const auto source = addFile(*document, coloured("a.png", kRed))->sourceAtIndex(0);
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  const Path file = source->previewAtIndex(0)->path();
  ASSERT_NE(source->previewAtIndex(0)->image(), nullptr);
  std::filesystem::remove(file);
  EXPECT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_TRUE(std::filesystem::exists(file));

  const auto again = reopened(*document);
  std::filesystem::remove(file);
  expectWhole(again->exportToPath(target(), false, kDesktopOnly, {}), 1);
  EXPECT_TRUE(std::filesystem::exists(file));
}

TEST_F(PicturesTest, ThePosterOfAnItemWhoseFileIsGoneIsWrittenAgain) {
  const auto document = interactive();
  const auto item = addFile(*document, coloured("a.png", kRed));
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  ASSERT_NE(item->posterImage(), nullptr);
  std::filesystem::remove(item->posterImagePath());
  EXPECT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_TRUE(isAbout(middleOf(item->posterImagePath()), kRed));
}

TEST_F(PicturesTest, ThePixelsOfAPreviewStayInItsRecord) {
  const auto document = made();
  addFile(*document, coloured("a.png", kRed));
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  ASSERT_NE(document->mediaAtIndex(0)->sourceAtIndex(0)->previewAtIndex(0), nullptr);
  document->update();
  const auto again = reopened(*document);
  again->setTitle("Saved again");
  Dictionary record = saved(*document);
  Dictionary& item = *(*record.array("Media"))[0].as<Dictionary>();
  Dictionary& source = *(*item.array("Sources"))[0].as<Dictionary>();
  Dictionary& preview = *(*source.array("Previews"))[0].as<Dictionary>();
  EXPECT_EQ(preview.real("Width"), 800);
  EXPECT_EQ(preview.real("Height"), 600);
}

TEST_F(PicturesTest, PastTheEndThereIsNoPreview) {
  const auto document = made();
  for (const Path& file : {coloured("a.png", kRed), sound(), pages()}) addFile(*document, file);
  const auto link = addWebItem(*document);
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  document->performBlockOnMedia([](const auto& item) {
    const auto source = item->sourceAtIndex(0);
    EXPECT_EQ(source->previewAtIndex(source->previewCount()), nullptr);
    for (const auto& preview : source->previews()) EXPECT_LT(preview->index(), source->previewCount());
    return true;
  });
  EXPECT_TRUE(document->flattenWithProgressionBlock({}));
}

// ---- What cannot be drawn

/// A picture whose header is in order and whose pixels are not there.
std::string pictureWithoutPixels() {
  const platform::Bitmap noise = support::paint(800, 600, [](std::size_t x, std::size_t y) {
    return Rgba{static_cast<std::uint8_t>(x * 7 + y * 13), static_cast<std::uint8_t>(x * y), 0, 255};
  });
  return support::encode(noise, {.suffix = ".jp2"}).substr(0, 400);
}

TEST_F(PicturesTest, APictureThatCannotBeDrawnIsLeftOutWithOneWarningAndTheRestGoesOn) {
  const auto document = interactive();
  const Path bad = support::writeFile(outside() / "bad.jp2", pictureWithoutPixels());
  addFile(*document, bad);
  addFile(*document, coloured("good.png", kRed));
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  const Path exported = document->exportToPath(target(), false, {"Desktop", "480p"}, {});
  const support::Lines problems = takeProblems();
  EXPECT_THAT(problems, SizeIs(1)) << ::testing::PrintToString(problems);
  if (!problems.empty()) {
    EXPECT_THAT(problems[0].text, HasSubstr("Picture 1 of \"bad\" cannot be drawn and is left out"));
    EXPECT_THAT(problems[0].text, HasSubstr(".jp2"));
  }
  expectWhole(exported, 2);
  const auto again = reopened(*document);
  expectWhole(again->exportToPath(target(), false, kDesktopOnly, {}), 2);
}

TEST_F(PicturesTest, ThePagesThatCanBeDrawnAreThere) {
  class BadSecondPage final : public ImageWrapper {
   public:
    [[nodiscard]] platform::Size size() const override { return {100, 100}; }
    [[nodiscard]] std::shared_ptr<ImageWrapper> convertToSD() const override { return copy(); }
    [[nodiscard]] std::shared_ptr<ImageWrapper> convertToHD() const override { return copy(); }
    [[nodiscard]] platform::Result<void> saveAsJPGAtPath(const Path& path) const override { return bad(path); }
    [[nodiscard]] platform::Result<void> saveAsPNGAtURL(const Url& url) const override {
      return bad(url.relativePath());
    }
    [[nodiscard]] platform::Result<platform::Bitmap> bitmap() const override { return bad({}); }

   private:
    static std::shared_ptr<ImageWrapper> copy() { return std::make_shared<BadSecondPage>(); }
    static platform::Error bad(const Path& file) {
      return {platform::ErrorKind::Damaged, "The page is damaged.", file};
    }
  };
  class Pages final : public platform::Glance {
   public:
    [[nodiscard]] std::shared_ptr<ImageWrapper> thumbnailImageForURL(const Url&) const override { return nullptr; }
    [[nodiscard]] std::size_t documentPagesCount(const Path&) const override { return 3; }
    [[nodiscard]] std::optional<platform::DocumentPage> documentPageAtIndex(const Path&,
                                                                            std::size_t index) const override {
      if (index == 1) return platform::DocumentPage{std::make_shared<BadSecondPage>(), "Second"};
      if (index < 3) return platform::DocumentPage{picture(40, 60), "Another"};
      return std::nullopt;
    }
  };
  const auto document = interactive();
  const support::Installed<Pages> glance(&platform::Services::glance);
  const auto item = addFile(*document, pages());
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  const Path exported = document->exportToPath(target(), false, kDesktopOnly, {});
  expectWhole(exported, 1);
  EXPECT_THAT(namesIn(exported / "media" / item->uuid() / "sources" / item->sourceAtIndex(0)->uuid() / "previews"),
              ElementsAre("0.jpg", "2.jpg"));
  const support::Lines problems = takeProblems();
  EXPECT_THAT(problems, SizeIs(1)) << ::testing::PrintToString(problems);
  if (!problems.empty()) {
    EXPECT_THAT(problems[0].text, HasSubstr("Picture 2 of \"pages\""));
  }
}

TEST_F(PicturesTest, AFileThatCannotBeOpenedIsRefusedAtTheDoor) {
  const std::string whole = support::makePages(2);
  for (const char* name :
       {"a.pdf", "a.docx", "a.pptx", "a.doc", "a.odt", "a.tiff", "a.gif", "a.jp2", "a.epub", "a.mp4"})
    EXPECT_EQ(QuiltMediaSource::initWithPath(writeFile(outside() / name, "")), nullptr) << name;
  EXPECT_EQ(QuiltMediaSource::initWithPath(writeFile(outside() / "b.pdf", "%PDF-1.4\n")), nullptr);
  EXPECT_EQ(QuiltMediaSource::initWithPath(writeFile(outside() / "b.docx", "PK\3\4 and no more")), nullptr);
}

}  // namespace
}  // namespace quilt
