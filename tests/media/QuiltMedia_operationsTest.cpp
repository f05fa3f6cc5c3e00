// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <algorithm>

#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/testing/FailNthFileManager.h"
#include "tests/support/FaultyServices.h"
#include "tests/support/PackageFixture.h"

namespace quilt {
namespace {

using platform::Services;
using support::critical;
using support::debug;
using support::FailsAt;
using support::FaultyFiles;
using support::FaultyImages;
using support::Installed;
using support::Line;
using support::Lines;
using support::warning;
using ::testing::AllOf;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::Ge;
using ::testing::IsEmpty;
using ::testing::Le;

/// Reports the middle of a copy before it makes the copy.
class HalfwayFiles final : public platform::ForwardingFileManager {
 public:
  HalfwayFiles() : ForwardingFileManager(platform::services().files) {}

  int copyfile(const Path& source, const Path& destination, platform::CopyCallback callback, void* context) override {
    const auto attributes = attributesOfItemAtPath(source);
    const platform::CopyState half{attributes ? static_cast<std::int64_t>(attributes->size + 1) / 2 : 0};
    if (callback(0, platform::CopyStage::Progress, half, source, destination, context) == platform::CopyAnswer::Quit)
      return -ECANCELED;
    return ForwardingFileManager::copyfile(source, destination, callback, context);
  }
};

constexpr const char* kNoMediaFolder = "Failed to create intermediate directories for media at path \"";
constexpr const char* kNoSourcesFolder = "Failed to create intermediate directories for sources at path \"";
constexpr const char* kNoExtrasFolder = "Failed to create intermediate directories for extras at path \"";
constexpr const char* kNoSourceFolder = "Failed to create intermediate directories for source at path \"";

FailsAt at(const Path& path) {
  return [path](const Path& changed) { return changed == path; };
}

class QuiltMediaOperationsTest : public support::PackageFixture {
 protected:
  // A web link needs no file. Flattening it reports 100; converting it 0 and 100; finalizing it 0, 100 (its only
  // preview) and 100.
  template <class Child = QuiltMediaSource>
  static std::shared_ptr<Child> link() {
    return Child::initWithURL(*Url::parse("https://example.org/"));
  }
  /// A link that needs no flattening.
  template <class Child = QuiltMediaSource>
  static std::shared_ptr<Child> flattenedLink() {
    auto child = link<Child>();
    auto samples = QuiltMediaAudioSamples::init();
    samples->setIsFlattened(true);
    child->addAudioSamples(samples);
    EXPECT_TRUE(child->isFlattened());
    return child;
  }
  template <class Child = QuiltMediaSource>
  static std::shared_ptr<Child> offering(std::vector<std::string> formats) {
    auto child = Child::init();
    child->addDerivative(derivativeTagged(std::move(formats)));
    return child;
  }
  std::shared_ptr<QuiltMediaSource> addLink() { return added(link()); }
  std::shared_ptr<QuiltMediaExtra> addExtraLink() {
    auto extra = link<QuiltMediaExtra>();
    item()->addExtra(extra);
    return extra;
  }
  std::shared_ptr<QuiltMediaSource> setCommentaryLink() {
    auto commentary = link();
    item()->setAudioCommentarySource(commentary);
    return commentary;
  }
  std::shared_ptr<QuiltMediaSource> added(std::shared_ptr<QuiltMediaSource> source) {
    item()->addSource(source);
    return source;
  }

  std::string place() const { return item()->path().native(); }

  // What one child logs while an operation goes through it
  static Line noSamples() {
    return debug("Cannot audio to generate audio samples with non-file url \"https://example.org/\"");
  }
  static Lines flattened(const QuiltMediaSource& child) {
    return {debug("Flattening source at path \"" + child.path().native() + "\""), noSamples()};
  }
  static Lines finalized(const QuiltMediaSource& child) {
    return {debug("Finalizing source at path \"" + child.path().native() + "\"")};
  }
  static Lines notFlattened(const QuiltMediaSource& child) {
    return {debug("Flattening source at path \"" + child.path().native() + "\""),
            noFolder(kNoSourceFolder, child.path()),
            critical("Failed to flatten source at path \"" + child.path().native() + "\"")};
  }
  static Lines notFinalized(const QuiltMediaSource& child) {
    return {debug("Finalizing source at path \"" + child.path().native() + "\""),
            noFolder(kNoSourceFolder, child.path()),
            critical("Failed to finalize source at path \"" + child.path().native() + "\"")};
  }
  static Line noFolder(const char* failure, const Path& folder) {
    return debug(failure + folder.native() + "\": \"The disk is full.\"");
  }

  // What the item logs
  Line flattening() const { return debug("Flattening media at path \"" + place() + "\""); }
  Line finalizing() const { return debug("Finalizing media at path \"" + place() + "\""); }
  Line flattenFailed() const { return critical("Failed to flatten media files at path \"" + place() + "\""); }
  Line finalizeFailed() const { return critical("Failed to finalize source at path \"" + place() + "\""); }

  static Lines joined(const std::vector<Lines>& parts) {
    Lines all;
    for (const Lines& part : parts) all.insert(all.end(), part.begin(), part.end());
    return all;
  }

