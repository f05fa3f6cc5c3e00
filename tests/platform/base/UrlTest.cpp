// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include "quilt/platform/base/Url.h"

namespace quilt::platform {
namespace {

namespace fs = std::filesystem;

TEST(UrlTest, EncodesAPath) {
  EXPECT_EQ("file:///a/b.mp4", Url::fileUrl("/a/b.mp4").absoluteString());
  EXPECT_EQ("file:///a%20b/%C3%BC%25%23%3F", Url::fileUrl("/a b/ü%#?").absoluteString());
  EXPECT_TRUE(Url::fileUrl("/a").isFileUrl());
}

TEST(UrlTest, ARelativePathIsTakenFromTheWorkingFolder) {
  EXPECT_EQ(fs::current_path() / "a", Url::fileUrl("a").relativePath());
}

TEST(UrlTest, EveryByteOfANameSurvives) {
  std::string name = "/";
  for (int byte = 1; byte < 256; ++byte) name += static_cast<char>(byte);
  const Url url = Url::fileUrl(name);
  EXPECT_EQ(name, url.relativePath());
  const auto parsed = Url::parse(url.absoluteString());
  ASSERT_TRUE(parsed);
  EXPECT_EQ(url, *parsed);
  EXPECT_EQ(name, parsed->relativePath());
}

TEST(UrlTest, ReadsWebAddresses) {
  const auto url = Url::parse("https://example.org/a%20b/c?q=1#f");
  ASSERT_TRUE(url);
  EXPECT_FALSE(url->isFileUrl());
  EXPECT_EQ("https://example.org/a%20b/c?q=1#f", url->absoluteString());
  EXPECT_EQ("/a b/c", url->relativePath());
  EXPECT_EQ("", Url::parse("https://example.org")->relativePath());
  EXPECT_EQ("", Url::parse("https://example.org?/x")->relativePath());
}

TEST(UrlTest, ReadsLocalFileUrls) {
  for (const char* text : {"file:///a/b", "file:/a/b", "FILE:///a/b", "file://localhost/a/b", "file://LOCALHOST/a/b"}) {
    const auto url = Url::parse(text);
    ASSERT_TRUE(url) << text;
    EXPECT_TRUE(url->isFileUrl());
    EXPECT_EQ("/a/b", url->relativePath());
  }
  EXPECT_EQ("/a b", Url::parse("file:%2fa%20b")->relativePathText());
  EXPECT_EQ("/a", Url::parse("file:///a#b?c")->relativePathText());
  EXPECT_EQ("/a%00", Url::parse("file:///a%2500")->relativePathText());
  EXPECT_EQ("/100%", Url::parse("file:///100%")->relativePath());
  EXPECT_EQ("/%zz%4", Url::parse("file:///%zz%4")->relativePath());
}

TEST(UrlTest, RefusesWhatIsNoAbsoluteUrl) {
  for (const char* text :
       {"", "a", "/a/b", ":x", "1a:x", "http:", "https://a b", "https://a\nb", " https://a", "https://a\x7f", "a/b:c",
        "file://host/a", "file://", "file:a", "file://localhost", "file:///a%00b", "file:///a%%00", "file://\x01/a"})
    EXPECT_FALSE(Url::parse(text)) << text;
  EXPECT_FALSE(Url::parse(std::string_view("https://a\0b", 11)));
}

}  // namespace
}  // namespace quilt::platform
