// SPDX-License-Identifier: Apache-2.0
// What every JsonWriter promises; ScriptJsonWriterTest tries every character.
#include <gmock/gmock.h>

#include <cmath>

#include "quilt/platform/text/ScriptJsonWriter.h"
#include "tests/support/Candidate.h"

namespace quilt::platform {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

using JsonWriterContract = support::ContractTest<JsonWriter>;
using JsonWriterContractThreadTest = JsonWriterContract;
const auto kWriters =
    ::testing::Values(support::Candidate<JsonWriter>{"Script", [] { return std::make_shared<ScriptJsonWriter>(); }});
INSTANTIATE_TEST_SUITE_P(Implementations, JsonWriterContract, kWriters, support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, JsonWriterContractThreadTest, kWriters, support::candidateName);

TEST_P(JsonWriterContract, EveryKindHasItsForm) {
  EXPECT_EQ(R"({"b":[true,-1,0.5,"t","2010-05-01T12:00:00Z",[1,255],{}],"a":null})",
            service->toJSON(
                {{"b", Array{true, -1, 0.5, "t", *parseIso8601("2010-05-01T12:00:00Z"), Data{1, 255}, Dictionary{}}},
                 {"a", std::nan("")}}));
}

TEST_P(JsonWriterContract, TheTextIsSafeInsideAScriptElement) {
  const std::string text = "</script><!--\xE2\x80\xA8\xE2\x80\xA9\n\"";
  const std::string json = service->toJSON({{text, text}});
  for (const char* danger : {"</", "<!", "\xE2\x80\xA8", "\xE2\x80\xA9", "\n"})
    EXPECT_THAT(json, Not(HasSubstr(danger)));
}

TEST_P(JsonWriterContractThreadTest, OneWriterServesEveryThread) {
  const Dictionary record{{"a", Array(100, Dictionary{{"k", "v"}})}};
  const std::string expected = service->toJSON(record);
  support::onThreads([&] { EXPECT_EQ(expected, service->toJSON(record)); });
}

}  // namespace
}  // namespace quilt::platform