  /// Runs the operation with the folder or folders failing to be made; the progress it made is kept.
  bool flattenFailingAt(const FailsAt& folder) {
    const Installed<FaultyFiles> files(&Services::files);
    files->failCreate = folder;
    takeLines();
    return item()->flattenWithProgressionBlock(progress.block());
  }
  bool finalizeFailingAt(const FailsAt& folder) {
    const Installed<FaultyFiles> files(&Services::files);
    files->failCreate = folder;
    takeLines();
    return item()->finalizeWithProgressionBlock(progress.block());
  }

  static ProgressionBlock refusing() {
    return [](double) { return false; };
  }

  Progress progress;
};

// ---- isFlattened

TEST_F(QuiltMediaOperationsTest, AnItemWithoutChildrenIsNotFlattened) { EXPECT_FALSE(item()->isFlattened()); }

TEST_F(QuiltMediaOperationsTest, EverySourceAndEveryExtraMustBeFlattened) {
  added(flattenedLink());
  EXPECT_TRUE(item()->isFlattened());
  item()->addExtra(flattenedLink<QuiltMediaExtra>());
  EXPECT_TRUE(item()->isFlattened());
  const auto extra = addExtraLink();
  EXPECT_FALSE(item()->isFlattened());
  item()->removeExtra(extra);
  EXPECT_TRUE(item()->isFlattened());
  addLink();
  EXPECT_FALSE(item()->isFlattened());
}

TEST_F(QuiltMediaOperationsTest, FlattenedExtrasAloneAreEnough) {
  item()->addExtra(flattenedLink<QuiltMediaExtra>());
  EXPECT_TRUE(item()->isFlattened());
  addExtraLink();
  EXPECT_FALSE(item()->isFlattened());
}

TEST_F(QuiltMediaOperationsTest, TheCommentaryDecidesOnceTheListsHaveNothingAgainstIt) {
  item()->setAudioCommentarySource(flattenedLink());
  EXPECT_TRUE(item()->isFlattened()) << "alone";
  setCommentaryLink();
  EXPECT_FALSE(item()->isFlattened()) << "alone";
  added(flattenedLink());
  setCommentaryLink();
  EXPECT_FALSE(item()->isFlattened());
  item()->setAudioCommentarySource(flattenedLink());
  addLink();
  EXPECT_FALSE(item()->isFlattened()) << "a source that is not flattened comes first";
}

// ---- Flatten

TEST_F(QuiltMediaOperationsTest, FlatteningAnEmptyItemMakesItsFolders) {
  takeLines();
  EXPECT_TRUE(item()->flattenWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
  EXPECT_THAT(namesIn(item()->path()), ElementsAre("extras", "sources"));
  EXPECT_EQ(takeLines(), Lines{flattening()});
}

TEST_F(QuiltMediaOperationsTest, FlatteningCopiesEveryChildIntoTheItemsFolder) {
  const Path original = pictureFile(64, 48);
  const auto source = addSource(original);
  const auto extra = QuiltMediaExtra::initWithPath(original);
  item()->addExtra(extra);
  const auto commentary = QuiltMediaSource::initWithPath(support::makeMedia(support::m4aSound()));
  item()->setAudioCommentarySource(commentary);
  EXPECT_TRUE(item()->flattenWithProgressionBlock({}));
  const auto folderOf = [](const QuiltMediaSource& child) {
    EXPECT_TRUE(child.mainDerivative()->isFlattened());
    return child.mainDerivative()->url()->relativePath().parent_path();
  };
  EXPECT_EQ(folderOf(*source), item()->sourcesFolderPath() / source->uuid() / "derivatives");
  EXPECT_EQ(folderOf(*extra), item()->extrasFolderPath() / extra->uuid() / "derivatives");
  EXPECT_EQ(folderOf(*commentary), item()->sourcesFolderPath() / commentary->uuid() / "derivatives");
  EXPECT_TRUE(commentary->isFlattened());
  EXPECT_TRUE(std::filesystem::exists(original)) << "a copy, not a move";
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, ASourceThatIsFlattenedStillTakesItsStep) {
  keepDocumentBusy();
  const Installed<HalfwayFiles> files(&Services::files);
  addSource(pictureFile(64, 48));
  added(flattenedLink());
  addSource(pictureFile(32, 24));
  EXPECT_TRUE(item()->flattenWithProgressionBlock(progress.block()));
  // A copy reports 50 and 100, its derivative 100, its source 100.
  EXPECT_THAT(progress.values, ElementsAre(0,                                                              //
                                           50.0 / 3, 100.0 / 3, 100.0 / 3, 100.0 / 3,                      //
                                           66 + 50.0 / 3, 66 + 100.0 / 3, 66 + 100.0 / 3, 66 + 100.0 / 3,  //
                                           100));
}

TEST_F(QuiltMediaOperationsTest, AnExtraThatIsFlattenedTakesNoStep) {
  keepDocumentBusy();
  addLink();
  item()->addExtra(flattenedLink<QuiltMediaExtra>());
  addExtraLink();
  EXPECT_TRUE(item()->flattenWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100.0 / 3, 33 + 100.0 / 3, 100));
}

TEST_F(QuiltMediaOperationsTest, TheCommentaryTakesTheStepBetweenSourcesAndExtras) {
  keepDocumentBusy();
  addLink();
  item()->addExtra(flattenedLink<QuiltMediaExtra>());
  addExtraLink();
  setCommentaryLink();
  EXPECT_TRUE(item()->flattenWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 25, 25 + 25, 50 + 25, 100));
}

TEST_F(QuiltMediaOperationsTest, ACommentaryThatIsFlattenedStillTakesItsStep) {
  keepDocumentBusy();
  addLink();
  addExtraLink();
  item()->setAudioCommentarySource(flattenedLink());
  EXPECT_TRUE(item()->flattenWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100.0 / 3, 66 + 100.0 / 3, 100));
}

