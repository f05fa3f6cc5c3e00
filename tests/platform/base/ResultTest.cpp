// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "quilt/platform/base/Result.h"

namespace quilt::platform {
namespace {

TEST(ResultTest, HoldsAValue) {
  Result<std::string> result = std::string("value");
  ASSERT_TRUE(result);
  EXPECT_TRUE(result.hasValue());
  EXPECT_EQ("value", *result);
  EXPECT_EQ(5U, result->size());
}

TEST(ResultTest, HoldsAnError) {
  const Result<int> result = Error{ErrorKind::NoSpace, "The disk is full", "/a"};
  ASSERT_FALSE(result);
  EXPECT_EQ(ErrorKind::NoSpace, result.error().kind);
  EXPECT_EQ("The disk is full", result.error().text);
  EXPECT_EQ("/a", result.error().file);
}

TEST(ResultTest, GivesUpAValueThatCanOnlyMove) {
  Result<std::unique_ptr<int>> result = std::make_unique<int>(7);
  ASSERT_TRUE(result);
  const std::unique_ptr<int> value = *std::move(result);
  EXPECT_EQ(7, *value);
}

TEST(ResultTest, AnErrorMayBeTheValue) {
  const Result<Error*> result = static_cast<Error*>(nullptr);
  EXPECT_TRUE(result);
}

TEST(ResultTest, SuccessNeedsNoValue) {
  EXPECT_TRUE(Result<void>());
  const Result<void> failed = Error{ErrorKind::Cancelled, "The operation was stopped", {}};
  ASSERT_FALSE(failed);
  EXPECT_EQ(ErrorKind::Cancelled, failed.error().kind);
}

}  // namespace
}  // namespace quilt::platform
