// SPDX-License-Identifier: Apache-2.0
// What every UuidGenerator promises; RandomUuidGeneratorTest looks at the bits.
#include <gmock/gmock.h>

#include <mutex>
#include <set>

#include "quilt/platform/text/RandomUuidGenerator.h"
#include "tests/support/Candidate.h"

namespace quilt::platform {
namespace {

using UuidGeneratorContract = support::ContractTest<UuidGenerator>;
using UuidGeneratorContractThreadTest = UuidGeneratorContract;
const auto kGenerators = ::testing::Values(
    support::Candidate<UuidGenerator>{"Random", [] { return std::make_shared<RandomUuidGenerator>(); }});
INSTANTIATE_TEST_SUITE_P(Implementations, UuidGeneratorContract, kGenerators, support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, UuidGeneratorContractThreadTest, kGenerators, support::candidateName);

TEST_P(UuidGeneratorContract, AUuidIsOfVersionFourInUpperCase) {
  const std::string uuid = service->generateUUID();
  EXPECT_EQ(36U, uuid.size());
  EXPECT_THAT(uuid, ::testing::MatchesRegex("[0-9A-F]+-[0-9A-F]+-4[0-9A-F]+-[89AB][0-9A-F]+-[0-9A-F]+"));
}

TEST_P(UuidGeneratorContractThreadTest, ThreadsGetDifferentOnes) {
  std::mutex mutex;
  std::set<std::string> all;
  support::onThreads([&] {
    for (int i = 0; i < 100; ++i) {
      const std::string uuid = service->generateUUID();
      const std::lock_guard guard(mutex);
      all.insert(uuid);
    }
  });
  EXPECT_EQ(400U, all.size());
}

class Numbered final : public UuidGenerator {
 public:
  std::string generateUUID() override { return "UUID " + std::to_string(++_count); }

 private:
  int _count = 0;
};

TEST(GenerateUuidTest, TheFreeFunctionAsksTheInstalledService) {
  const ScopedService uuids(&Services::uuids, std::make_shared<Numbered>());
  EXPECT_EQ("UUID 1", generateUUID());
  EXPECT_EQ("UUID 2", generateUUID());
}

}  // namespace
}  // namespace quilt::platform