TEST_F(QuiltMediaOperationsTest, FlatteningLogsTheItemAndThenEachChildInOrder) {
  const auto first = addLink();
  const auto second = addLink();
  const auto extra = addExtraLink();
  const auto commentary = setCommentaryLink();
  takeLines();
  EXPECT_TRUE(item()->flattenWithProgressionBlock({}));
  EXPECT_EQ(takeLines(),
            joined({{flattening()}, flattened(*first), flattened(*second), flattened(*commentary), flattened(*extra)}));
}

TEST_F(QuiltMediaOperationsTest, TheFirstAndTheLastAnswerOfAFlattenHaveNoEffect) {
  added(flattenedLink());
  EXPECT_TRUE(item()->flattenWithProgressionBlock(refusing()));
}

TEST_F(QuiltMediaOperationsTest, AFlattenWithoutADocumentFails) {
  const auto loose = QuiltMedia::init();
  takeLines();
  EXPECT_FALSE(loose->flattenWithProgressionBlock(progress.block()));
  EXPECT_EQ(takeLines(), (Lines{debug("Flattening media at path \"(null)\""),
                                debug("Failed to flatten media because it is not attached to a document"),
                                critical("Failed to flatten media files at path \"(null)\"")}));
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, AFlattenWithoutAPathFails) {
  const auto pathless = QuiltDocument::init();
  item()->setDocumentOwner(pathless);
  takeLines();
  EXPECT_FALSE(item()->flattenWithProgressionBlock(progress.block()));
  EXPECT_EQ(takeLines(), (Lines{debug("Flattening media at path \"(null)\""),
                                debug("Failed to flatten media because it does not have a path"),
                                critical("Failed to flatten media files at path \"(null)\"")}));
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, AFlattenFailsWithoutTheItemsFolder) {
  keepDocumentBusy();
  addLink();
  EXPECT_FALSE(flattenFailingAt(at(item()->path())));
  EXPECT_EQ(takeLines(), (Lines{flattening(), noFolder(kNoMediaFolder, item()->path()), flattenFailed()}));
  EXPECT_THAT(progress.values, ElementsAre(0));
}

TEST_F(QuiltMediaOperationsTest, AFlattenFailsWithoutTheSourcesFolder) {
  addLink();
  EXPECT_FALSE(flattenFailingAt(at(item()->sourcesFolderPath())));
  EXPECT_EQ(takeLines(), (Lines{flattening(), noFolder(kNoMediaFolder, item()->sourcesFolderPath()), flattenFailed()}));
  EXPECT_THAT(progress.values, ElementsAre(0));
}

TEST_F(QuiltMediaOperationsTest, AFlattenFailsWithoutTheExtrasFolderWhenSourcesAndCommentaryAreDone) {
  keepDocumentBusy();
  const auto source = addLink();
  const auto commentary = setCommentaryLink();
  addExtraLink();
  EXPECT_FALSE(flattenFailingAt(at(item()->extrasFolderPath())));
  EXPECT_EQ(takeLines(), joined({{flattening()},
                                 flattened(*source),
                                 flattened(*commentary),
                                 {noFolder(kNoMediaFolder, item()->extrasFolderPath()), flattenFailed()}}));
  EXPECT_THAT(progress.values, ElementsAre(0, 100.0 / 3, 33 + 100.0 / 3));
}

TEST_F(QuiltMediaOperationsTest, AFlattenFailsWithASourceAndKeepsWhatWasDone) {
  const auto first = addSource(pictureFile(64, 48));
  const auto second = addLink();
  const auto third = addSource(pictureFile(32, 24));
  EXPECT_FALSE(flattenFailingAt(at(second->path())));
  const Lines lines = takeLines();
  const Lines expected =
      joined({notFlattened(*second), {debug("Failed to flatten source \"" + second->uuid() + "\""), flattenFailed()}});
  ASSERT_GT(lines.size(), expected.size());
  EXPECT_EQ(Lines(lines.end() - static_cast<std::ptrdiff_t>(expected.size()), lines.end()), expected);
  EXPECT_TRUE(first->mainDerivative()->isFlattened());
  EXPECT_FALSE(third->mainDerivative()->isFlattened());
  EXPECT_FALSE(std::filesystem::exists(item()->extrasFolderPath()));
}

TEST_F(QuiltMediaOperationsTest, AFlattenFailsWithTheCommentary) {
  keepDocumentBusy();
  const auto source = addLink();
  const auto commentary = setCommentaryLink();
  EXPECT_FALSE(flattenFailingAt(at(commentary->path())));
  EXPECT_EQ(takeLines(), joined({{flattening()},
                                 flattened(*source),
                                 notFlattened(*commentary),
                                 {debug("Failed to flatten source \"" + commentary->uuid() + "\""), flattenFailed()}}));
  EXPECT_THAT(progress.values, ElementsAre(0, 50));
}

