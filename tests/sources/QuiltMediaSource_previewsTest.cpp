// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <atomic>
#include <optional>
#include <thread>

#include "quilt/platform/base/MainThread.h"
#include "quilt/sources/QuiltMediaSource.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/FaultyServices.h"
#include "tests/support/PackageFixture.h"

namespace quilt {
namespace {

using platform::DocumentPage;
using platform::Services;
using support::critical;
using support::FaultyFiles;
using support::FaultyImages;
using support::Installed;
using support::Lines;
using support::warning;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

/// A document service whose pages a test writes. Remembers where it was called.
class ToldGlance final : public platform::Glance {
 public:
  std::vector<DocumentPage> pages;
  mutable std::vector<std::size_t> asked;
  mutable std::vector<bool> wasOnMainThread;
  bool preparesForEver = false;

  void prepareDocument(const Path&, const ContinueBlock& goesOn) const override {
    while (preparesForEver && goesOn()) std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  std::shared_ptr<ImageWrapper> thumbnailImageForURL(const Url&) const override { return nullptr; }
  std::size_t documentPagesCount(const Path&) const override {
    wasOnMainThread.push_back(platform::MainThread::isCurrent());
    return pages.size();
  }
  std::optional<DocumentPage> documentPageAtIndex(const Path&, std::size_t index) const override {
    wasOnMainThread.push_back(platform::MainThread::isCurrent());
    asked.push_back(index);
    return index < pages.size() ? std::optional(pages[index]) : std::nullopt;
  }
};

/// A movie without duration, poster time, chapters or artwork, whose frames a test decides about.
class BareToolkit final : public platform::MovieToolkit {
 public:
  std::shared_ptr<ImageWrapper> frame;  ///< null: taking a frame fails
  std::vector<platform::Chapter> chapters;
  mutable std::vector<double> asked;

  platform::Result<std::unique_ptr<platform::Movie>> openMovie(const Path&) const override {
    return std::unique_ptr<platform::Movie>(std::make_unique<Bare>(*this));
  }

 private:
  class Bare final : public platform::Movie {
   public:
    explicit Bare(const BareToolkit& toolkit) : _toolkit(toolkit) {}
    std::optional<double> duration() const override { return std::nullopt; }
    std::optional<double> posterTime() const override { return std::nullopt; }
    const std::vector<platform::Chapter>& chapters() const override { return _toolkit.chapters; }
    std::optional<double> keyFrameTimeAtOrBefore(double) override { return std::nullopt; }
    platform::Result<std::shared_ptr<ImageWrapper>> frameAtTime(double time) override {
      _toolkit.asked.push_back(time);
      if (!_toolkit.frame) return support::kFault;
      return _toolkit.frame;
    }
    std::shared_ptr<ImageWrapper> albumArtworkMovie() override { return nullptr; }

