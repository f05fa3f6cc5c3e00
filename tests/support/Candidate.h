// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <thread>
#include <vector>

#include "tests/support/ModelFixture.h"

namespace quilt::support {

/// One implementation of a role, as a contract test is asked of it.
template <class Role>
struct Candidate {
  const char* name;
  std::function<std::shared_ptr<Role>()> make;
};

template <class Role>
void PrintTo(const Candidate<Role>& candidate, std::ostream* out) {
  *out << candidate.name;
}

/// Names the tests after their implementations: the last argument of INSTANTIATE_TEST_SUITE_P.
inline constexpr auto candidateName = [](const auto& info) { return std::string(info.param.name); };

/// A test of what every implementation of a role promises, on the installed platform.
template <class Role>
class ContractTest : public ModelFixture, public ::testing::WithParamInterface<Candidate<Role>> {
 protected:
  const std::shared_ptr<Role> service = this->GetParam().make();
};

/// Does the work on several threads at once and waits for all of them.
inline void onThreads(const std::function<void()>& work) {
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) threads.emplace_back(work);
  for (std::thread& thread : threads) thread.join();
}

/// Expects an error that tells people something: a sentence, and the file when one is concerned.
template <class T>
void expectTellingError(const platform::Result<T>& result, const Path& file) {
  ASSERT_FALSE(result);
  EXPECT_FALSE(result.error().text.empty());
  EXPECT_EQ(result.error().text.find(file.empty() ? "/" : file.native()), std::string::npos) << result.error().text;
  EXPECT_EQ(result.error().file, file);
}

}  // namespace quilt::support
