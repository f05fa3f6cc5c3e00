// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/http/RequestHead.h"

#include <gmock/gmock.h>

#include <random>

namespace quilt::scripting::http {
namespace {

using ::testing::Optional;

TEST(RequestHeadTest, TellsLineFieldsAndParameters) {
  const auto head =
      parseHead("GET /a/b?x=1&y=%20&z HTTP/1.1\r\nHost: h:1\r\nX-Two:  a b\t\r\nx-two:c\r\nEmpty:\r\n\r\n");
  ASSERT_TRUE(head);
  EXPECT_EQ("GET", head->method);
  EXPECT_EQ("/a/b", head->path());
  EXPECT_THAT(head->parameter("x"), Optional(std::string_view("1")));
  EXPECT_THAT(head->parameter("y"), Optional(std::string_view("%20")));
  EXPECT_EQ(std::nullopt, head->parameter("z"));
  EXPECT_THAT(head->only("host"), Optional(std::string_view("h:1")));
  EXPECT_EQ(2U, head->count("x-two"));
  EXPECT_EQ(std::nullopt, head->only("x-two"));
  EXPECT_THAT(head->only("empty"), Optional(std::string_view("")));
}

TEST(RequestHeadTest, TellsWhetherTheConnectionIsKept) {
  const auto keeps = [](const std::string& version, const std::string& fields) {
    const auto head = parseHead("GET / " + version + "\r\n" + fields + "\r\n");
    return head && head->keepsOpen;
  };
  EXPECT_TRUE(keeps("HTTP/1.1", ""));
  EXPECT_TRUE(keeps("HTTP/1.1", "Connection: Keep-Alive\r\n"));
  EXPECT_FALSE(keeps("HTTP/1.1", "Connection: close\r\n"));
  EXPECT_FALSE(keeps("HTTP/1.1", "Connection: upgrade\r\n"));
  EXPECT_FALSE(keeps("HTTP/1.0", "Connection: keep-alive\r\n"));
}

TEST(RequestHeadTest, AHeadCutAnywhereIsNone) {
  const std::string whole = "GET / HTTP/1.1\r\nHost: h\r\n\r\n";
  ASSERT_TRUE(parseHead(whole));
  for (std::size_t length = 0; length < whole.size(); ++length)
    EXPECT_FALSE(parseHead(whole.substr(0, length))) << length;
  EXPECT_FALSE(parseHead(whole + "x"));
}

TEST(RequestHeadTest, AnyBytesAreReadOrRefused) {
  std::mt19937 random(7);
  const std::string whole = "POST /abc%20?d=e HTTP/1.1\r\nHost: h\r\nContent-Length: 12\r\nRange: bytes=0-\r\n\r\n";
  for (int i = 0; i < 20000; ++i) {
    std::string bytes = whole;
    for (int changes = 0; changes < 3; ++changes) bytes[random() % bytes.size()] = static_cast<char>(random());
    const auto head = parseHead(bytes);
    if (!head) continue;
    EXPECT_EQ('/', head->target.front());
    EXPECT_EQ(std::string::npos, head->target.find_first_of(" \r\n"));
    (void)bodyLengthOf(*head);
    (void)percentDecoded(head->path());
    for (const auto& [name, value] : head->fields) {
      EXPECT_FALSE(name.empty());
      EXPECT_EQ(std::string::npos, value.find_first_of("\r\n"));
    }
  }
}

TEST(RequestHeadTest, PercentSignsAreTakenApartOnce) {
  EXPECT_THAT(percentDecoded("a%20b%C3%bc"), Optional(std::string("a b\xC3\xBC")));
  EXPECT_THAT(percentDecoded("%2525"), Optional(std::string("%25")));
  EXPECT_THAT(percentDecoded("+"), Optional(std::string("+")));
  for (const char* wrong : {"%", "%2", "%g0", "%0g", "a%"}) EXPECT_EQ(std::nullopt, percentDecoded(wrong)) << wrong;
}

}  // namespace
}  // namespace quilt::scripting::http
