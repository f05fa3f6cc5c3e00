// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/collections/QuiltCollectionsController.h"
#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using ::testing::IsEmpty;

/// Packages are moved, and named by paths that people type.
class MovedPackageTest : public support::DocumentFixture {};

TEST_F(MovedPackageTest, TheFilesOfARenamedPackageAreFound) {
  const auto document = made();
  const auto item = addPictureItem(*document);
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  const auto derivative = item->sourceAtIndex(0)->mainDerivative();
  const Path file = derivative->url()->relativePath();
  const Path place = folder() / "Renamed.qpk";
  std::filesystem::rename(document->path(), place);
  document->setPath(place);
  EXPECT_EQ(derivative->url()->relativePath(), place / file.lexically_relative(package()));
  document->removeAllBrokenMedia();
  EXPECT_EQ(document->mediaCount(), 1u);
  EXPECT_TRUE(std::filesystem::exists(derivative->url()->relativePath()));
}

TEST_F(MovedPackageTest, AnOutsideFileStaysWhereItIs) {
  const auto document = made();
  const auto item = addPictureItem(*document);
  const auto url = item->sourceAtIndex(0)->mainDerivative()->url();
  document->setPath(folder() / "Renamed.qpk");
  EXPECT_EQ(item->sourceAtIndex(0)->mainDerivative()->url(), url);
}

TEST_F(MovedPackageTest, APackageThatIsNamedWithDotsIsFinalizedTwice) {
  std::filesystem::create_directories(folder() / "aside");
  const auto document = QuiltDocument::initWithPath(folder() / "aside" / ".." / "." / "talk.qpk");
  EXPECT_EQ(document->path(), folder() / "talk.qpk");
  document->setType(kQuiltDocumentTypeInteractive);
  document->setTheme(QuiltTheme::initWithPath(themeBundle()));
  EXPECT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(MovedPackageTest, DotsBehindALinkAreTakenAsTheSystemTakesThem) {
  std::filesystem::create_directories(folder() / "far/inner");
  std::filesystem::create_directory_symlink(folder() / "far/inner", folder() / "link");
  writeRecord(folder() / "far/talk.qpk/properties.plist", {{"Version", "1.0"}, {"Title", "Far"}});
  writeRecord(folder() / "talk.qpk/properties.plist", {{"Version", "1.0"}, {"Title", "Near"}});
  EXPECT_EQ(QuiltDocument::initWithPath(folder() / "link/../talk.qpk")->title(), "Far");
}

TEST_F(MovedPackageTest, ALibraryThatIsNamedWithDotsGivesUpItsCollections) {
  const auto controller = QuiltCollectionsController::init();
  std::filesystem::create_directories(folder() / "aside");
  ASSERT_TRUE(controller->loadLibraryPath(folder() / "aside/.././library", {}));
  const auto collection = controller->newCollection();
  const auto document = collection->newDocumentWithType(kQuiltDocumentTypeStaticFile);
  collection->removeDocument(document, true);
  controller->removeCollection(collection, true);
  EXPECT_THAT(namesIn(folder() / "library/Collections"), IsEmpty());
  EXPECT_THAT(takeProblems(), IsEmpty());
}

}  // namespace
}  // namespace quilt
