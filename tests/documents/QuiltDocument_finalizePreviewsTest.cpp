// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "tests/support/DocumentFixture.h"
#include "tests/support/MediaFixtures.h"

namespace quilt {
namespace {

using ::testing::AllOf;
using ::testing::Each;
using ::testing::SizeIs;

class QuiltDocumentFinalizePreviewsTest : public support::DocumentFixture {
 protected:
  static Path movieOfThreeChapters() {
    support::MediaSpec spec = support::silentMovie();
    spec.chapters = {{"One", 0}, {"Two", 0.8}, {"Three", 1.4}};
    return support::makeMedia(spec);
  }

  /// Whether each preview that the record of a source names is said to be written, and is there.
  static std::vector<bool> writtenPreviews(const Dictionary& source, const QuiltMediaSource& of) {
    std::vector<bool> written;
    const Array* previews = source.array("Previews");
    if (!previews) return written;
    for (const auto& preview : *previews) {
      const auto& record = *preview.as<Dictionary>();
      const Path file = of.previewsFolderPath() / record.string("Filename").value_or("");
      written.push_back(record.boolean("IsFlattened").value_or(false) && std::filesystem::is_regular_file(file));
    }
    return written;
  }

  const std::shared_ptr<QuiltDocument> document = made();
  const std::shared_ptr<QuiltMedia> item = addItem(*document);
};

TEST_F(QuiltDocumentFinalizePreviewsTest, EveryPreviewThatFinalizeMakesIsWrittenAndRecordedSo) {
  item->addSource(QuiltMediaSource::initWithPath(movieOfThreeChapters()));
  item->addExtra(QuiltMediaExtra::initWithPath(movieOfThreeChapters()));
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  const Dictionary record = saved(*document);
  const auto& entry = *record.array("Media")->front().as<Dictionary>();
  const auto& source = *entry.array("Sources")->front().as<Dictionary>();
  const auto& extra = *entry.array("Extras")->front().as<Dictionary>();
  EXPECT_THAT(writtenPreviews(source, *item->sourceAtIndex(0)), AllOf(SizeIs(3), Each(true)));
  EXPECT_THAT(writtenPreviews(extra, *item->extraAtIndex(0)), AllOf(SizeIs(3), Each(true)));
}

}  // namespace
}  // namespace quilt
