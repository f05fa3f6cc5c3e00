// SPDX-License-Identifier: Apache-2.0
// The table itself: a slip in a row would show far away, as a file of no kind.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <map>
#include <set>

#include "quilt/platform/types/TypeTable.h"

namespace quilt::platform {
namespace {

using ::testing::MatchesRegex;

const TypeRow* rowNamed(std::string_view identifier) {
  for (const TypeRow& row : typeRows())
    if (row.identifier == identifier) return &row;
  return nullptr;
}

/// How many steps up the longest line of parents takes; more than there are rows when it never ends.
std::size_t height(const TypeRow& row, std::size_t steps = 0) {
  if (steps > typeRows().size()) return steps;
  std::size_t highest = 0;
  for (const char* parent : row.parents)
    if (const TypeRow* up = rowNamed(parent)) highest = std::max(highest, 1 + height(*up, steps + 1));
  return highest;
}

TEST(TypeRowsTest, EveryIdentifierHasOneRowAndAUsualForm) {
  std::set<std::string_view> seen;
  for (const TypeRow& row : typeRows()) {
    EXPECT_THAT(row.identifier, MatchesRegex("[a-z0-9]+[.][-a-z0-9.]+"));
    EXPECT_TRUE(seen.insert(row.identifier).second) << row.identifier << " has two rows";
  }
}

TEST(TypeRowsTest, EveryParentHasARowAndNoTypeIsItsOwnParent) {
  for (const TypeRow& row : typeRows()) {
    for (const char* parent : row.parents) EXPECT_TRUE(rowNamed(parent)) << row.identifier << " is a " << parent;
    EXPECT_LE(height(row), 5U) << row.identifier;
    const std::set<std::string_view> once(row.parents.begin(), row.parents.end());
    EXPECT_EQ(once.size(), row.parents.size()) << row.identifier << " names a parent twice";
  }
}

TEST(TypeRowsTest, EveryTypeIsAnItem) {
  for (const TypeRow& row : typeRows())
    EXPECT_TRUE(TypeTable().conformsTo(row.identifier, types::kItem)) << row.identifier;
}

TEST(TypeRowsTest, AnExtensionBelongsToOneTypeAndIsInLowerCase) {
  std::map<std::string_view, std::string_view> owners;
  for (const TypeRow& row : typeRows()) {
    for (const char* extension : row.extensions) {
      EXPECT_THAT(extension, MatchesRegex("[a-z0-9]+")) << row.identifier;
      const auto [owner, isNew] = owners.emplace(extension, row.identifier);
      EXPECT_TRUE(isNew) << extension << " is of " << owner->second << " and of " << row.identifier;
    }
  }
}

TEST(TypeRowsTest, MimeTypesHaveTheirFormAndFilesHaveOne) {
  for (const TypeRow& row : typeRows()) {
    for (const char* type : row.mimeTypes) EXPECT_THAT(type, MatchesRegex("[a-z]+/[-+.a-z0-9]+")) << row.identifier;
    EXPECT_TRUE(row.extensions.empty() || !row.mimeTypes.empty()) << row.identifier;
  }
}

TEST(TypeRowsTest, EveryTypeThatTheModelNamesHasARow) {
  using namespace types;
  for (const char* identifier : {kItem,
                                 kURL,
                                 kFolder,
                                 kAudiovisual,
                                 kMovie,
                                 kVideo,
                                 kAudio,
                                 kImage,
                                 kAIFF,
                                 kAIFC,
                                 kM4A,
                                 kMP3,
                                 kMPEG4Audio,
                                 kProtectedMPEG4Audio,
                                 kWAV,
                                 kMovieContainer,
                                 kMPEG4,
                                 kMPEG,
                                 kProtectedMPEG4Video,
                                 kM4V,
                                 k3GPP,
                                 kAVI,
                                 kMatroska,
                                 kWebM,
                                 kJPEG,
                                 kJPEG2000,
                                 kTIFF,
                                 kGIF,
                                 kPNG,
                                 kICNS,
                                 kBMP,
                                 kHEIC,
                                 kSVG,
                                 kPDF,
                                 kEPUB,
                                 kEPUBContainer,
                                 kTextDocument,
                                 kFlatTextDocument,
                                 kWordDoc,
                                 kWordML,
                                 kWordOpenXML,
                                 kPresentation,
                                 kFlatPresentation,
                                 kPowerPointPpt,
                                 kPowerPointOpenXML,
                                 kText,
                                 kHTML})
    EXPECT_TRUE(rowNamed(identifier)) << identifier;
}

}  // namespace
}  // namespace quilt::platform
