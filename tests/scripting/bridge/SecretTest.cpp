// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/Secret.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <chrono>
#include <set>

namespace quilt::scripting {
namespace {

using Clock = std::chrono::steady_clock;

TEST(SecretTest, SecretsAre32DigitsAndNeverTheSame) {
  std::set<std::string> made;
  for (int i = 0; i < 1000; ++i) {
    const std::string secret = makeSecret();
    EXPECT_EQ(32U, secret.size());
    EXPECT_EQ(std::string::npos, secret.find_first_not_of("0123456789abcdef")) << secret;
    made.insert(secret);
  }
  EXPECT_EQ(1000U, made.size());
}

TEST(SecretTest, ADifferenceAnywhereIsSeen) {
  const std::string secret = makeSecret();
  EXPECT_TRUE(isSameSecret(secret, secret));
  for (std::size_t i = 0; i < secret.size(); ++i) {
    std::string other = secret;
    other[i] = static_cast<char>(other[i] ^ 1);
    EXPECT_FALSE(isSameSecret(other, secret)) << i;
  }
  EXPECT_FALSE(isSameSecret("", secret));
  EXPECT_FALSE(isSameSecret(secret.substr(1), secret));
  EXPECT_FALSE(isSameSecret(secret + "0", secret));
}

// A comparison that stops at the first difference would be a million times faster here.
TEST(SecretTest, TheTimeDoesNotTellWhereTheDifferenceIs) {
  const std::string secret(1 << 20, 'a');
  const auto timeWithDifferenceAt = [&](std::size_t place) {
    std::string given = secret;
    given[place] = 'b';
    Clock::duration best = Clock::duration::max();
    for (int i = 0; i < 20; ++i) {
      const auto before = Clock::now();
      EXPECT_FALSE(isSameSecret(given, secret));
      best = std::min(best, Clock::now() - before);
    }
    return std::chrono::duration<double>(best).count();
  };
  const double atTheFront = timeWithDifferenceAt(0);
  const double atTheEnd = timeWithDifferenceAt(secret.size() - 1);
  EXPECT_LT(atTheEnd, atTheFront * 5);
  EXPECT_LT(atTheFront, atTheEnd * 5);
}

}  // namespace
}  // namespace quilt::scripting
