// SPDX-License-Identifier: Apache-2.0
#include "tests/support/AccessorDocuments.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <fstream>
#include <sstream>

namespace quilt::support {
namespace {

constexpr const char* kHowTo =
    "write them anew with: QUILT_WRITE_DOCUMENTS=1 quilt_tests --gtest_filter='AccessorDocumentsTest.*'";
const std::string kPage = QUILT_SOURCE_FOLDER "/docs/accessors.md";
const std::string kDeclarations = QUILT_SOURCE_FOLDER "/quilt/resources/scripting/conveyor.d.ts";
constexpr std::string_view kBegin = "// ---- The accessors, made from the table of the library\n";

bool writesDocuments() { return std::getenv("QUILT_WRITE_DOCUMENTS") != nullptr; }

std::string contentOf(const std::string& file) {
  std::ostringstream text;
  text << std::ifstream(file, std::ios::binary).rdbuf();
  return text.str();
}

TEST(AccessorDocumentsTest, ThePageListsExactlyTheAccessors) {
  if (writesDocuments()) std::ofstream(kPage, std::ios::binary) << accessorsPage();
  EXPECT_EQ(accessorsPage(), contentOf(kPage)) << kHowTo;
}

TEST(AccessorDocumentsTest, TheDeclarationsListExactlyTheAccessors) {
  std::string content = contentOf(kDeclarations);
  const std::size_t begin = content.find(kBegin);
  ASSERT_NE(std::string::npos, begin);
  const std::size_t end = begin + kBegin.size();
  if (writesDocuments()) {
    content = content.substr(0, end) + accessorDeclarations();
    std::ofstream(kDeclarations, std::ios::binary) << content;
  }
  EXPECT_EQ(accessorDeclarations(), content.substr(end)) << kHowTo;
}

}  // namespace
}  // namespace quilt::support
