// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/collections/QuiltCollection.h"
#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"

namespace quilt {
namespace {

using platform::Services;
using support::dateOf;
using support::FaultyFiles;
using support::FaultyPropertyLists;
using support::Installed;
using support::Lines;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltDocumentMergeTest : public support::DocumentFixture {
 protected:
  QuiltDocumentMergeTest() : source(made("source")), target(made("target")) {
    source->setIsProcessing(true);
    source->setTitle("Tales");
    takeLines();
  }

  bool merge(const std::vector<std::string>& formats = {"Desktop"}) {
    return source->mergeIntoDocument(target, formats, [this](double) {
      ++reports;
      return true;
    });
  }

  /// A web link that only serves the given formats.
  static std::shared_ptr<QuiltMediaSource> linkFor(std::vector<std::string> formats, const char* title) {
    auto link = webSource();
    link->setTitle(title);
    link->derivativeAtIndex(0)->setCompatibilityTags(std::move(formats));
    return link;
  }
  static std::shared_ptr<QuiltMediaExtra> extraFor(std::vector<std::string> formats, const char* title) {
    auto extra = QuiltMediaExtra::init();
    extra->setTitle(title);
    extra->addDerivative(QuiltMediaDerivative::initWithURL(*Url::parse("https://example.org/extra")));
    extra->derivativeAtIndex(0)->setCompatibilityTags(std::move(formats));
    return extra;
  }
  static std::vector<std::string> titlesOf(const QuiltDocument& document) {
    std::vector<std::string> titles;
    for (const auto& item : document.media()) titles.push_back(item->title().value_or("none"));
    return titles;
  }

  const std::shared_ptr<QuiltDocument> source;
  const std::shared_ptr<QuiltDocument> target;
  int reports = 0;
};

// ---- Fields

TEST_F(QuiltDocumentMergeTest, EveryFieldIsCopied) {
  const auto collection = QuiltCollection::initWithPath(folder() / "collection");
  const auto theme = QuiltTheme::initWithPath(themeBundle());
  ASSERT_NE(theme, nullptr);
  ASSERT_NE(collection, nullptr);
  source->setUuid("SOURCE");
  source->setDescription("Description");
  source->setAuthor("Author");
  source->setKeywords("Keywords");
  source->setCategory("Category");
  source->setAdvisoryLabel("Label");
  source->setJukeboxOrder(12);
  source->setTheme(theme);
  source->setCollectionOwner(collection);
  source->setCreationDate(dateOf("2001-01-01T00:00:00Z"));
  source->setModifiedDate(dateOf("2002-02-02T00:00:00Z"));
  source->setType("Movie");
  source->setLastPublishURL("https://example.org/");
  EXPECT_TRUE(merge());
  EXPECT_EQ(target->uuid(), "SOURCE");
  EXPECT_EQ(target->title(), "Tales");
  EXPECT_EQ(target->description(), "Description");
  EXPECT_EQ(target->author(), "Author");
  EXPECT_EQ(target->keywords(), "Keywords");
  EXPECT_EQ(target->category(), "Category");
  EXPECT_EQ(target->advisoryLabel(), "Label");
  EXPECT_EQ(target->jukeboxOrder(), 12);
  EXPECT_EQ(target->theme(), theme);
  EXPECT_EQ(target->collectionOwner(), collection);
  EXPECT_EQ(target->creationDate(), dateOf("2001-01-01T00:00:00Z"));
  EXPECT_EQ(target->type(), "Movie");
  EXPECT_EQ(target->lastPublishURL(), "https://example.org/");
  EXPECT_EQ(target->path(), package("target"));
}

TEST_F(QuiltDocumentMergeTest, TheModifiedDateIsTheSources) {
  source->setModifiedDate(dateOf("2002-02-02T00:00:00Z"));
  clock().advance(std::chrono::hours(1));
  addWebItem(*source);
  EXPECT_TRUE(merge());
  EXPECT_EQ(target->modifiedDate(), dateOf("2002-02-02T00:00:00Z"));
}

TEST_F(QuiltDocumentMergeTest, NothingIsSavedAndTheBlockIsNeverCalled) {
  addWebItem(*source);
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  EXPECT_TRUE(merge());
  EXPECT_EQ(lists->writes, 0);
  EXPECT_EQ(reports, 0);
  EXPECT_FALSE(std::filesystem::exists(target->propertiesPath()));
  EXPECT_FALSE(target->isProcessing());
}

TEST_F(QuiltDocumentMergeTest, ADocumentWithoutItemsGivesItsFieldsAndItsPoster) {
  source->updatePosterImage(picture(30, 20));
  EXPECT_TRUE(merge());
  EXPECT_EQ(target->title(), "Tales");
  EXPECT_EQ(target->mediaCount(), 0u);
  EXPECT_THAT(treeOf(target->path()), ElementsAre("poster.png"));
  EXPECT_EQ(ImageWrapper::imageWithPath(target->posterImagePath())->size(), (platform::Size{30, 20}));
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltDocumentMergeTest, AnUntitledSourceLeavesTheTargetUntitled) {
  source->setTitle(std::nullopt);
  EXPECT_TRUE(merge());
  EXPECT_EQ(target->title(), std::nullopt);
  EXPECT_EQ(source->title(), std::nullopt);
}

// ---- Items

TEST_F(QuiltDocumentMergeTest, AnItemIsRebuiltWithItsChildren) {
  const auto item = addItem(*source, "First");
  item->setDescription("of all");
  item->setContentCategory(kQuiltMediaContentCategoryMontage);
  const auto link = linkFor({"Desktop", "720p", "480p"}, "Link");
  link->setDescription("Linked");
  link->setTimecode(4.5);
  item->addSource(link);
  item->addExtra(extraFor({"Desktop"}, "Extra"));
  const auto commentary = linkFor({"Desktop"}, "Commentary");
  commentary->setTimecode(1);
  item->setAudioCommentarySource(commentary);
  ASSERT_TRUE(merge());

  ASSERT_EQ(target->mediaCount(), 1u);
  const auto copy = target->mediaAtIndex(0);
  EXPECT_NE(copy, item);
  EXPECT_EQ(copy->uuid(), item->uuid());
  EXPECT_EQ(copy->title(), "First");
  EXPECT_EQ(copy->description(), "of all");
  EXPECT_EQ(copy->contentCategory(), kQuiltMediaContentCategoryMontage);
  EXPECT_EQ(copy->documentOwner(), target);

  const auto twin = copy->sourceAtIndex(0);
  EXPECT_NE(twin, link);
  EXPECT_EQ(twin->uuid(), link->uuid());
  EXPECT_EQ(twin->title(), "Link");
  EXPECT_EQ(twin->description(), "Linked");
  EXPECT_EQ(twin->timecode(), 4.5);
  EXPECT_EQ(twin->mediaOwner(), copy);
  ASSERT_EQ(twin->derivativeCount(), 1u);
  EXPECT_NE(twin->derivativeAtIndex(0), link->derivativeAtIndex(0));
  EXPECT_EQ(twin->derivativeAtIndex(0)->uuid(), link->derivativeAtIndex(0)->uuid());
  EXPECT_EQ(twin->derivativeAtIndex(0)->url(), link->derivativeAtIndex(0)->url());

  ASSERT_EQ(copy->extraCount(), 1u);
  EXPECT_EQ(copy->extraAtIndex(0)->title(), "Extra");
  EXPECT_EQ(copy->extraAtIndex(0)->uuid(), item->extraAtIndex(0)->uuid());
  EXPECT_EQ(copy->extraAtIndex(0)->previews().size(), 1u);
  ASSERT_NE(copy->audioCommentarySource(), nullptr);
  EXPECT_EQ(copy->audioCommentarySource()->uuid(), commentary->uuid());
  EXPECT_EQ(copy->audioCommentarySource()->timecode(), 1);
  EXPECT_EQ(copy->audioCommentarySource()->mediaOwner(), copy);
  EXPECT_EQ(copy->audioCommentarySource()->derivativeCount(), 1u);
  EXPECT_THAT(copy->audioCommentarySource()->previews(), IsEmpty()) << "the commentary's previews are not copied";
  EXPECT_EQ(source->mediaAtIndex(0), item);
  EXPECT_EQ(item->documentOwner(), source);
}

TEST_F(QuiltDocumentMergeTest, PreviewsAreCopiedWithTheirFields) {
  const auto item = addWebItem(*source);
  const auto preview = item->sourceAtIndex(0)->previewAtIndex(0);
  preview->setTitle("Still");
  preview->setContent("Text");
  preview->setTimecode(2.5);
  ASSERT_TRUE(merge());
  const auto previews = target->mediaAtIndex(0)->sourceAtIndex(0)->previews();
  ASSERT_EQ(previews.size(), 1u);
  EXPECT_NE(previews[0], preview);
  EXPECT_EQ(previews[0]->uuid(), preview->uuid());
  EXPECT_EQ(previews[0]->title(), "Still");
  EXPECT_EQ(previews[0]->content(), "Text");
  EXPECT_EQ(previews[0]->index(), 0u);
  EXPECT_EQ(previews[0]->timecode(), 2.5);
  EXPECT_FALSE(previews[0]->isFlattened());
  EXPECT_EQ(previews[0]->image()->size(), preview->image()->size());
}

TEST_F(QuiltDocumentMergeTest, OneDerivativeIsMadeForEachFormatInTheirOrder) {
  const auto item = addPictureItem(*source, 1600, 1200);
  item->sourceAtIndex(0)->addDerivative(QuiltMediaDerivative::initWithPath(pictureFile(64, 48)));
  ASSERT_TRUE(merge({"480p", "Desktop"}));
  const auto twin = target->mediaAtIndex(0)->sourceAtIndex(0);
  ASSERT_EQ(twin->derivativeCount(), 2u);
  EXPECT_EQ(twin->derivativeAtIndex(0)->url(), Url::fileUrl(folder() / "picture.png"));
  EXPECT_EQ(twin->derivativeAtIndex(1)->url(), Url::fileUrl(folder() / "1600x1200.png"));
  EXPECT_FALSE(twin->derivativeAtIndex(0)->isFlattened());
}

TEST_F(QuiltDocumentMergeTest, ALowerGradeStandsInForAMissingOne) {
  addPictureItem(*source, 64, 48);
  ASSERT_TRUE(merge({"Desktop"}));
  EXPECT_THAT(target->availableFormats(), ElementsAre("480p"));
}

TEST_F(QuiltDocumentMergeTest, WithoutFormatsEverythingIsCopiedButTheDerivatives) {
  const auto item = addWebItem(*source, "A");
  item->addExtra(extraFor({"Desktop"}, "Extra"));
  item->setAudioCommentarySource(linkFor({}, "Commentary"));
  addWebItem(*source, "B");
  EXPECT_TRUE(merge({}));
  EXPECT_THAT(titlesOf(*target), ElementsAre("A", "B"));
  const auto copy = target->mediaAtIndex(0);
  EXPECT_EQ(copy->sourceAtIndex(0)->derivativeCount(), 0u);
  EXPECT_EQ(copy->sourceAtIndex(0)->previews().size(), 1u);
  EXPECT_EQ(copy->extraAtIndex(0)->derivativeCount(), 0u);
  EXPECT_EQ(copy->extraAtIndex(0)->previews().size(), 1u);
  EXPECT_EQ(copy->audioCommentarySource()->derivativeCount(), 0u);
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltDocumentMergeTest, ASourceWithoutPreviewsIsCopiedWithoutAny) {
  const auto item = addItem(*source, "A");
  item->addSource(QuiltMediaSource::init());
  EXPECT_TRUE(merge({}));
  ASSERT_EQ(target->mediaCount(), 1u);
  EXPECT_THAT(target->mediaAtIndex(0)->sourceAtIndex(0)->previews(), IsEmpty());
}

// ---- What stops the walk

TEST_F(QuiltDocumentMergeTest, AMissingFormatLeavesTheItemsBeforeIt) {
  addItem(*source, "A")->addSource(linkFor({"480p"}, "good"));
  addItem(*source, "B")->addSource(linkFor({"Desktop"}, "bad"));
  addItem(*source, "C")->addSource(linkFor({"480p"}, "never reached"));
  takeLines();
  EXPECT_TRUE(merge({"480p"}));
  EXPECT_THAT(titlesOf(*target), ElementsAre("A"));
  EXPECT_EQ(takeProblems(),
            Lines{warning("Failed to import document \"Tales\" : \"Cannot retrieve derivative of format "
                          "\"480p\" of media \"bad\"\"")});
  EXPECT_FALSE(target->isProcessing());
}

TEST_F(QuiltDocumentMergeTest, PreviewsThatCannotBeWalkedStopTheWalk) {
  addWebItem(*source, "A");
  addItem(*source, "B")->addSource(linkFor({"Desktop"}, "bad"));
  const Path previews = source->mediaAtIndex(1)->sourceAtIndex(0)->previewsFolderPath();
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = [previews](const Path& path) { return path == previews; };
  takeLines();
  EXPECT_TRUE(merge());
  EXPECT_THAT(titlesOf(*target), ElementsAre("A"));
  EXPECT_EQ(takeProblems().back(),
            warning("Failed to import document \"Tales\" : \"Cannot retrieve previews of media \"bad\"\""));
}

TEST_F(QuiltDocumentMergeTest, ACommentaryWithoutTheFormatStopsTheWalk) {
  addWebItem(*source, "A");
  addWebItem(*source, "B")->setAudioCommentarySource(linkFor({"Desktop"}, "Commentary"));
  takeLines();
  EXPECT_TRUE(merge({"480p"}));
  EXPECT_THAT(titlesOf(*target), ElementsAre("A"));
  EXPECT_EQ(takeProblems(), Lines{warning("Failed to import document \"Tales\" : Cannot retrieve derivative of format "
                                          "\"480p\" of audio commentary")});
}

TEST_F(QuiltDocumentMergeTest, AnExtraWithoutTheFormatStopsTheWalk) {
  addWebItem(*source, "A");
  addWebItem(*source, "B")->addExtra(extraFor({"Desktop"}, "bad"));
  takeLines();
  EXPECT_TRUE(merge({"480p"}));
  EXPECT_THAT(titlesOf(*target), ElementsAre("A"));
  EXPECT_EQ(takeProblems(), Lines{warning("Failed to create import \"Tales\": \"Cannot retrieve derivative of format "
                                          "\"480p\" of extra \"bad\"\"")});
}

TEST_F(QuiltDocumentMergeTest, ExtrasPreviewsThatCannotBeWalkedStopTheWalk) {
  addWebItem(*source, "A");
  const auto item = addWebItem(*source, "B");
  item->addExtra(extraFor({"Desktop"}, "bad"));
  const Path previews = item->extraAtIndex(0)->previewsFolderPath();
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = [previews](const Path& path) { return path == previews; };
  takeLines();
  EXPECT_TRUE(merge());
  EXPECT_THAT(titlesOf(*target), ElementsAre("A"));
  EXPECT_EQ(takeProblems().back(),
            warning("Failed to import document \"Tales\": \"Cannot retrieve previews of extra \"bad\"\""));
}

}  // namespace
}  // namespace quilt
