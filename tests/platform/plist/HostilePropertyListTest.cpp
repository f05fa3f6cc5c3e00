// SPDX-License-Identifier: Apache-2.0
// Property lists from strangers, from broken disks and in want of memory: read as a right value or refused, never
// worse.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <memory>

#include "quilt/platform/files/PosixFileManager.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/plist/Limits.h"
#include "quilt/platform/plist/XmlPropertyLists.h"
#include "tests/support/FailingAllocation.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/PlistByPython.h"
#include "tests/support/PropertyListChecks.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

using support::problemWhenReading;
using support::readPlainly;

/// A small record with every kind of value.
Dictionary record() {
  return {
      {"Version", "1.0"},           {"Title", "\xC3\xBC <&> \xF0\x9F\x8E\xAC"},
      {"jukeboxOrder", -1},         {"CreationDate", *parseIso8601("2010-05-01T12:00:00Z")},
      {"IsFlattened", true},        {"DocumentDuration", 12.75},
      {"Data", Data{0, 1, 2, 255}}, {"Media", Array{Dictionary{{"UUID", "A"}, {"Sources", Array{}}}, Dictionary{}}}};
}

class HostilePropertyListTest : public ::testing::Test {
 protected:
  std::string xml() const { return lists.serialize(record()); }

  std::string binary() const {
    support::writePlainly(scratch / "xml", xml());
    EXPECT_TRUE(support::writeBinaryByPython(scratch / "xml", scratch / "binary"));
    return readPlainly(scratch / "binary");
  }

  const XmlPropertyLists lists{};
  const support::ScratchFolder scratch;
  const ScopedService<FileManager> files{&Services::files, std::make_shared<PosixFileManager>()};
};

TEST_F(HostilePropertyListTest, CutAtEveryLengthItIsRefused) {
  for (const std::string& whole : {xml(), binary()}) {
    ASSERT_TRUE(lists.parse(whole));
    const std::size_t end = whole.find_last_not_of('\n') + 1;  // the last line end says nothing
    for (std::size_t length = 0; length < end; ++length) {
      const auto value = lists.parse(std::string_view(whole).substr(0, length));
      ASSERT_FALSE(value) << length;
      ASSERT_EQ(ErrorKind::Damaged, value.error().kind) << length;
    }
  }
}

TEST_F(HostilePropertyListTest, WithAnyByteChangedItIsARightValueOrRefused) {
  for (const std::string& whole : {xml(), binary()}) {
    ASSERT_EQ("", problemWhenReading(whole));
    for (std::size_t place = 0; place < whole.size(); ++place) {
      for (const unsigned change : {0x01U, 0x02U, 0x04U, 0x08U, 0x10U, 0x20U, 0x40U, 0x80U, 0xFFU}) {
        std::string changed = whole;
        changed[place] = static_cast<char>(static_cast<unsigned char>(changed[place]) ^ change);
        ASSERT_EQ("", problemWhenReading(changed)) << "byte " << place << " changed by " << change;
      }
    }
  }
}

TEST_F(HostilePropertyListTest, WithAnyByteMissingOrDoubledItIsARightValueOrRefused) {
  for (const std::string& whole : {xml(), binary()}) {
    for (std::size_t place = 0; place < whole.size(); ++place) {
      ASSERT_EQ("", problemWhenReading(std::string(whole).erase(place, 1))) << place;
      ASSERT_EQ("", problemWhenReading(std::string(whole).insert(place, 1, whole[place]))) << place;
      ASSERT_EQ("", problemWhenReading(std::string(whole).insert(place, 1, '\0'))) << place;
    }
  }
}

TEST_F(HostilePropertyListTest, MoreBytesThanTheLimitAreRefusedUnread) {
  const int file = open((scratch / "long").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
  ASSERT_EQ(0, ftruncate(file, kLongestPropertyList + 1));  // takes no room on the disk
  close(file);
  const auto value = lists.readDictionary(scratch / "long");
  ASSERT_FALSE(value);
  EXPECT_EQ(ErrorKind::Damaged, value.error().kind);
  EXPECT_EQ(scratch / "long", value.error().file);
}

/// Does the work with the first allocation failing, then with only the second, and so on, until it needs no more. The
/// count of allocations that failed.
template <class Work, class Check>
std::size_t withEachAllocationFailing(const Work& work, const Check& check) {
  for (std::size_t nth = 1;; ++nth) {
    auto failing = std::make_unique<support::FailingAllocation>(nth);
    const auto result = work();
    const bool hasFailed = failing->hasFailed();
    failing.reset();
    check(result, hasFailed);
    if (!hasFailed || nth == 10'000) return nth - 1;
  }
}

template <class T>
bool saysThatMemoryRanOut(const Result<T>& result) {
  return !result && result.error().kind == ErrorKind::InputOutput &&
         result.error().text == "There is not enough memory";
}

TEST_F(HostilePropertyListTest, WhereverMemoryRunsOutReadingSaysSo) {
  const PropertyList expected = record();
  for (const std::string& whole : {xml(), binary()}) {
    const std::size_t failures = withEachAllocationFailing([&] { return lists.parse(whole); },
                                                           [&](const Result<PropertyList>& value, bool hasFailed) {
                                                             EXPECT_EQ(hasFailed, saysThatMemoryRanOut(value));
                                                             EXPECT_EQ(hasFailed, !value || !(*value == expected));
                                                           });
    EXPECT_GE(failures, 8U);
    EXPECT_LT(failures, 9'000U);
  }
}

TEST_F(HostilePropertyListTest, WhereverMemoryRunsOutWritingLeavesTheOldFile) {
  const auto path = scratch / "record";
  const Dictionary dictionary = record();
  XmlPropertyLists writer;
  support::writePlainly(path, "old");
  const std::size_t failures = withEachAllocationFailing([&] { return writer.writeDictionary(dictionary, path); },
                                                         [&](const Result<void>& written, bool hasFailed) {
                                                           EXPECT_EQ(hasFailed, saysThatMemoryRanOut(written));
                                                           EXPECT_EQ(hasFailed ? "old" : xml(), readPlainly(path));
                                                         });
  EXPECT_GT(failures, 2U);
  EXPECT_LT(failures, 9'000U);
  EXPECT_THAT(support::namesIn(scratch.path()), ::testing::ElementsAre("record"));
}

}  // namespace
}  // namespace quilt::platform
