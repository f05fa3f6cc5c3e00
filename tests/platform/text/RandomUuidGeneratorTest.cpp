// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/RandomUuidGenerator.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <mutex>
#include <set>
#include <thread>
#include <vector>

namespace quilt::platform {
namespace {

using ::testing::MatchesRegex;

TEST(RandomUuidGeneratorTest, TheFormIsVersionFourInUpperCase) {
  RandomUuidGenerator generator;
  for (int i = 0; i < 1000; ++i) {
    const std::string uuid = generator.generateUUID();
    ASSERT_EQ(36U, uuid.size());
    ASSERT_THAT(uuid, MatchesRegex("[0-9A-F]+-[0-9A-F]+-4[0-9A-F]+-[89AB][0-9A-F]+-[0-9A-F]+"));
    for (const std::size_t place : {8U, 13U, 18U, 23U}) ASSERT_EQ('-', uuid[place]);
  }
}

TEST(RandomUuidGeneratorTest, EveryFreeBitIsRandom) {
  RandomUuidGenerator generator;
  std::array<std::set<char>, 36> seen;
  for (int i = 0; i < 2000; ++i) {
    const std::string uuid = generator.generateUUID();
    for (std::size_t place = 0; place < uuid.size(); ++place) seen[place].insert(uuid[place]);
  }
  for (std::size_t place = 0; place < seen.size(); ++place) {
    const bool isDash = place == 8 || place == 13 || place == 18 || place == 23;
    EXPECT_EQ(isDash || place == 14 ? 1U : place == 19 ? 4U : 16U, seen[place].size()) << place;
  }
}

TEST(RandomUuidGeneratorThreadTest, NoTwoAreAlikeOnAnyThread) {
  RandomUuidGenerator generator;
  std::mutex mutex;
  std::set<std::string> all;
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&] {
      std::vector<std::string> own;
      for (int j = 0; j < 5000; ++j) own.push_back(generator.generateUUID());
      const std::lock_guard guard(mutex);
      all.insert(own.begin(), own.end());
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(20'000U, all.size());
}

// Random bytes are fetched ahead; a child process must not hand out those of its parent.
TEST(RandomUuidGeneratorTest, AChildProcessMakesOthersThanItsParent) {
  RandomUuidGenerator generator;
  generator.generateUUID();
  std::array<int, 2> ends{};
  ASSERT_EQ(0, pipe(ends.data()));
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    const std::string uuid = generator.generateUUID();
    _exit(write(ends[1], uuid.data(), uuid.size()) == 36 ? 0 : 1);
  }
  const std::string ours = generator.generateUUID();
  std::string theirs(36, '\0');
  EXPECT_EQ(36, ::read(ends[0], theirs.data(), theirs.size()));
  waitpid(child, nullptr, 0);
  close(ends[0]);
  close(ends[1]);
  EXPECT_NE(ours, theirs);
}

}  // namespace
}  // namespace quilt::platform
