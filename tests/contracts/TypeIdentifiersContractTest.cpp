// SPDX-License-Identifier: Apache-2.0
// What every TypeIdentifiers promises; TypeTableTest tries names against contents.
#include "quilt/platform/types/TypeTable.h"
#include "tests/support/Candidate.h"

namespace quilt::platform {
namespace {

using TypeIdentifiersContract = support::ContractTest<TypeIdentifiers>;
using TypeIdentifiersContractThreadTest = TypeIdentifiersContract;
const auto kTables =
    ::testing::Values(support::Candidate<TypeIdentifiers>{"Table", [] { return std::make_shared<TypeTable>(); }});
INSTANTIATE_TEST_SUITE_P(Implementations, TypeIdentifiersContract, kTables, support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, TypeIdentifiersContractThreadTest, kTables, support::candidateName);

TEST_P(TypeIdentifiersContract, AFileHasTheTypeOfItsNameUnlessItsBytesSayOtherwise) {
  EXPECT_EQ(types::kHTML, service->preferredIdentifier(writeFile(folder() / "page.html", "<html>")));
  EXPECT_EQ(types::kText, service->preferredIdentifier(writeFile(folder() / "text.mp4", "a text")));
  EXPECT_EQ(types::kPDF, service->preferredIdentifier(writeFile(folder() / "nameless", "%PDF-1.7")));
}

TEST_P(TypeIdentifiersContract, NothingThereOrNothingKnownIsNone) {
  EXPECT_EQ(std::nullopt, service->preferredIdentifier(folder() / "missing.png"));
  EXPECT_EQ(std::nullopt, service->preferredIdentifier(writeFile(folder() / "nameless", std::string(8, '\1'))));
}

TEST_P(TypeIdentifiersContract, ConformanceReachesAnyDistanceUpwards) {
  EXPECT_TRUE(service->conformsTo(types::kMPEG4, types::kMPEG4));
  EXPECT_TRUE(service->conformsTo(types::kMPEG4, types::kMovie));
  EXPECT_TRUE(service->conformsTo(types::kMPEG4, types::kItem));
  EXPECT_FALSE(service->conformsTo(types::kMovie, types::kMPEG4));
}

TEST_P(TypeIdentifiersContract, ATypeWithoutAMimeTypeHasNone) {
  EXPECT_EQ("image/png", service->mimeType(types::kPNG));
  EXPECT_EQ(std::nullopt, service->mimeType(types::kAudiovisual));
  EXPECT_EQ(std::nullopt, service->mimeType("no such type"));
}

TEST_P(TypeIdentifiersContractThreadTest, AnyThreadMayAsk) {
  const Path page = writeFile(folder() / "page.html", "<html>");
  support::onThreads([&] {
    for (int i = 0; i < 50; ++i) {
      const auto type = service->preferredIdentifier(page);
      ASSERT_TRUE(type);
      EXPECT_TRUE(service->conformsTo(*type, types::kText));
    }
  });
}

}  // namespace
}  // namespace quilt::platform
