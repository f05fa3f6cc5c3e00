// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <thread>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/testing/ForwardingFileManager.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"

namespace quilt {
namespace {

using platform::Services;
using support::critical;
using support::debug;
using support::FaultyFiles;
using support::Installed;
using support::Line;
using support::Progress;
using ::testing::Contains;
using ::testing::DoubleNear;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::Pointwise;

/// Reports every copy at its middle, then makes it.
class HalfwayFiles final : public platform::ForwardingFileManager {
 public:
  HalfwayFiles() : ForwardingFileManager(platform::services().files) {}

  int copyfile(const std::filesystem::path& source, const std::filesystem::path& destination,
               platform::CopyCallback callback, void* context) override {
    platform::CopyState state;
    state.copiedBytes = static_cast<std::int64_t>(std::filesystem::file_size(source) / 2);
    if (callback(0, platform::CopyStage::Progress, state, source, destination, context) == platform::CopyAnswer::Quit)
      return -1;
    return ForwardingFileManager::copyfile(source, destination, nullptr, nullptr);
  }
};

class QuiltMediaOperationsTest : public support::DocumentFixture {
 protected:
  /// A document that does not save by itself, and its item.
  QuiltMediaOperationsTest() : document(made()), item(addItem(*document)) {
    document->setIsProcessing(true);
    takeLines();
  }

  /// A source with a file outside of the package that has neither previews nor sound.
  template <class Source = QuiltMediaSource>
  std::shared_ptr<Source> fileSource(const std::string& name = "paper") {
    const auto source = Source::init();
    source->setUuid(name);
    auto derivative = QuiltMediaDerivative::init();
    derivative->setCompatibilityTags(std::vector<std::string>{kQuiltMediaDerivativeCompatibilityTagDesktop});
    derivative->setContentType(std::string(platform::types::kWordDoc));
    derivative->setUrl(platform::Url::fileUrl(writeFile(folder() / (name + ".doc"), "four")));
    source->addDerivative(derivative);
    return source;
  }
  template <class Source = QuiltMediaSource>
  std::shared_ptr<Source> flattenedSource() {
    const auto source = Source::init();
    source->addDerivative(QuiltMediaDerivative::initWithURL(*platform::Url::parse("https://example.org/")));
    const auto samples = QuiltMediaAudioSamples::init();
    samples->setIsFlattened(true);
    source->addAudioSamples(samples);
    EXPECT_TRUE(source->isFlattened());
    return source;
  }
  /// A source that offers these formats.
  template <class Source = QuiltMediaSource>
  static std::shared_ptr<Source> offering(std::vector<std::string> formats) {
    const auto source = Source::init();
    auto derivative = QuiltMediaDerivative::init();
    derivative->setCompatibilityTags(std::move(formats));
    derivative->setContentType(std::string(platform::types::kPDF));
    source->addDerivative(derivative);
    return source;
  }

  std::string place() const { return item->path().native(); }
  bool flatten() { return item->flattenWithProgressionBlock(progress.block()); }
  bool finalize() { return item->finalizeWithProgressionBlock(progress.block()); }

