// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <latch>
#include <set>
#include <thread>

#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

class DerivativeExportThreadTest : public support::DocumentFixture {};

// Two exports of one title at once took the same name, and the later one overwrote the other.
TEST_F(DerivativeExportThreadTest, TwoExportsOfOneTitleAtOnceMakeTwoFiles) {
  const auto one = made("one");
  const auto two = made("two");
  for (const auto& document : {one, two}) document->setTitle("Talk");
  addPictureItem(*one, 640, 480);
  addPictureItem(*two, 641, 481);
  for (const auto& document : {one, two}) ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  const auto derivativeOf = [](const QuiltDocument& document) {
    return document.mediaAtIndex(0)->sourceAtIndex(0)->mainDerivative();
  };
  std::filesystem::create_directories(folder() / "out");
  std::set<Path> all;
  constexpr std::size_t rounds = 40;
  for (std::size_t round = 0; round < rounds; ++round) {
    std::latch start(2);
    Path made[2];
    const auto run = [&](const QuiltDocument& document, Path& result) {
      start.arrive_and_wait();
      result = derivativeOf(document)->exportToPath(folder() / "out", {});
    };
    std::thread other([&] { run(*two, made[1]); });
    run(*one, made[0]);
    other.join();
    for (const Path& file : made) {
      EXPECT_FALSE(file.empty());
      EXPECT_TRUE(all.insert(file).second) << file << " in round " << round;
    }
  }
  EXPECT_EQ(2 * rounds, namesIn(folder() / "out").size());
}

}  // namespace
}  // namespace quilt