TEST_F(QuiltMediaOperationsTest, AFlattenFailsWithAnExtra) {
  keepDocumentBusy();
  const auto source = addLink();
  const auto first = addExtraLink();
  const auto second = addExtraLink();
  addExtraLink();
  EXPECT_FALSE(flattenFailingAt(at(second->path())));
  EXPECT_EQ(takeLines(), joined({{flattening()},
                                 flattened(*source),
                                 flattened(*first),
                                 notFlattened(*second),
                                 {debug("Failed to flatten extra \"" + second->uuid() + "\""), flattenFailed()}}));
  EXPECT_THAT(progress.values, ElementsAre(0, 25, 25 + 25));
}

TEST_F(QuiltMediaOperationsTest, ACancelInsideACopyFailsTheFlattenAndLeavesNoFile) {
  keepDocumentBusy();
  const Installed<HalfwayFiles> files(&Services::files);
  const auto source = addSource(pictureFile(64, 48));
  addSource(pictureFile(32, 24));
  progress.cancelAt = 25;
  takeLines();
  EXPECT_FALSE(item()->flattenWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 25));
  const Lines lines = takeLines();
  ASSERT_GE(lines.size(), 2u);
  EXPECT_EQ(lines[lines.size() - 2], debug("Failed to flatten source \"" + source->uuid() + "\""));
  EXPECT_EQ(lines.back(), flattenFailed());
  EXPECT_THAT(namesIn(source->derivativesFolderPath()), IsEmpty());
  EXPECT_TRUE(item()->flattenWithProgressionBlock({})) << "and can be taken up again";
}

TEST_F(QuiltMediaOperationsTest, AFlattenIsNotLedOutOfTheDocumentByALink) {
  keepDocumentBusy();
  const auto source = addSource(pictureFile(64, 48));
  const Path outside = folder() / "outside";
  std::filesystem::create_directories(outside);
  std::filesystem::create_directories(document()->mediaFolderPath());
  std::filesystem::create_directory_symlink(outside, item()->path());
  takeLines();
  EXPECT_FALSE(item()->flattenWithProgressionBlock({}));
  EXPECT_EQ(takeLines(), (Lines{flattening(),
                                debug("Failed to create intermediate directories for media at path \"" + place() +
                                      "\": \"The folder leads out of the document\""),
                                flattenFailed()}));
  EXPECT_THAT(namesIn(outside), IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, AFaultAtAnyChangeOfTheDiskFailsTheFlattenWhichCanBeTakenUpAgain) {
  using platform::FailNthFileManager;
  std::size_t faults = 0;
  for (std::size_t n = 1; n < 1000; ++n) {
    SCOPED_TRACE("change " + std::to_string(n));
    const auto media = QuiltMedia::init();
    document()->addMedia(media);
    media->addSource(QuiltMediaSource::initWithPath(pictureFile(8, 8)));
    media->addExtra(QuiltMediaExtra::initWithPath(pictureFile(9, 9)));
    media->setAudioCommentarySource(QuiltMediaSource::initWithPath(pictureFile(10, 10)));
    takeLines();
    const auto files = std::make_shared<FailNthFileManager>(platform::services().files);
    const platform::ScopedService installed(&Services::files, files);
    files->failNth(n, platform::ErrorKind::NoSpace);
    const bool done = media->flattenWithProgressionBlock({});
    if (files->operations() < n) {
      EXPECT_TRUE(done);
      break;
    }
    ++faults;
    EXPECT_FALSE(done);
    EXPECT_EQ(takeLines().back(), critical("Failed to flatten media files at path \"" + media->path().native() + "\""));
    EXPECT_TRUE(media->flattenWithProgressionBlock({}));
    EXPECT_TRUE(media->sourceAtIndex(0)->mainDerivative()->isFlattened());
    EXPECT_TRUE(media->extraAtIndex(0)->mainDerivative()->isFlattened());
    EXPECT_TRUE(media->audioCommentarySource()->mainDerivative()->isFlattened());
  }
  EXPECT_GE(faults, 15u) << "three item folders, and three folders and a copy for each child";
}

// ---- Finalize

TEST_F(QuiltMediaOperationsTest, FinalizingAnEmptyItemMakesItsFolders) {
  takeLines();
  EXPECT_TRUE(item()->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
  EXPECT_THAT(namesIn(item()->path()), ElementsAre("extras", "sources"));
  EXPECT_EQ(takeLines(), Lines{finalizing()});
}

TEST_F(QuiltMediaOperationsTest, EverySourceReportsIntoTheFirstStepAndTheExtrasFollow) {
  addLink();
  addLink();
  addExtraLink();
  EXPECT_TRUE(item()->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0,                                   //
                                           0, 100.0 / 3, 100.0 / 3,             //
                                           0, 100.0 / 3, 100.0 / 3,             //
                                           33, 33 + 100.0 / 3, 33 + 100.0 / 3,  //
                                           100));
}

TEST_F(QuiltMediaOperationsTest, TheCommentaryIsFinalizedInTheStepAfterTheExtras) {
  addLink();
  addExtraLink();
  addExtraLink();
  setCommentaryLink();
  EXPECT_TRUE(item()->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0,             //
                                           0, 25, 25,     //
                                           25, 50, 50,    //
                                           50, 75, 75,    //
                                           75, 100, 100,  //
                                           100));
}

