// SPDX-License-Identifier: Apache-2.0
// What every Clock promises.
#include "quilt/platform/files/SystemClock.h"
#include "tests/support/Candidate.h"

namespace quilt::platform {
namespace {

using ClockContract = support::ContractTest<Clock>;
using ClockContractThreadTest = ClockContract;
const auto kClocks =
    ::testing::Values(support::Candidate<Clock>{"System", [] { return std::make_shared<SystemClock>(); }},
                      support::Candidate<Clock>{"Installed", [] { return services().clock; }});
INSTANTIATE_TEST_SUITE_P(Implementations, ClockContract, kClocks, support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, ClockContractThreadTest, kClocks, support::candidateName);

TEST_P(ClockContract, NowIsTheTimeOfDay) {
  const Date before = std::chrono::system_clock::now();
  const Date now = service->now();
  EXPECT_LE(before, now);
  EXPECT_LE(now, std::chrono::system_clock::now());
}

TEST_P(ClockContractThreadTest, AnyThreadMayAsk) {
  support::onThreads([this] {
    const Date first = service->now();
    EXPECT_LE(first, service->now());
  });
}

}  // namespace
}  // namespace quilt::platform