   private:
    const BareToolkit& _toolkit;
  };
};

class QuiltMediaSourcePreviewsTest : public support::PackageFixture {
 protected:
  /// A source that holds a document file with nothing in it; what its pages are the service says.
  std::shared_ptr<QuiltMediaSource> documentSource() {
    return addSource(writeFile(folder() / "a.pdf", support::makePages(1)));
  }
  std::shared_ptr<QuiltMediaSource> movieSource() {
    support::MediaSpec spec = support::silentMovie();
    spec.duration = 1;
    return addSource(support::makeMedia(spec));
  }
  /// A preview that waits to be written.
  std::shared_ptr<QuiltMediaPreview> pendingPreview(QuiltMediaSource& source) {
    auto preview = source.previewAtIndex(0);
    EXPECT_NE(preview, nullptr);
    takeLines();
    return preview;
  }
};

// ---- A fresh preview

TEST_F(QuiltMediaSourcePreviewsTest, AFreshPreviewIsScaledToHdAndHasNothingElse) {
  const auto preview = QuiltMediaPreview::initWithImageWrapper(picture(2560, 720));
  EXPECT_EQ(preview->uuid().size(), 36u);
  EXPECT_EQ(preview->title(), std::nullopt);
  EXPECT_EQ(preview->content(), std::nullopt);
  EXPECT_EQ(preview->index(), kNoIndex);
  EXPECT_EQ(preview->timecode(), 3.4028234663852886e38);
  EXPECT_EQ(preview->image()->size(), (platform::Size{1280, 360}));
  EXPECT_EQ(preview->width(), 1280);
  EXPECT_EQ(preview->height(), 360);
  EXPECT_FALSE(preview->isFlattened());
  EXPECT_EQ(preview->sourceOwner(), nullptr);
}

TEST_F(QuiltMediaSourcePreviewsTest, APreviewWithoutAPlaceHasNoPictureAndSaysNothing) {
  const auto preview = QuiltMediaPreview::initWithDictionary({{"Index", 0}}, nullptr);
  takeLines();
  EXPECT_EQ(preview->image(), nullptr);
  EXPECT_EQ(preview->totalSizeInMegaBytes(), 0);
  EXPECT_THAT(takeLines(), IsEmpty());
}

// ---- Documents

TEST_F(QuiltMediaSourcePreviewsTest, ADocumentThatTakesLongToPrepareRepeatsTheStartUntilItIsCancelled) {
  keepDocumentBusy();
  const Installed<ToldGlance> glance(&Services::glance);
  glance->preparesForEver = true;
  const auto source = documentSource();
  takeLines();
  std::vector<double> reported;
  EXPECT_FALSE(source->previewWithProgressionBlock([&](const auto& preview, double percentage) {
    EXPECT_EQ(preview, nullptr);
    reported.push_back(percentage);
    return reported.size() < 2;
  }));
  EXPECT_EQ(reported, (std::vector<double>{0, 0}));
  EXPECT_EQ(takeProblems(), Lines{critical("Previewing media at URL \"" + source->previewItemURL()->absoluteString() +
                                           "\" has been cancelled")});
  EXPECT_THAT(glance->wasOnMainThread, IsEmpty());
}

TEST_F(QuiltMediaSourcePreviewsTest, ADocumentHasAPreviewForEachPageWithItsText) {
  const Installed<ToldGlance> glance(&Services::glance);
  glance->pages = {{picture(40, 60), "First line\nSecond line"}, {picture(40, 60), ""}, {picture(40, 60), "Alone"}};
  const auto source = documentSource();
  EXPECT_EQ(source->previewCount(), 3u);
  const auto first = source->previewAtIndex(0);
  ASSERT_NE(first, nullptr);
  EXPECT_EQ(first->title(), "First line");
  EXPECT_EQ(first->content(), "First line\nSecond line");
  EXPECT_EQ(first->index(), 0u);
  EXPECT_EQ(first->timecode(), kNoTimecode);
  EXPECT_EQ(source->previewAtIndex(1)->title(), "");
  EXPECT_EQ(source->previewAtIndex(2)->content(), "Alone");
  EXPECT_EQ(source->previewAtIndex(3), nullptr);
  EXPECT_THAT(glance->asked, ElementsAre(0, 1, 2, 3));
}

TEST_F(QuiltMediaSourcePreviewsTest, PagesAreAskedForOnTheMainThreadAlsoByAWorker) {
  keepDocumentBusy();
  const Installed<ToldGlance> glance(&Services::glance);
  glance->pages = {{picture(4, 4), "Page"}};
  const auto source = documentSource();
  std::atomic<bool> done = false;
  std::thread worker([&] {
    source->previewWithProgressionBlock({});
    done = true;
    platform::services().runLoop->wake();
  });
  platform::services().runLoop->runUntil([&] { return done.load(); });
  worker.join();
  EXPECT_EQ(source->previews().size(), 1u);
  EXPECT_EQ(glance->wasOnMainThread.size(), 2u) << "one count, one page";
  EXPECT_THAT(glance->wasOnMainThread, Each(true));
}

TEST_F(QuiltMediaSourcePreviewsTest, ADocumentWithoutPagesHasNoPosterAndSaysNothing) {
  const Installed<ToldGlance> glance(&Services::glance);
  const auto source = documentSource();
  takeLines();
  EXPECT_EQ(source->previewCount(), 0u);
  EXPECT_EQ(source->posterImage(), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

// ---- Movies

TEST_F(QuiltMediaSourcePreviewsTest, AMovieThatKnowsNoTimesIsShownAtItsStart) {
  keepDocumentBusy();
  const auto source = movieSource();
  const Installed<BareToolkit> movies(&Services::movies);
  movies->frame = picture(4, 4);
  EXPECT_NE(source->previewAtIndex(0), nullptr);
  EXPECT_THAT(movies->asked, ElementsAre(0));
}

TEST_F(QuiltMediaSourcePreviewsTest, AChapterIsShownAtItsStart) {
  const auto source = movieSource();
  const Installed<BareToolkit> movies(&Services::movies);
  movies->frame = picture(4, 4);
  movies->chapters = {{"One", 0}, {"Two", 12.5}};
  const auto preview = source->previewAtIndex(1);
  ASSERT_NE(preview, nullptr);
  EXPECT_EQ(preview->title(), "Two");
  EXPECT_EQ(preview->timecode(), 12.5);
  EXPECT_EQ(source->previewAtIndex(2), nullptr);
  EXPECT_THAT(movies->asked, ElementsAre(12.5));
}

TEST_F(QuiltMediaSourcePreviewsTest, AFrameThatCannotBeTakenGivesNoPreviewAndTheWalkGoesOn) {
  keepDocumentBusy();
  const auto source = movieSource();
  const Installed<BareToolkit> movies(&Services::movies);
  movies->chapters = {{"One", 0}, {"Two", 1}};
  std::vector<std::pair<bool, double>> seen;
  EXPECT_TRUE(source->previewWithProgressionBlock([&](const auto& preview, double percentage) {
    seen.emplace_back(preview != nullptr, percentage);
    return true;
  }));
  EXPECT_THAT(seen, ElementsAre(std::pair(false, 50.0), std::pair(false, 100.0)));
  EXPECT_THAT(source->previews(), IsEmpty());
  EXPECT_FALSE(source->isPreviewed());
}

TEST_F(QuiltMediaSourcePreviewsTest, SharesOfTheWalkAreIntegerQuotients) {
  const auto source = movieSource();
  const Installed<BareToolkit> movies(&Services::movies);
  movies->frame = picture(4, 4);
  movies->chapters = {{"One", 0}, {"Two", 1}, {"Three", 2}};
  std::vector<double> shares;
  EXPECT_TRUE(source->previewWithProgressionBlock([&](const auto&, double percentage) {
    shares.push_back(percentage);
    return true;
  }));
  EXPECT_THAT(shares, ElementsAre(33, 66, 100));
}

TEST_F(QuiltMediaSourcePreviewsTest, ASourceIsPreviewedWhenEveryIndexHasAPreview) {
  keepDocumentBusy();
  const auto source = movieSource();
  const Installed<BareToolkit> movies(&Services::movies);
  movies->frame = picture(4, 4);
  movies->chapters = {{"One", 0}, {"Two", 1}};
  EXPECT_FALSE(source->isPreviewed());
  source->previewAtIndex(1);
  EXPECT_FALSE(source->isPreviewed());
  source->previewAtIndex(0);
  EXPECT_TRUE(source->isPreviewed());
}

// ---- Files

TEST_F(QuiltMediaSourcePreviewsTest, APreviewWhoseFolderCannotBeMadeIsNotFlattened) {
  const auto source = addSource(pictureFile(8, 8));
  const auto preview = pendingPreview(*source);
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = support::named("previews");
  EXPECT_FALSE(preview->flatten());
  EXPECT_EQ(takeLines(), Lines{critical("Failed to flatten intermediate directories for media preview at path \"" +
                                        source->previewsFolderPath().native() + "\": \"The disk is full.\"")});
  EXPECT_FALSE(preview->isFlattened());
  EXPECT_NE(preview->image(), nullptr) << "the picture is kept for another attempt";
}

TEST_F(QuiltMediaSourcePreviewsTest, APreviewThatCannotBeWrittenIsNotFlattened) {
  const Installed<FaultyImages> images(&Services::images);
  images->failSave = support::named("0.jpg");
  const auto source = addSource(pictureFile(8, 8));
  const auto preview = pendingPreview(*source);
  EXPECT_FALSE(preview->flatten());
  EXPECT_FALSE(preview->isFlattened());
  EXPECT_THAT(namesIn(source->previewsFolderPath()), IsEmpty());
  EXPECT_EQ(takeLines(), Lines{critical("Failed to write media source preview at path \"" + preview->path().native() +
                                        "\": \"The disk is full.\"")});
}

TEST_F(QuiltMediaSourcePreviewsTest, APreviewThatCannotBeSizedSaysWhy) {
  const auto source = addSource(pictureFile(8, 8));
  const auto preview = pendingPreview(*source);
  preview->setIsFlattened(true);
  EXPECT_EQ(preview->totalSizeInMegaBytes(), 0);
  const auto reason = platform::services().files->attributesOfItemAtPath(preview->path());
  ASSERT_FALSE(reason);
  EXPECT_EQ(takeLines(), Lines{warning("Source preview at path \"" + preview->path().native() +
                                       "\" cannot be sized: \"" + reason.error().text + "\"")});
}

TEST_F(QuiltMediaSourcePreviewsTest, ADeletionThatFailsIsLoggedAndThePreviewRemovedAllTheSame) {
  const auto source = addSource(pictureFile(8, 8));
  const auto preview = pendingPreview(*source);
  ASSERT_TRUE(preview->flatten());
  const Path file = preview->path();
  const Installed<FaultyFiles> files(&Services::files);
  files->failRemove = support::named("0.jpg");
  source->removePreview(preview);
  EXPECT_EQ(takeLines(),
            Lines{warning("Failed to delete preview at path \"" + file.native() + "\": \"The disk is full.\"")});
  EXPECT_THAT(source->previews(), IsEmpty());
  EXPECT_EQ(preview->sourceOwner(), nullptr);
  EXPECT_TRUE(std::filesystem::exists(file));
}

TEST_F(QuiltMediaSourcePreviewsTest, RemovingAPreviewThatWasNeverWrittenIsNoFailure) {
  const auto source = addSource(pictureFile(8, 8));
  const auto preview = pendingPreview(*source);
  source->removePreview(preview);
  source->removePreview(nullptr);
  EXPECT_THAT(source->previews(), IsEmpty());
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaSourcePreviewsTest, AddingAndRemovingAnnounceAndSave) {
  const auto source = addSource(pictureFile(8, 8));
  std::vector<platform::ChangePhase> phases;
  const auto observation = source->observe(
      "previews", [&](const platform::ChangeNotice& notice) { phases.push_back(notice.phase); },
      platform::ObservationOptions::Prior);
  using enum platform::ChangePhase;
  std::filesystem::remove(document()->propertiesPath());
  const auto preview = QuiltMediaPreview::initWithImageWrapper(picture(4, 4));
  source->addPreview(preview);
  EXPECT_THAT(phases, ElementsAre(Will, Did));
  EXPECT_TRUE(std::filesystem::exists(document()->propertiesPath()));
  std::filesystem::remove(document()->propertiesPath());
  source->removePreview(preview);
  EXPECT_THAT(phases, ElementsAre(Will, Did, Will, Did));
  EXPECT_TRUE(std::filesystem::exists(document()->propertiesPath()));
}

}  // namespace
}  // namespace quilt