  const std::shared_ptr<QuiltDocument> document;
  const std::shared_ptr<QuiltMedia> item;
  Progress progress;
};

// ---- Whether it is flattened

TEST_F(QuiltMediaOperationsTest, WithoutChildrenItIsNotFlattened) {
  EXPECT_FALSE(item->isFlattened());
  item->setAudioCommentarySource(flattenedSource());
  EXPECT_TRUE(item->isFlattened()) << "the commentary alone decides";
  item->setAudioCommentarySource(QuiltMediaSource::init());
  EXPECT_FALSE(item->isFlattened());
}

TEST_F(QuiltMediaOperationsTest, FlattenedExtrasAloneAreEnough) {
  item->addExtra(flattenedSource<QuiltMediaExtra>());
  EXPECT_TRUE(item->isFlattened());
  item->addExtra(QuiltMediaExtra::init());
  EXPECT_FALSE(item->isFlattened());
}

TEST_F(QuiltMediaOperationsTest, OneChildThatIsNotFlattenedDecides) {
  item->addSource(flattenedSource());
  EXPECT_TRUE(item->isFlattened());
  item->addSource(QuiltMediaSource::init());
  EXPECT_FALSE(item->isFlattened());
  item->setAudioCommentarySource(flattenedSource());
  EXPECT_FALSE(item->isFlattened()) << "a flattened commentary does not stand for a source";
}

TEST_F(QuiltMediaOperationsTest, ACommentaryThatIsNotFlattenedDecidesOverFlattenedSources) {
  item->addSource(flattenedSource());
  item->setAudioCommentarySource(QuiltMediaSource::init());
  EXPECT_FALSE(item->isFlattened());
}

// ---- Flatten

TEST_F(QuiltMediaOperationsTest, EveryPositionOfASourceCountsInTheProgressOfFlatten) {
  item->addSource(fileSource("first"));
  item->addSource(flattenedSource());
  item->addSource(fileSource("third"));
  Installed<HalfwayFiles> files(&Services::files);
  EXPECT_TRUE(flatten());
  // Each file: the middle, its end, the end of its source.
  EXPECT_THAT(progress.values, Pointwise(DoubleNear(1e-9), {0.0, 50.0 / 3, 100.0 / 3, 100.0 / 3, 66 + 50.0 / 3,
                                                            66 + 100.0 / 3, 66 + 100.0 / 3, 100.0}));
}

TEST_F(QuiltMediaOperationsTest, AFlattenedExtraTakesNoStepOfFlatten) {
  item->addSource(flattenedSource());
  item->addExtra(flattenedSource<QuiltMediaExtra>());
  item->addExtra(fileSource<QuiltMediaExtra>("second"));
  Installed<HalfwayFiles> files(&Services::files);
  EXPECT_TRUE(flatten());
  // Three steps; the second extra has the index one, the number of sources.
  EXPECT_THAT(progress.values,
              Pointwise(DoubleNear(1e-9), {0.0, 33 + 50.0 / 3, 33 + 100.0 / 3, 33 + 100.0 / 3, 100.0}));

  item->setAudioCommentarySource(flattenedSource());
  item->removeAllExtras();
  item->addExtra(flattenedSource<QuiltMediaExtra>());
  item->addExtra(fileSource<QuiltMediaExtra>("again"));
  progress.values.clear();
  EXPECT_TRUE(flatten());
  // Four steps; the commentary took one.
  EXPECT_THAT(progress.values,
              Pointwise(DoubleNear(1e-9), {0.0, 50 + 50.0 / 4, 50 + 100.0 / 4, 50 + 100.0 / 4, 100.0}));
}

TEST_F(QuiltMediaOperationsTest, FlattenTakesSourcesThenTheCommentaryThenExtras) {
  item->addExtra(fileSource<QuiltMediaExtra>("extra"));
  item->setAudioCommentarySource(fileSource("voice"));
  item->addSource(fileSource("source"));
  Installed<HalfwayFiles> files(&Services::files);
  EXPECT_TRUE(flatten());
  EXPECT_THAT(progress.values,
              Pointwise(DoubleNear(1e-9), {0.0, 50.0 / 3, 100.0 / 3, 100.0 / 3, 33 + 50.0 / 3, 33 + 100.0 / 3,
                                           33 + 100.0 / 3, 66 + 50.0 / 3, 66 + 100.0 / 3, 66 + 100.0 / 3, 100.0}));
  EXPECT_EQ(namesIn(item->path()), (std::vector<std::string>{"extras", "sources"}));
  EXPECT_EQ(namesIn(item->sourcesFolderPath()), (std::vector<std::string>{"source", "voice"}));
  EXPECT_EQ(namesIn(item->extrasFolderPath()), (std::vector<std::string>{"extra"}));
  EXPECT_TRUE(std::filesystem::exists(folder() / "source.doc")) << "originals stay";
}

TEST_F(QuiltMediaOperationsTest, TheAnswersToTheFirstAndTheLastReportOfFlattenAreIgnored) {
  item->addSource(flattenedSource());
  progress.cancelFrom = 0;
  EXPECT_TRUE(flatten());
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
}

TEST_F(QuiltMediaOperationsTest, ACancelInsideAChildFailsFlatten) {
  item->addSource(fileSource());
  Installed<HalfwayFiles> files(&Services::files);
  progress.cancelFrom = 1;
  EXPECT_FALSE(flatten());
  const auto lines = takeLines();
  EXPECT_THAT(lines, Contains(debug("Failed to flatten source \"paper\"")));
  EXPECT_EQ(lines.back(), critical("Failed to flatten media files at path \"" + place() + "\""));
  EXPECT_THAT(namesIn(item->sourceAtIndex(0)->derivativesFolderPath()), IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, FlattenNeedsADocument) {
  const auto detached = QuiltMedia::init();
  detached->addSource(fileSource());
  EXPECT_FALSE(detached->flattenWithProgressionBlock(progress.block()));
  EXPECT_THAT(takeLines(), ElementsAre(debug("Flattening media at path \"(null)\""),
                                       debug("Failed to flatten media because it is not attached to a document"),
                                       critical("Failed to flatten media files at path \"(null)\"")));
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, FlattenNeedsAPlaceForTheDocument) {
  const auto placeless = QuiltDocument::init();
  placeless->setIsProcessing(true);
  const auto lost = QuiltMedia::init();
  placeless->addMedia(lost);
  takeLines();
  EXPECT_FALSE(lost->flattenWithProgressionBlock(progress.block()));
  EXPECT_THAT(takeLines(), ElementsAre(debug("Flattening media at path \"(null)\""),
                                       debug("Failed to flatten media because it does not have a path"),
                                       critical("Failed to flatten media files at path \"(null)\"")));
}

TEST_F(QuiltMediaOperationsTest, AFolderThatCannotBeMadeFailsFlatten) {
  for (const char* name : {"ITEM", "sources", "extras"}) {
    item->setUuid("ITEM");
    std::filesystem::remove_all(item->path());
    takeLines();
    progress.values.clear();
    Installed<FaultyFiles> files(&Services::files);
    files->failCreate = support::named(name);
    EXPECT_FALSE(flatten());
    const std::string folder = std::string(name) == "ITEM" ? place() : place() + "/" + name;
    EXPECT_THAT(takeLines(), ElementsAre(debug("Flattening media at path \"" + place() + "\""),
                                         debug("Failed to create intermediate directories for media at path \"" +
                                               folder + "\": \"The disk is full.\""),
                                         critical("Failed to flatten media files at path \"" + place() + "\"")));
    EXPECT_THAT(progress.values, ElementsAre(0));
  }
}

TEST_F(QuiltMediaOperationsTest, AChildThatCannotBeFlattenedFailsFlattenAndTheOthersStayDone) {
  item->addSource(fileSource("good"));
  Installed<FaultyFiles> files(&Services::files);
  files->failCopy = support::named("bad.doc");
  const auto fails = [this](const std::string& line) {
    takeLines();
    EXPECT_FALSE(flatten());
    const auto lines = takeLines();
    ASSERT_GE(lines.size(), 2u);
    EXPECT_EQ(lines[lines.size() - 2], debug(line));
    EXPECT_EQ(lines.back(), critical("Failed to flatten media files at path \"" + place() + "\""));
  };
  const auto bad = fileSource("bad");
  item->addSource(bad);
  fails("Failed to flatten source \"bad\"");
  EXPECT_TRUE(item->sourceAtIndex(0)->derivativeAtIndex(0)->isFlattened());
  item->removeSource(bad);

  item->setAudioCommentarySource(fileSource("bad"));
  fails("Failed to flatten source \"bad\"");
  item->setAudioCommentarySource(nullptr);

  item->addExtra(fileSource<QuiltMediaExtra>("bad"));
  fails("Failed to flatten extra \"bad\"");
}

TEST_F(QuiltMediaOperationsTest, FlattenLeavesNoLockBehindWhenItFails) {
  item->addSource(fileSource("bad"));
  Installed<FaultyFiles> files(&Services::files);
  files->failCopy = support::anyPath();
  EXPECT_FALSE(flatten());
  std::size_t count = 0;
  std::thread([&] { count = item->sourcesCount(); }).join();
  EXPECT_EQ(count, 1u);
}

// ---- Finalize

TEST_F(QuiltMediaOperationsTest, EverySourceReportsIntoTheFirstStepOfFinalize) {
  const auto twin = QuiltMedia::init();
  document->addMedia(twin);
  twin->addSource(webSource());
  Progress own;
  ASSERT_TRUE(twin->sourceAtIndex(0)->finalizeWithProgressionBlock(own.block()));
  ASSERT_GE(own.values.size(), 2u);

  item->addSource(webSource());
  item->addSource(webSource());
  const auto extra = QuiltMediaExtra::init();
  extra->addDerivative(QuiltMediaDerivative::initWithURL(*platform::Url::parse("https://example.org/")));
  item->addExtra(extra);
  EXPECT_TRUE(finalize());

  std::vector<double> expected{0};
  for (const double start : {0.0, 0.0, 33.0})
    for (const double value : own.values) expected.push_back(start + value / 3);
  expected.push_back(100);
  EXPECT_THAT(progress.values, Pointwise(DoubleNear(1e-9), expected));
}

TEST_F(QuiltMediaOperationsTest, TheCommentaryComesAfterTheExtrasInFinalize) {
  item->setAudioCommentarySource(webSource());
  const auto extra = QuiltMediaExtra::init();
  extra->addDerivative(QuiltMediaDerivative::initWithURL(*platform::Url::parse("https://example.org/")));
  item->addExtra(extra);
  EXPECT_TRUE(finalize());
  EXPECT_EQ(progress.values.front(), 0);
  EXPECT_EQ(progress.values[1], 50) << "the extra starts at one of two steps";
  EXPECT_EQ(progress.values[progress.values.size() - 2], 150) << "the commentary ends at its second step's end";
  EXPECT_EQ(progress.values.back(), 100);
}

TEST_F(QuiltMediaOperationsTest, FinalizeWritesThePosterAndMakesTheFolders) {
  const auto pictured = addPictureItem(*document);
  takeLines();
  EXPECT_TRUE(pictured->finalizeWithProgressionBlock(nullptr));
  EXPECT_THAT(namesIn(pictured->path()), ElementsAre("extras", "poster.jpg", "sources"));
  const auto lines = takeLines();
  EXPECT_EQ(lines.front(), debug("Finalizing media at path \"" + pictured->path().native() + "\""));
}

TEST_F(QuiltMediaOperationsTest, FinalizeNeedsADocument) {
  EXPECT_FALSE(QuiltMedia::init()->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(takeLines(), ElementsAre(debug("Finalizing media at path \"(null)\""),
                                       debug("Failed to finalize media because it is not attached to a document"),
                                       critical("Failed to finalize source at path \"(null)\"")));
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, FinalizeNeedsAPlaceForTheDocument) {
  const auto placeless = QuiltDocument::init();
  placeless->setIsProcessing(true);
  const auto lost = QuiltMedia::init();
  placeless->addMedia(lost);
  takeLines();
  EXPECT_FALSE(lost->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(takeLines(), ElementsAre(debug("Finalizing media at path \"(null)\""),
                                       debug("Failed to finalize media because it does not have a path"),
                                       critical("Failed to finalize source at path \"(null)\"")));
}

TEST_F(QuiltMediaOperationsTest, AFolderThatCannotBeMadeFailsFinalize) {
  item->setUuid("ITEM");
  const std::vector<std::pair<std::string, std::string>> folders{
      {"ITEM", "media"}, {"sources", "sources"}, {"extras", "extras"}};
  for (const auto& [name, what] : folders) {
    std::filesystem::remove_all(item->path());
    takeLines();
    progress.values.clear();
    Installed<FaultyFiles> files(&Services::files);
    files->failCreate = support::named(name);
    EXPECT_FALSE(finalize());
    const std::string folder = name == "ITEM" ? place() : place() + "/" + name;
    EXPECT_THAT(takeLines(), ElementsAre(debug("Finalizing media at path \"" + place() + "\""),
                                         debug("Failed to create intermediate directories for " + what + " at path \"" +
                                               folder + "\": \"The disk is full.\""),
                                         critical("Failed to finalize source at path \"" + place() + "\"")));
    EXPECT_THAT(progress.values, ElementsAre(0));
  }
}

TEST_F(QuiltMediaOperationsTest, AChildThatCannotBeFinalizedFailsFinalize) {
  // The folder of its previews cannot be made.
  const auto stuck = [this](const auto& child) {
    child->setUuid("CHILD");
    return child;
  };
  const auto fails = [this](const std::string& line) {
    takeLines();
    Installed<FaultyFiles> files(&Services::files);
    files->failCreate = support::named("CHILD");
    EXPECT_FALSE(finalize());
    const auto lines = takeLines();
    ASSERT_GE(lines.size(), 2u);
    EXPECT_EQ(lines[lines.size() - 2], debug(line));
    EXPECT_EQ(lines.back(), critical("Failed to finalize source at path \"" + place() + "\""));
  };
  const auto source = stuck(QuiltMediaSource::init());
  item->addSource(source);
  fails("Failed to finalize source \"CHILD\" during finalizing media at path \"" + place() + "\"");
  item->removeSource(source);

  const auto extra = stuck(QuiltMediaExtra::init());
  item->addExtra(extra);
  fails("Failed to finalize extra \"CHILD\" during finalizing at \"" + place() + "\"");
  item->removeExtra(extra);

  item->setAudioCommentarySource(stuck(QuiltMediaSource::init()));
  fails("Failed to finalize audio commentary source \"CHILD\" during finalizing media at path \"" + place() + "\"");
}

TEST_F(QuiltMediaOperationsTest, ACancelInsideAChildFailsFinalize) {
  item->addSource(webSource());
  progress.cancelFrom = 2;  // the item's 0, the source's 0, then the preview
  EXPECT_FALSE(finalize());
  EXPECT_EQ(takeLines().back(), critical("Failed to finalize source at path \"" + place() + "\""));
}

// ---- Formats

TEST_F(QuiltMediaOperationsTest, TheFormatsThatEveryChildOffersAreAvailableInTheFirstSourcesOrder) {
  item->addSource(offering({"480p", "Desktop", "720p"}));
  EXPECT_THAT(item->availableFormats(), ElementsAre("480p", "Desktop", "720p"));
  item->addSource(offering({"Desktop", "480p"}));
  EXPECT_THAT(item->availableFormats(), ElementsAre("480p", "Desktop"));
  item->addExtra(offering<QuiltMediaExtra>({"Desktop", "480p", "720p"}));
  EXPECT_THAT(item->availableFormats(), ElementsAre("480p", "Desktop"));
  item->addExtra(offering<QuiltMediaExtra>({"480p"}));
  EXPECT_THAT(item->availableFormats(), ElementsAre("480p"));
  item->setAudioCommentarySource(offering({"Desktop"}));
  EXPECT_THAT(item->availableFormats(), IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, WithoutSourcesNoFormatIsAvailable) {
  item->addExtra(offering<QuiltMediaExtra>({"Desktop"}));
  EXPECT_THAT(item->availableFormats(), IsEmpty());
}

// ---- Convert

// A source that has the format already reports 0 and 100.

TEST_F(QuiltMediaOperationsTest, ConvertWithoutACommentaryCountsOneStepMore) {
  item->addSource(offering({"480p"}));
  item->addSource(offering({"480p"}));
  takeLines();
  EXPECT_TRUE(item->convertToFormat("480p", progress.block()));
  EXPECT_THAT(progress.values, Pointwise(DoubleNear(1e-5), {0.0, 100.0 / 3, 100.0 / 3, 200.0 / 3})) << "no final 100";
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaOperationsTest, ConvertWithACommentaryMapsItOntoTheLastStep) {
  item->addSource(offering({"480p"}));
  item->setAudioCommentarySource(offering({"480p"}));
  EXPECT_TRUE(item->convertToFormat("480p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100, 0, 100));
}

TEST_F(QuiltMediaOperationsTest, ExtrasContinueTheStepsOfTheSourcesInConvert) {
  item->addSource(offering({"480p"}));
  item->addExtra(offering<QuiltMediaExtra>({"480p"}));
  item->addExtra(offering<QuiltMediaExtra>({"480p"}));
  EXPECT_TRUE(item->convertToFormat("480p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 25, 25, 50, 50, 75));
}

TEST_F(QuiltMediaOperationsTest, TheStepsOfConvertStartInSinglePrecision) {
  for (int i = 0; i < 2; ++i) item->addSource(offering({"480p"}));
  EXPECT_TRUE(item->convertToFormat("480p", progress.block()));
  EXPECT_EQ(progress.values[2], static_cast<double>(100.0F / 3.0F));
  EXPECT_NE(progress.values[2], 100.0 / 3);
}

TEST_F(QuiltMediaOperationsTest, ACommentaryAloneHasTheWholeScaleOfConvert) {
  item->setAudioCommentarySource(offering({"480p"}));
  EXPECT_TRUE(item->convertToFormat("480p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
}

TEST_F(QuiltMediaOperationsTest, ConvertStopsAtTheFirstChildThatCannot) {
  item->addSource(QuiltMediaSource::init());
  item->addSource(offering({"480p"}));
  takeLines();
  EXPECT_FALSE(item->convertToFormat("480p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0)) << "the second source was not asked";
}

TEST_F(QuiltMediaOperationsTest, ConvertIsAsGoodAsItsCommentary) {
  item->addSource(offering({"480p"}));
  item->setAudioCommentarySource(QuiltMediaSource::init());
  EXPECT_FALSE(item->convertToFormat("480p", progress.block()));
}

TEST_F(QuiltMediaOperationsTest, ACancelInsideAChildFailsConvert) {
  item->addSource(offering({"480p"}));
  item->addSource(offering({"480p"}));
  progress.cancelFrom = 1;  // the first source's 100
  EXPECT_FALSE(item->convertToFormat("480p", progress.block()));
  EXPECT_EQ(progress.values.size(), 2u);
}

// ---- Export

TEST_F(QuiltMediaOperationsTest, ExportOfADetachedItemFailsWithoutALineOfItsOwn) {
  EXPECT_FALSE(QuiltMedia::init()->exportToPath(folder() / "out", "Desktop", progress.block()));
  EXPECT_THAT(takeLines(), IsEmpty());
  EXPECT_THAT(progress.values, ElementsAre(0));
}

TEST_F(QuiltMediaOperationsTest, ExportRunsTheDocumentsPipelineAndThenTheSources) {
  document->setIsProcessing(false);
  document->setTitle(std::string("Slides"));
  document->setType(std::string(kQuiltDocumentTypeStaticFile));
  for (const char* name : {"first", "second"})
    item->addSource(QuiltMediaSource::initWithPath(pictureFile(32, 24, std::string(name) + ".png")));
  std::filesystem::create_directory(folder() / "out");
  takeLines();
  EXPECT_TRUE(item->exportToPath(folder() / "out", "Desktop", progress.block()));
  EXPECT_EQ(namesIn(folder() / "out"), (std::vector<std::string>{"Slides 2.png", "Slides.png"}));
  EXPECT_TRUE(document->isFlattened() || item->sourceAtIndex(0)->derivativeAtIndex(0)->isFlattened());
  EXPECT_EQ(progress.values.front(), 0);
  EXPECT_EQ(progress.values.back(), 100);
  // Five steps: finalize from 40, the first source from 60, the second from 80.
  for (const double start : {40.0, 60.0, 80.0})
    EXPECT_THAT(progress.values, Contains(::testing::AllOf(::testing::Ge(start), ::testing::Le(start + 20))));
  EXPECT_THAT(progress.values, Contains(DoubleNear(80, 1e-4))) << "the first source's own 100";
}

TEST_F(QuiltMediaOperationsTest, ExportFailsWhenASourceHasNoFileForTheFormat) {
  document->setIsProcessing(false);
  document->setType(std::string(kQuiltDocumentTypeStaticFile));
  item->addSource(flattenedSource());
  std::filesystem::create_directory(folder() / "out");
  EXPECT_FALSE(item->exportToPath(folder() / "out", "Desktop", progress.block()));
  EXPECT_THAT(namesIn(folder() / "out"), IsEmpty());
  EXPECT_THAT(progress.values, Not(Contains(100.0)));
}

TEST_F(QuiltMediaOperationsTest, ACancelledExportStopsTheDocumentsPipeline) {
  document->setIsProcessing(false);
  item->addSource(QuiltMediaSource::initWithPath(pictureFile(32, 24)));
  std::filesystem::create_directory(folder() / "out");
  progress.cancelFrom = 1;
  EXPECT_FALSE(item->exportToPath(folder() / "out", "Desktop", progress.block()));
  EXPECT_THAT(namesIn(folder() / "out"), IsEmpty());
}

}  // namespace
}  // namespace quilt