TEST_F(QuiltMediaOperationsTest, FinalizingLogsTheItemAndThenEachChildInOrder) {
  const auto source = addLink();
  const auto extra = addExtraLink();
  const auto commentary = setCommentaryLink();
  takeLines();
  EXPECT_TRUE(item()->finalizeWithProgressionBlock({}));
  EXPECT_EQ(takeLines(), joined({{finalizing()}, finalized(*source), finalized(*extra), finalized(*commentary)}));
}

TEST_F(QuiltMediaOperationsTest, ThePosterIsThereBeforeAChildIsFinalized) {
  keepDocumentBusy();
  addLink();
  std::vector<bool> wasThere;
  EXPECT_TRUE(item()->finalizeWithProgressionBlock([&](double) {
    wasThere.push_back(std::filesystem::exists(item()->posterImagePath()));
    return true;
  }));
  EXPECT_THAT(wasThere, ElementsAre(false, true, true, true, true));
}

TEST_F(QuiltMediaOperationsTest, AnItemWithoutAPosterIsFinalizedAllTheSame) {
  keepDocumentBusy();
  addLink();
  writeFile(item()->posterImagePath(), "no image");
  takeLines();
  EXPECT_TRUE(item()->finalizeWithProgressionBlock({}));
  EXPECT_EQ(takeProblems(), Lines{warning("Media poster image path \"" + item()->posterImagePath().native() +
                                          "\" is not a valid image")});
}

TEST_F(QuiltMediaOperationsTest, FinalizingMakesThePreviewsOfEveryChild) {
  const auto source = addLink();
  const auto extra = addExtraLink();
  const auto commentary = setCommentaryLink();
  EXPECT_TRUE(item()->finalizeWithProgressionBlock({}));
  for (const std::shared_ptr<QuiltMediaSource>& child : {source, {extra}, commentary}) {
    EXPECT_TRUE(child->isPreviewed());
    EXPECT_THAT(namesIn(child->previewsFolderPath()), ElementsAre("0.jpg")) << "written as it is made";
  }
  source->addPreview(QuiltMediaPreview::initWithImageWrapper(picture(4, 4)));
  item()->flattenPreviews();
  EXPECT_THAT(namesIn(source->previewsFolderPath()), ::testing::SizeIs(2)) << "also what others brought";
  source->removePreview(source->previews().back());
  for (const std::shared_ptr<QuiltMediaSource>& child : {source, {extra}, commentary})
    EXPECT_THAT(namesIn(child->previewsFolderPath()), ElementsAre("0.jpg"));
}

TEST_F(QuiltMediaOperationsTest, TheFirstAndTheLastAnswerOfAFinalizeHaveNoEffect) {
  EXPECT_TRUE(item()->finalizeWithProgressionBlock(refusing()));
}

TEST_F(QuiltMediaOperationsTest, AFinalizeWithoutADocumentFails) {
  const auto loose = QuiltMedia::init();
  takeLines();
  EXPECT_FALSE(loose->finalizeWithProgressionBlock(progress.block()));
  EXPECT_EQ(takeLines(), (Lines{debug("Finalizing media at path \"(null)\""),
                                debug("Failed to finalize media because it is not attached to a document"),
                                critical("Failed to finalize source at path \"(null)\"")}));
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, AFinalizeWithoutAPathFails) {
  const auto pathless = QuiltDocument::init();
  item()->setDocumentOwner(pathless);
  takeLines();
  EXPECT_FALSE(item()->finalizeWithProgressionBlock(progress.block()));
  EXPECT_EQ(takeLines(), (Lines{debug("Finalizing media at path \"(null)\""),
                                debug("Failed to finalize media because it does not have a path"),
                                critical("Failed to finalize source at path \"(null)\"")}));
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, AFinalizeFailsWithoutTheItemsFolder) {
  keepDocumentBusy();
  addLink();
  EXPECT_FALSE(finalizeFailingAt(at(item()->path())));
  EXPECT_EQ(takeLines(), (Lines{finalizing(), noFolder(kNoMediaFolder, item()->path()), finalizeFailed()}));
  EXPECT_THAT(progress.values, ElementsAre(0));
  EXPECT_EQ(item()->posterImageVersion(), 1u) << "the poster comes after the folders";
}

TEST_F(QuiltMediaOperationsTest, AFinalizeFailsWithoutTheSourcesFolder) {
  EXPECT_FALSE(finalizeFailingAt(at(item()->sourcesFolderPath())));
  EXPECT_EQ(takeLines(),
            (Lines{finalizing(), noFolder(kNoSourcesFolder, item()->sourcesFolderPath()), finalizeFailed()}));
  EXPECT_FALSE(std::filesystem::exists(item()->extrasFolderPath()));
}

TEST_F(QuiltMediaOperationsTest, AFinalizeFailsWithoutTheExtrasFolder) {
  EXPECT_FALSE(finalizeFailingAt(at(item()->extrasFolderPath())));
  EXPECT_EQ(takeLines(),
            (Lines{finalizing(), noFolder(kNoExtrasFolder, item()->extrasFolderPath()), finalizeFailed()}));
}

