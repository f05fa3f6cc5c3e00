// SPDX-License-Identifier: Apache-2.0
// What every Diagnostics promises, asked of the installed one, which knows the build.
#include <set>

#include "tests/support/Candidate.h"

namespace quilt::platform {
namespace {

using DiagnosticsContractTest = support::ModelFixture;

TEST_F(DiagnosticsContractTest, EachCapabilityHasANameOfItsOwn) {
  std::set<std::string> names;
  for (const Capability& capability : services().diagnostics->capabilities()) {
    EXPECT_FALSE(capability.name.empty());
    EXPECT_TRUE(names.insert(capability.name).second) << capability.name;
  }
  EXPECT_GE(names.size(), 4U);
}

TEST_F(DiagnosticsContractTest, WhatIsAbsentHasARemedyAndNoVersion) {
  for (const Capability& capability : services().diagnostics->capabilities()) {
    EXPECT_EQ(capability.present, capability.remedy.empty()) << capability.name << ": " << capability.remedy;
    if (!capability.present) {
      EXPECT_TRUE(capability.version.empty()) << capability.name;
    }
  }
}

TEST_F(DiagnosticsContractTest, TheAnswerIsTheSameEachTime) {
  const auto names = [] {
    std::vector<std::string> all;
    for (const Capability& capability : services().diagnostics->capabilities()) all.push_back(capability.name);
    return all;
  };
  EXPECT_EQ(names(), names());
}

}  // namespace
}  // namespace quilt::platform
