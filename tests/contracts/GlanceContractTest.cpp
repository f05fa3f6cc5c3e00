// SPDX-License-Identifier: Apache-2.0
// What every Glance promises; GlanceServicesTest tells which picture stands for what.
#include "quilt/platform/glance/GlanceServices.h"
#include "tests/support/Candidate.h"
#include "tests/support/ImageFixtures.h"

namespace quilt::platform {
namespace {

using GlanceContract = support::ContractTest<Glance>;
using GlanceContractThreadTest = GlanceContract;
const auto kGlances =
    ::testing::Values(support::Candidate<Glance>{"Services", [] { return std::make_shared<GlanceServices>(); }});
INSTANTIATE_TEST_SUITE_P(Implementations, GlanceContract, kGlances, support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, GlanceContractThreadTest, kGlances, support::candidateName);

TEST_P(GlanceContract, WhatNothingStandsForIsNull) {
  EXPECT_EQ(nullptr, service->thumbnailImageForURL(Url::fileUrl(folder() / "missing.png")));
  EXPECT_EQ(nullptr, service->thumbnailImageForURL(Url::fileUrl(writeFile(folder() / "damaged.png", "\x89PNG"))));
  EXPECT_EQ(nullptr, service->thumbnailImageForURL(Url::fileUrl(writeFile(folder() / "noise", "\1\2\3"))));
}

TEST_P(GlanceContract, WhatIsNoDocumentHasNoPages) {
  for (const Path& file : {folder() / "missing.pdf", writeFile(folder() / "damaged.pdf", "%PDF-"),
                           writeFile(folder() / "words.txt", "words"), folder()}) {
    EXPECT_EQ(0U, service->documentPagesCount(file)) << file;
    EXPECT_FALSE(service->documentPageAtIndex(file, 0)) << file;
  }
}

TEST_P(GlanceContract, TheFreeFunctionsAskTheInstalledService) {
  const ScopedService<Glance> installed(&Services::glance, service);
  const Path file = support::writeFile(folder() / "a.jpg", support::encode(support::quadrants(30, 20), {}));
  ASSERT_TRUE(FDYThumbnailImageForURL(Url::fileUrl(file)));
  EXPECT_EQ((Size{30, 20}), FDYThumbnailImageForURL(Url::fileUrl(file))->size());
  EXPECT_EQ(0U, FDYPreviewDocumentPagesCount(file));
  EXPECT_FALSE(FDYPreviewDocumentPageAtIndex(file, 0));
}

TEST_P(GlanceContractThreadTest, AnyThreadMayAsk) {
  const Path file = support::writeFile(folder() / "a.jpg", support::encode(support::quadrants(800, 600), {}));
  support::onThreads([&] {
    const auto image = service->thumbnailImageForURL(Url::fileUrl(file));
    ASSERT_TRUE(image);
    EXPECT_EQ((Size{640, 480}), image->size());
    EXPECT_TRUE(image->bitmap());
  });
}

}  // namespace
}  // namespace quilt::platform