TEST_F(QuiltMediaOperationsTest, AFinalizeFailsWithASource) {
  const auto first = addLink();
  const auto second = addLink();
  addExtraLink();
  EXPECT_FALSE(finalizeFailingAt(at(second->path())));
  EXPECT_EQ(takeLines(), joined({{finalizing()},
                                 finalized(*first),
                                 notFinalized(*second),
                                 {debug("Failed to finalize source \"" + second->uuid() +
                                        "\" during finalizing media at path \"" + place() + "\""),
                                  finalizeFailed()}}));
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 100.0 / 3, 100.0 / 3, 0));
  EXPECT_TRUE(first->isPreviewed()) << "what was done stays";
}

TEST_F(QuiltMediaOperationsTest, AFinalizeFailsWithAnExtra) {
  const auto source = addLink();
  const auto extra = addExtraLink();
  setCommentaryLink();
  EXPECT_FALSE(finalizeFailingAt(at(extra->path())));
  EXPECT_EQ(
      takeLines(),
      joined({{finalizing()},
              finalized(*source),
              notFinalized(*extra),
              {debug("Failed to finalize extra \"" + extra->uuid() + "\" during finalizing at \"" + place() + "\""),
               finalizeFailed()}}));
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 100.0 / 3, 100.0 / 3, 33));
}

TEST_F(QuiltMediaOperationsTest, AFinalizeFailsWithTheCommentary) {
  const auto source = addLink();
  const auto commentary = setCommentaryLink();
  EXPECT_FALSE(finalizeFailingAt(at(commentary->path())));
  EXPECT_EQ(takeLines(), joined({{finalizing()},
                                 finalized(*source),
                                 notFinalized(*commentary),
                                 {debug("Failed to finalize audio commentary source \"" + commentary->uuid() +
                                        "\" during finalizing media at path \"" + place() + "\""),
                                  finalizeFailed()}}));
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 50, 50, 50));
}

TEST_F(QuiltMediaOperationsTest, ACancelInsideAChildFailsTheFinalize) {
  const auto source = addLink();
  addLink();
  progress.cancelAt = 50;
  takeLines();
  EXPECT_FALSE(item()->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 50));
  const Lines lines = takeLines();
  ASSERT_GE(lines.size(), 2u);
  EXPECT_EQ(lines[lines.size() - 2], debug("Failed to finalize source \"" + source->uuid() +
                                           "\" during finalizing media at path \"" + place() + "\""));
  EXPECT_EQ(lines.back(), finalizeFailed());
}

// ---- Convert

