// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/Base64.h"

#include <gtest/gtest.h>

namespace quilt::platform {
namespace {

Data bytes(std::string_view text) { return {text.begin(), text.end()}; }

TEST(Base64Test, KnownTexts) {  // those of RFC 4648
  const std::pair<const char*, const char*> pairs[] = {{"", ""},
                                                       {"f", "Zg=="},
                                                       {"fo", "Zm8="},
                                                       {"foo", "Zm9v"},
                                                       {"foob", "Zm9vYg=="},
                                                       {"fooba", "Zm9vYmE="},
                                                       {"foobar", "Zm9vYmFy"}};
  for (const auto& [plain, encoded] : pairs) {
    EXPECT_EQ(encoded, encodeBase64(bytes(plain)));
    EXPECT_EQ(bytes(plain), decodeBase64(encoded));
  }
  EXPECT_EQ("+/+/", encodeBase64({0xFB, 0xFF, 0xBF}));
}

TEST(Base64Test, SpaceIsSkippedAndPaddingMayBeMissing) {
  EXPECT_EQ(bytes("foobar"), decodeBase64("\n\tZm9v\r\n\tYm Fy\n"));
  EXPECT_EQ(bytes("f"), decodeBase64("Zg"));
  EXPECT_EQ(bytes("fo"), decodeBase64("Zm8"));
  EXPECT_EQ(bytes("f"), decodeBase64("Z g = ="));
}

TEST(Base64Test, OtherCharactersAndLengthsAreRefused) {
  for (const char* text :
       {"Z", "Zm9vY", "Zg=", "Z===", "=", "====", "Zg==Zg==", "Zm9v=", "Zm9v-_", "Zm9v.", "\xFF\xFF\xFF\xFF"})
    EXPECT_FALSE(decodeBase64(text)) << text;
}

}  // namespace
}  // namespace quilt::platform
