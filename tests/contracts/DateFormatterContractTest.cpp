// SPDX-License-Identifier: Apache-2.0
// What every DateFormatter promises; IcuDateFormatterTest tries languages and time zones.
#include <gmock/gmock.h>

#include "quilt/platform/text/IcuDateFormatter.h"
#include "tests/support/Candidate.h"

namespace quilt::platform {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

class DateFormatterContract : public support::ContractTest<DateFormatter> {
 protected:
  const Date noon = *parseIso8601("2010-05-15T12:00:00Z");
};
using DateFormatterContractThreadTest = DateFormatterContract;
const auto kFormatters =
    ::testing::Values(support::Candidate<DateFormatter>{"Icu", [] { return std::make_shared<IcuDateFormatter>(); }});
INSTANTIATE_TEST_SUITE_P(Implementations, DateFormatterContract, kFormatters, support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, DateFormatterContractThreadTest, kFormatters, support::candidateName);

TEST_P(DateFormatterContract, APatternIsFilledIn) {
  const std::string text = service->format(noon, "MMMM d, yyyy");
  EXPECT_THAT(text, HasSubstr(", "));
  EXPECT_GE(text.size(), std::string("X 15, 2010").size());
}

TEST_P(DateFormatterContract, TheShortFormHasNoTime) {
  EXPECT_THAT(service->shortDescription(noon), Not(HasSubstr(":")));
  EXPECT_FALSE(service->shortDescription(noon).empty());
}

TEST_P(DateFormatterContract, TheDescriptionIsUtc) {
  EXPECT_EQ("2010-05-15 12:00:00 +0000", service->description(noon));
}

TEST_P(DateFormatterContractThreadTest, AnyThreadMayAsk) {
  const std::string expected = service->format(noon, "MMMM d, yyyy") + service->shortDescription(noon);
  support::onThreads([&] {
    for (int i = 0; i < 20; ++i)
      EXPECT_EQ(expected, service->format(noon, "MMMM d, yyyy") + service->shortDescription(noon));
  });
}

}  // namespace
}  // namespace quilt::platform
