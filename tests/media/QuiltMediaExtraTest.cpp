// SPDX-License-Identifier: Apache-2.0
#include "quilt/media/QuiltMediaExtra.h"

#include <gmock/gmock.h>

#include "tests/support/PackageFixture.h"

namespace quilt {
namespace {

using support::debug;
using support::Lines;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltMediaExtraTest : public support::PackageFixture {};

TEST_F(QuiltMediaExtraTest, TheFolderLiesAmongTheItemsExtrasUnderTheIdentity) {
  const auto extra = QuiltMediaExtra::init();
  item()->addExtra(extra);
  EXPECT_EQ(extra->path(), item()->extrasFolderPath() / extra->uuid());
  EXPECT_EQ(extra->derivativesFolderPath(), extra->path() / "derivatives");
  EXPECT_EQ(extra->previewsFolderPath(), extra->path() / "previews");
  EXPECT_EQ(extra->audioSamplesFolderPath(), extra->path() / "audiosamples");
  const std::shared_ptr<QuiltMediaSource> asSource = extra;
  EXPECT_EQ(asSource->path(), extra->path());
}

TEST_F(QuiltMediaExtraTest, ThereIsNoFolderWithoutAnItem) {
  EXPECT_EQ(QuiltMediaExtra::init()->path(), Path());
  EXPECT_EQ(QuiltMediaExtra::init()->derivativesFolderPath(), Path());
}

TEST_F(QuiltMediaExtraTest, ThereIsNoFolderOnceTheItemHasNoDocument) {
  const auto extra = QuiltMediaExtra::init();
  item()->addExtra(extra);
  item()->setDocumentOwner(nullptr);
  EXPECT_EQ(extra->mediaOwner(), item());
  EXPECT_EQ(extra->path(), Path());
  EXPECT_EQ(extra->derivativesFolderPath(), Path());
}

TEST_F(QuiltMediaExtraTest, AFileBecomesAnExtraAsItBecomesASource) {
  const auto extra = QuiltMediaExtra::initWithPath(pictureFile(8, 8));
  ASSERT_NE(extra, nullptr);
  EXPECT_EQ(extra->uuid().size(), 36u);
  EXPECT_EQ(extra->contentCategory(), "Image");
  EXPECT_EQ(extra->derivativeCount(), 1u);
}

TEST_F(QuiltMediaExtraTest, ALinkBecomesAnExtra) {
  const auto extra = QuiltMediaExtra::initWithURL(*Url::parse("https://example.org/"));
  ASSERT_NE(extra, nullptr);
  EXPECT_EQ(extra->contentCategory(), "Web");
}

TEST_F(QuiltMediaExtraTest, AFileThatNoDerivativeAcceptsGivesNoExtra) {
  const Path text = writeFile(folder() / "notes.txt", "text");
  EXPECT_EQ(QuiltMediaExtra::initWithPath(text), nullptr);
  EXPECT_EQ(takeLines(), Lines{debug("Failed to create source derivative for url \"" +
                                     Url::fileUrl(text).absoluteString() + "\": \"Not a compatible file\"")});
}

TEST_F(QuiltMediaExtraTest, TheRecordIsTheSourcesRecord) {
  const Dictionary record = {{"UUID", "E"},
                             {"Derivatives", Array{Dictionary{{"Filename", "d.png"}, {"IsFlattened", true}}}},
                             {"Title", "T"},
                             {"Timecode", 1.5},
                             {"Later", "kept"}};
  const auto extra = QuiltMediaExtra::initWithDictionary(record, item());
  ASSERT_NE(extra, nullptr);
  EXPECT_EQ(extra->mediaOwner(), item());
  EXPECT_EQ(extra->title(), "T");
  EXPECT_EQ(extra->timecode(), 1.5);
  EXPECT_EQ(extra->derivativeAtIndex(0)->url()->relativePath(),
            item()->extrasFolderPath() / "E" / "derivatives" / "d.png")
      << "its files are looked for in its own place";
  const Dictionary written = extra->dictionary();
  std::vector<std::string> keys;
  for (const auto& [key, value] : written) keys.push_back(key);
  EXPECT_THAT(keys, ElementsAre("UUID", "Derivatives", "Title", "Timecode", "IsFlattened", "TotalSizeInMegaBytes",
                                "Dirty", "Later"));
}

TEST_F(QuiltMediaExtraTest, AnIdentityThatIsNoPlainNameIsRefused) {
  EXPECT_EQ(QuiltMediaExtra::initWithDictionary({{"UUID", "../E"}}, item()), nullptr);
  EXPECT_EQ(takeLines(), Lines{warning("Refused the record of a media source: \"../E\" is no plain file name")});
}

TEST_F(QuiltMediaExtraTest, FlatteningCopiesTheFileIntoTheExtrasFolder) {
  const Path original = pictureFile(8, 8);
  const auto extra = QuiltMediaExtra::initWithPath(original);
  item()->addExtra(extra);
  ASSERT_TRUE(extra->flattenCopy(/*copy=*/true, {}));
  const Path inside = extra->mainDerivative()->url()->relativePath();
  EXPECT_EQ(inside.parent_path(), item()->extrasFolderPath() / extra->uuid() / "derivatives");
  EXPECT_EQ(readFile(inside), readFile(original));
  EXPECT_FALSE(std::filesystem::exists(item()->sourcesFolderPath()));
  EXPECT_THAT(takeProblems(), IsEmpty());
}

}  // namespace
}  // namespace quilt
