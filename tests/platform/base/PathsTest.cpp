// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "quilt/platform/base/Paths.h"

namespace quilt::platform {
namespace {

TEST(PathsTest, KnowsPlainComponents) {
  for (const std::string& name : {std::string("a"), std::string("..."), std::string(".hidden"), std::string("-i"),
                                  std::string("$(x)"), std::string("a\nb"), std::string(255, 'n')})
    EXPECT_TRUE(isPlainComponent(name)) << name;
  for (const std::string& name :
       {std::string(), std::string("."), std::string(".."), std::string("../x"), std::string("/x"), std::string("a/b"),
        std::string("a/"), std::string("a\0b", 3), std::string(256, 'n')})
    EXPECT_FALSE(isPlainComponent(name)) << name;
}

TEST(PathsTest, ExpressesAPathRelativeToAFolder) {
  EXPECT_EQ("b/c", pathRelativeTo("/a/b/c", "/a"));
  EXPECT_EQ("b/c", pathRelativeTo("/a/b/c", "/a/"));
  EXPECT_EQ("b/c", pathRelativeTo("/a/./b//c", "/x/../a"));
  EXPECT_EQ("../c", pathRelativeTo("/a/c", "/a/b"));
  EXPECT_EQ("../../x/y", pathRelativeTo("/x/y", "/a/b"));
  EXPECT_EQ(".", pathRelativeTo("/a/b", "/a/b"));
  EXPECT_EQ("/a/b", pathRelativeTo("/a/b", ""));
  EXPECT_EQ("", pathRelativeTo("", "/a"));
}

TEST(PathsTest, TextsOfPathsRelateAsThePathsDo) {
  std::vector<std::string> paths{"/", "a", "a/b", "/a/", "/a/../b", "//a", "/a/./b"};
  const std::vector<std::string> names{"/a", "/ab", "/b"};
  for (const auto& one : names)
    for (const auto& two : names)
      for (const std::string& path : {one, one + two, one + two + "/a"}) paths.push_back(path);
  for (const std::string& path : paths) {
    for (const std::string& base : paths) {
      const auto relative =
          std::filesystem::path(path).lexically_normal().lexically_relative(standardizedPath(base)).native();
      EXPECT_EQ(relative.empty() ? path : relative, textRelativeTo(path, base)) << path << " to " << base;
    }
  }
}

TEST(PathsTest, StandardizesByTheTextAlone) {
  EXPECT_EQ("/a/c", standardizedPath("/a/./b/..//c/"));
  EXPECT_EQ("/", standardizedPath("/.."));
  EXPECT_EQ("/", standardizedPath("//"));
  EXPECT_EQ("/~", standardizedPath("/~"));
  EXPECT_EQ("~other/a", standardizedPath("~other/a"));
  const std::string home = std::getenv("HOME") ? std::getenv("HOME") : "";
  ASSERT_EQ(0, setenv("HOME", "/home/someone", 1));
  EXPECT_EQ("/home/someone", standardizedPath("~"));
  EXPECT_EQ("/home/someone/a", standardizedPath("~/a"));
  ASSERT_EQ(0, setenv("HOME", home.c_str(), 1));
}

TEST(PathsTest, AnswersAndAppendsExtensions) {
  EXPECT_EQ("mp4", pathExtension("/a/b.c.mp4"));
  EXPECT_EQ("", pathExtension("/a.b/c"));
  EXPECT_EQ("", pathExtension("/a/.hidden"));
  EXPECT_EQ("", pathExtension("/a/b."));
  EXPECT_EQ("a.mp4", withExtension("a", "mp4"));
  EXPECT_EQ("a", withExtension("a", ""));
}

}  // namespace
}  // namespace quilt::platform
