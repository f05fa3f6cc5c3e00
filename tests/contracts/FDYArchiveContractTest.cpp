// SPDX-License-Identifier: Apache-2.0
// What every FDYArchive promises; ZipArchiveTest reads the archives with other programs.
#include <gmock/gmock.h>

#include "quilt/platform/absent/Absent.h"
#include "quilt/platform/zip/ZipArchive.h"
#include "tests/support/Candidate.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;

using Archive = support::Candidate<FDYArchive>;
const Archive kZip{"Zip", [] { return std::make_shared<ZipArchive>(); }};
const Archive kNoZip{"Absent", [] { return std::make_shared<AbsentArchive>(); }};

class FDYArchiveFailureContract : public support::ContractTest<FDYArchive> {
 protected:
  Path package() const {
    writeFile(folder() / "package/a.txt", "text");
    writeFile(folder() / "package/b/c.mp4", std::string(3'000'000, 'm'));
    return folder() / "package";
  }
  Result<void> pack(const Path& file, const Path& zip, const ProgressionBlock& block = {}) const {
    return service->archiveFile(file, "Package.qpk", zip, block);
  }
};
INSTANTIATE_TEST_SUITE_P(Implementations, FDYArchiveFailureContract, ::testing::Values(kZip, kNoZip),
                         support::candidateName);

TEST_P(FDYArchiveFailureContract, AFailureNamesTheFileAndKeepsWhatWasThere) {
  const Path old = writeFile(folder() / "old.zip", "old"), missing = folder() / "missing";
  support::expectTellingError(pack(missing, folder() / "new.zip"), missing);
  support::expectTellingError(pack(missing, old), missing);
  EXPECT_EQ("old", readFile(old));
  EXPECT_THAT(namesIn(folder()), ElementsAre("old.zip"));
}

using FDYArchiveContract = FDYArchiveFailureContract;
using FDYArchiveContractThreadTest = FDYArchiveFailureContract;
INSTANTIATE_TEST_SUITE_P(Implementations, FDYArchiveContract, ::testing::Values(kZip), support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, FDYArchiveContractThreadTest, ::testing::Values(kZip),
                         support::candidateName);

TEST_P(FDYArchiveContract, ProgressRisesFromZeroToAHundred) {
  std::vector<double> seen;
  ASSERT_TRUE(pack(package(), folder() / "new.zip", [&](double percentage) {
    seen.push_back(percentage);
    return true;
  }));
  EXPECT_EQ(0, seen.front());
  EXPECT_EQ(100, seen.back());
  EXPECT_TRUE(std::is_sorted(seen.begin(), seen.end()));
}

TEST_P(FDYArchiveContract, ARefusalCancelsAndLeavesNothing) {
  const auto packed = pack(package(), folder() / "new.zip", [](double percentage) { return percentage < 50; });
  ASSERT_FALSE(packed);
  EXPECT_EQ(ErrorKind::Cancelled, packed.error().kind);
  EXPECT_THAT(namesIn(folder()), ElementsAre("package"));
}

TEST_P(FDYArchiveContractThreadTest, ThreadsPackAtOnceAndGetTheSameBytes) {
  const Path source = package();
  std::atomic<int> number = 0;
  support::onThreads([&] { EXPECT_TRUE(pack(source, folder() / (std::to_string(++number) + ".zip"))); });
  EXPECT_EQ(readFile(folder() / "1.zip"), readFile(folder() / "4.zip"));
}

}  // namespace
}  // namespace quilt::platform