TEST_F(QuiltMediaOperationsTest, WithoutACommentaryAConversionEndsShortOfTheEnd) {
  addLink();
  addLink();
  takeLines();
  EXPECT_TRUE(item()->convertToFormat("720p", progress.block()));
  // The second start is a third in single precision.
  EXPECT_THAT(progress.values, ElementsAre(0, 100.0 / 3, 33.33333206176758, 33.33333206176758 + 100.0 / 3));
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, TheCommentarySharesTheOnlySourcesRange) {
  addLink();
  setCommentaryLink();
  EXPECT_TRUE(item()->convertToFormat("720p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100, 0, 100));
}

TEST_F(QuiltMediaOperationsTest, ExtrasGoOnWhereTheSourcesEndAndTheCommentarySharesTheLastStep) {
  addLink();
  addExtraLink();
  EXPECT_TRUE(item()->convertToFormat("720p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100.0 / 3, 33.33333206176758, 33.33333206176758 + 100.0 / 3));
  progress.values.clear();
  setCommentaryLink();
  EXPECT_TRUE(item()->convertToFormat("720p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 50, 50, 100, 50, 100));
}

TEST_F(QuiltMediaOperationsTest, ALoneCommentaryIsConvertedWithFiniteProgress) {
  setCommentaryLink();
  EXPECT_TRUE(item()->convertToFormat("720p", progress.block()));
  EXPECT_EQ(progress.values.size(), 2u);
  EXPECT_THAT(progress.values, Each(AllOf(Ge(0), Le(100))));
}

TEST_F(QuiltMediaOperationsTest, ConvertingAnEmptyItemSucceedsSilently) {
  takeLines();
  EXPECT_TRUE(item()->convertToFormat("720p", progress.block()));
  EXPECT_THAT(progress.values, IsEmpty());
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, EveryChildMakesTheFormat) {
  const auto source = addSource(pictureFile(1600, 1200));
  const auto extra = QuiltMediaExtra::initWithPath(pictureFile(1600, 1200));
  const auto commentary = QuiltMediaSource::initWithPath(pictureFile(1600, 1200));
  item()->addExtra(extra);
  item()->setAudioCommentarySource(commentary);
  EXPECT_TRUE(item()->convertToFormat("480p", {}));
  for (const std::shared_ptr<QuiltMediaSource>& child : {source, {extra}, commentary}) {
    const auto made = child->derivativeWithFormat("480p");
    ASSERT_NE(made, nullptr);
    EXPECT_TRUE(std::filesystem::exists(made->url()->relativePath()));
  }
}

TEST_F(QuiltMediaOperationsTest, AConversionStopsAtTheFirstChildThatFails) {
  const Path large = pictureFile(1600, 1200);
  const Installed<FaultyImages> images(&Services::images);
  images->failSave = support::withExtension("png");
  const auto failed = [&] {
    progress.values.clear();
    takeLines();
    EXPECT_FALSE(item()->convertToFormat("720p", progress.block()));
    EXPECT_EQ(takeLines(), Lines{critical("Failed to write converted image of \"" +
                                          Url::fileUrl(large).absoluteString() + "\": \"The disk is full.\"")})
        << "the item adds no line of its own";
    return progress.values;
  };
  // A child that fails reports 0 before and after.
  item()->setAudioCommentarySource(QuiltMediaSource::initWithPath(large));
  addLink();
  EXPECT_THAT(failed(), ElementsAre(0, 100, 0, 0)) << "the commentary";
  item()->addExtra(QuiltMediaExtra::initWithPath(large));
  EXPECT_THAT(failed(), ElementsAre(0, 50, 50, 50)) << "an extra";
  addSource(large);
  addLink();
  EXPECT_THAT(failed(), ElementsAre(0, 25, 25, 25)) << "a source";
}

TEST_F(QuiltMediaOperationsTest, AFalseAnswerAtTheEndOfAChildStopsTheConversion) {
  addLink();
  addLink();
  progress.cancelAt = 30;
  EXPECT_FALSE(item()->convertToFormat("720p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100.0 / 3));
}

// ---- Export

class QuiltMediaExportTest : public QuiltMediaOperationsTest {
 protected:
  /// An item of a document that may be worked on, with two pictures.
  QuiltMediaExportTest() {
    keepDocumentBusy();  // what is exported has no poster yet
    document()->setTitle("Talk");
    addSource(pictureFile(64, 48));
    addSource(pictureFile(32, 24));
    letDocumentSave();
    std::filesystem::create_directories(destination());
    takeLines();
  }

  Path destination() const { return folder() / "out"; }
  bool exported() { return item()->exportToPath(destination(), "Desktop", progress.block()); }
};

TEST_F(QuiltMediaExportTest, TheDocumentIsPreparedAndTheSourcesAreCopiedOut) {
  EXPECT_TRUE(exported());
  EXPECT_THAT(namesIn(destination()), ElementsAre("Talk 2.png", "Talk.png"));
  EXPECT_EQ(readFile(destination() / "Talk.png"), readFile(folder() / "64x48.png"));
  EXPECT_EQ(readFile(destination() / "Talk 2.png"), readFile(folder() / "32x24.png"));
  EXPECT_FALSE(document()->isProcessing());
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltMediaExportTest, EachStageReportsIntoItsStep) {
  EXPECT_TRUE(exported());
  const double third = 100.0 / 3;
  const double start = 33.33333206176758;
  EXPECT_THAT(progress.values,
              ElementsAre(0,
                          // The document flattens: its 0, its item's 0, the item's own, two copies, the end.
                          0, 0, 0, 10, 10, 10, 20, 20, 20, 20, 20,
                          // It converts; an item of two sources has three steps.
                          20, 20 + third / 5, 20 + start / 5, 20 + (start + third) / 5,
                          // It finalizes: its 0, its item's 0, the item's own, two sources in the first half, the end.
                          40, 40, 40, 40, 50, 50, 40, 50, 50, 60, 60,
                          // Two copies
                          80, 80, 100, 100, 100));
}

TEST_F(QuiltMediaExportTest, ACopyReportsItsMiddleFromItsSourcesStart) {
  ASSERT_TRUE(document()->flattenWithProgressionBlock({}));
  const Installed<HalfwayFiles> files(&Services::files);
  EXPECT_TRUE(exported());
  const std::vector<double> copies(progress.values.end() - 7, progress.values.end());
  EXPECT_THAT(copies, ElementsAre(60 + 10, 60 + 20, 60 + 20, 80 + 10, 80 + 20, 80 + 20, 100));
}

TEST_F(QuiltMediaExportTest, AFlattenedDocumentIsNotFlattenedAgain) {
  item()->removeAllSources();
  added(flattenedLink());
  takeLines();
  EXPECT_FALSE(exported()) << "a link cannot be copied";
  // N = 4: conversion from 25, finalizing from 50
  EXPECT_THAT(progress.values, ElementsAre(0, 25, 25 + 12.5, 50, 50, 50, 50, 75, 75, 75, 75));
  for (const Line& line : takeLines()) EXPECT_EQ(line.text.find("Flattening"), std::string::npos) << line.text;
}

TEST_F(QuiltMediaExportTest, ExtrasAndCommentaryAreNotCopiedOut) {
  item()->addExtra(QuiltMediaExtra::initWithPath(pictureFile(16, 12)));
  item()->setAudioCommentarySource(QuiltMediaSource::initWithPath(pictureFile(8, 6)));
  EXPECT_TRUE(exported());
  EXPECT_EQ(namesIn(destination()).size(), 2u);
}

TEST_F(QuiltMediaExportTest, WithoutADocumentTheExportFailsWithoutALine) {
  item()->setDocumentOwner(nullptr);
  EXPECT_FALSE(exported());
  EXPECT_THAT(progress.values, ElementsAre(0));
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaExportTest, ADocumentThatCannotBeFlattenedFailsTheExport) {
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = support::named("media");
  EXPECT_FALSE(exported());
  EXPECT_THAT(progress.values, ElementsAre(0, 0));
  EXPECT_EQ(takeProblems(),
            Lines{critical("Failed to flatten document at path \"" + document()->path().native() + "\"")});
}

TEST_F(QuiltMediaExportTest, ADocumentThatIsBusyFailsTheExport) {
  document()->setIsProcessing(true);
  EXPECT_FALSE(exported());
  EXPECT_THAT(progress.values, ElementsAre(0));
  EXPECT_EQ(takeLines(), Lines{critical("Failed to flattening document at path \"" + document()->path().native() +
                                        "\": \"Document is already being processed\"")});
  document()->setIsProcessing(false);
}

TEST_F(QuiltMediaExportTest, ADocumentThatCannotBeConvertedFailsTheExport) {
  ASSERT_TRUE(document()->flattenWithProgressionBlock({}));
  addSource(pictureFile(1600, 1200));
  const Installed<FaultyImages> images(&Services::images);
  images->failSave = support::withExtension("png");
  EXPECT_FALSE(item()->exportToPath(destination(), "480p", progress.block()));
  // N = 6, the third of four steps
  EXPECT_EQ(progress.values.back(), static_cast<double>(100.0F / 6) + 50.0 / 6);
  EXPECT_THAT(namesIn(destination()), IsEmpty());
}

TEST_F(QuiltMediaExportTest, ADocumentThatCannotBeFinalizedFailsTheExport) {
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = support::named("previews");
  EXPECT_FALSE(exported());
  EXPECT_EQ(progress.values.back(), 40) << "where the document began to finalize";
  EXPECT_THAT(namesIn(destination()), IsEmpty());
}

TEST_F(QuiltMediaExportTest, ASourceThatCannotBeCopiedOutFailsTheExport) {
  ASSERT_TRUE(document()->flattenWithProgressionBlock({}));
  const Installed<FaultyFiles> files(&Services::files);
  files->failCopy = at(item()->sourceAtIndex(1)->mainDerivative()->url()->relativePath());
  EXPECT_FALSE(exported());
  EXPECT_THAT(namesIn(destination()), ElementsAre("Talk.png")) << "the first stays";
  EXPECT_EQ(progress.values.back(), 80) << "the end of the first copy";
}

TEST_F(QuiltMediaExportTest, AFalseAnswerStopsTheStageItIsGivenTo) {
  for (const double cancelAt : {10.0, 25.0, 45.0, 70.0, 90.0}) {
    SCOPED_TRACE(cancelAt);
    progress = {};
    progress.cancelAt = cancelAt;
    std::filesystem::remove_all(destination());
    EXPECT_FALSE(exported());
    EXPECT_EQ(
        std::count_if(progress.values.begin(), progress.values.end(), [&](double value) { return value >= cancelAt; }),
        1)
        << "no call follows the false answer";
    const std::size_t copies = std::filesystem::exists(destination()) ? namesIn(destination()).size() : 0;
    EXPECT_EQ(copies, cancelAt == 90.0 ? 1u : 0u);
    EXPECT_FALSE(document()->isProcessing());
  }
}

TEST_F(QuiltMediaExportTest, TheFirstAndTheLastAnswerHaveNoEffect) {
  item()->removeAllSources();
  std::vector<double> seen;
  EXPECT_TRUE(item()->exportToPath(destination(), "Desktop", [&](double value) {
    seen.push_back(value);
    return seen.size() > 1 && value < 100;
  }));
  EXPECT_EQ(seen.front(), 0);
  EXPECT_EQ(seen.back(), 100);
}

// ---- availableFormats

TEST_F(QuiltMediaOperationsTest, AFormatMustBeOfferedByEveryChildAndTheFirstSourceGivesTheOrder) {
  EXPECT_THAT(item()->availableFormats(), IsEmpty());
  added(offering({"480p", "Desktop", "720p", "Other"}));
  EXPECT_THAT(item()->availableFormats(), ElementsAre("480p", "Desktop", "720p", "Other"));
  added(offering({"Other", "Desktop", "720p", "480p", "More"}));
  EXPECT_THAT(item()->availableFormats(), ElementsAre("480p", "Desktop", "720p", "Other"));
  added(offering({"Desktop", "720p", "480p"}));
  EXPECT_THAT(item()->availableFormats(), ElementsAre("480p", "Desktop", "720p"));
  item()->addExtra(offering<QuiltMediaExtra>({"Desktop", "480p"}));
  EXPECT_THAT(item()->availableFormats(), ElementsAre("480p", "Desktop"));
  item()->setAudioCommentarySource(offering({"Desktop"}));
  EXPECT_THAT(item()->availableFormats(), ElementsAre("Desktop"));
  addEmptySource();
  EXPECT_THAT(item()->availableFormats(), IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, WithoutSourcesThereIsNoFormatWhateverTheExtrasOffer) {
  item()->addExtra(offering<QuiltMediaExtra>({"Desktop"}));
  item()->setAudioCommentarySource(offering({"Desktop"}));
  EXPECT_THAT(item()->availableFormats(), IsEmpty());
}

}  // namespace
}  // namespace quilt
