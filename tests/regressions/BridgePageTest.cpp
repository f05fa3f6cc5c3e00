// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include "quilt/scripting/bridge/Page.h"

namespace quilt::scripting {
namespace {

const std::string kConveyorTag = "<script src=\"../conveyor.js\"></script>";

// The script of a page used to be put into the first "<head" of its text, wherever that stood.

TEST(BridgePageTest, AHeadInACommentIsNoHead) {
  EXPECT_EQ("<!-- <head> is below --><html><head>" + kConveyorTag + "</head></html>",
            withConveyor("<!-- <head> is below --><html><head></head></html>"));
  EXPECT_EQ("<!--><head>" + kConveyorTag + "<!--x-->", withConveyor("<!--><head><!--x-->"))
      << "a comment that is whole";
  EXPECT_EQ("<!-- <head> --!><head>" + kConveyorTag, withConveyor("<!-- <head> --!><head>"));
  EXPECT_EQ(kConveyorTag + "<!-- <head>", withConveyor("<!-- <head>")) << "a comment without an end";
}

TEST(BridgePageTest, AHeadInAScriptOrATitleIsNoHead) {
  EXPECT_EQ(kConveyorTag + "<script>var s = '<head>';</script><p>",
            withConveyor("<script>var s = '<head>';</script><p>"));
  EXPECT_EQ(kConveyorTag + "<title><head></title>", withConveyor("<title><head></title>"));
}

TEST(BridgePageTest, WithoutAHeadTheScriptComesBeforeEverythingElse) {
  EXPECT_EQ("<!DOCTYPE html>" + kConveyorTag + "<p>", withConveyor("<!DOCTYPE html><p>"));
  EXPECT_EQ("<!doctype html><!-- c --><html lang=\"a>b\">" + kConveyorTag + "<header><head>",
            withConveyor("<!doctype html><!-- c --><html lang=\"a>b\"><header><head>"));
  EXPECT_EQ(kConveyorTag, withConveyor(""));
  EXPECT_EQ("\xEF\xBB\xBF" + kConveyorTag + "Hello", withConveyor("\xEF\xBB\xBFHello")) << "the mark stays first";
}

TEST(BridgePageTest, OnlyATagThatCountsIsAPolicy) {
  const std::string script = "<script>s = '<meta http-equiv=content-security-policy>'</script>";
  EXPECT_EQ("<head>" + kConveyorTag + script, withConveyor("<head>" + script)) << "the text of a script stays";
  EXPECT_EQ("<head>" + kConveyorTag + "<p>",
            withConveyor("<head><META HTTP-EQUIV='Content-Security-Policy' content=\"default-src 'none'\"><p>"));
}

TEST(BridgePageTest, WhatDoesNotEndIsLeftAsItIs) {
  for (const char* page : {"<", "<h", "<head", "<head lang=\"", "<!", "<!-", "<?", "</", "<script>", "<meta '"})
    EXPECT_NE(std::string::npos, withConveyor(page).find(kConveyorTag)) << page;
  EXPECT_EQ(kConveyorTag + "<head lang=\"", withConveyor("<head lang=\""));
}

}  // namespace
}  // namespace quilt::scripting
