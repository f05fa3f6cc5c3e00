// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <cstdlib>

#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/zip/ZipArchive.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/Program.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

using namespace quilt::support;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

class CountingUuids final : public UuidGenerator {
 public:
  std::string generateUUID() override { return std::to_string(++_count); }

 private:
  std::atomic<int> _count{0};
};

class ZipArchiveTest : public ::testing::Test {
 protected:
  ZipArchiveTest() { std::filesystem::create_directories(package); }

  void put(const std::string& name, const std::string& content) {
    std::filesystem::create_directories((package / name).parent_path());
    writeFile(package / name, content);
  }
  Result<void> pack(const ProgressionBlock& block = {}) {
    return ZipArchive().archiveFile(package, package.filename().native(), zipFile, block);
  }

  std::vector<std::string> namesIn(const std::filesystem::path& folder) {
    std::vector<std::string> names;
    for (const auto& item : std::filesystem::directory_iterator(folder)) names.push_back(item.path().filename());
    std::sort(names.begin(), names.end());
    return names;
  }

  ScopedService<UuidGenerator> uuids{&Services::uuids, std::make_shared<CountingUuids>()};
  ScratchFolder folder;
  std::filesystem::path package = folder / "Épisode 1.qpk";
  std::filesystem::path out = folder / "out";
  std::filesystem::path zipFile = [this] {
    std::filesystem::create_directory(out);
    return out / "Épisode 1.zip";
  }();
};

TEST_F(ZipArchiveTest, TwoOtherProgramsReadTheSameContent) {
  put("properties.plist", std::string(5000, 'x'));
  put("media/A/poster.jpg", std::string(3000, 'y'));
  put("media/日本語.txt", "text");
  put("empty.txt", "");
  std::filesystem::create_directory(package / "empty folder");
  ASSERT_TRUE(pack());

  const ProgramResult unzip = runProgram({"unzip", "-t", zipFile});
  EXPECT_EQ(unzip.status, 0) << unzip.output;
  const ProgramResult python =
      runProgram({"python3", "-c",
                  "import sys, zipfile\n"
                  "z = zipfile.ZipFile(sys.argv[1])\n"
                  "assert z.testzip() is None\n"
                  "for i in z.infolist():\n"
                  "  print(i.filename, i.compress_type, i.file_size, oct(i.external_attr >> 16), i.date_time[0])\n"
                  "z.extractall(sys.argv[2])",
                  zipFile, folder / "extracted"});
  EXPECT_EQ(python.status, 0) << python.output;
  EXPECT_EQ(python.output,
            "Épisode 1.qpk/ 0 0 0o40755 1980\n"
            "Épisode 1.qpk/empty folder/ 0 0 0o40755 1980\n"
            "Épisode 1.qpk/empty.txt 0 0 0o100644 1980\n"
            "Épisode 1.qpk/media/ 0 0 0o40755 1980\n"
            "Épisode 1.qpk/media/A/ 0 0 0o40755 1980\n"
            "Épisode 1.qpk/media/A/poster.jpg 0 3000 0o100644 1980\n"
            "Épisode 1.qpk/media/日本語.txt 8 4 0o100644 1980\n"
            "Épisode 1.qpk/properties.plist 8 5000 0o100644 1980\n");
  const ProgramResult same = runProgram({"diff", "-r", package, folder / "extracted" / "Épisode 1.qpk"});
  EXPECT_EQ(same.status, 0) << same.output;
}

TEST_F(ZipArchiveTest, TheSameContentGivesTheSameBytes) {
  put("b.txt", std::string(100000, 'b'));
  put("a/c.mp4", std::string(100000, 'c'));
  ASSERT_TRUE(pack());
  const std::string first = bytesOf(zipFile);

  std::filesystem::rename(package, folder / "moved away");
  put("a/c.mp4", std::string(100000, 'c'));
  put("b.txt", std::string(100000, 'b'));
  chmod((package / "b.txt").c_str(), 0600);
  setenv("TZ", "Pacific/Auckland", 1);
  tzset();
  const Result<void> packed = pack();
  unsetenv("TZ");
  tzset();
  ASSERT_TRUE(packed);
  EXPECT_EQ(bytesOf(zipFile), first);
}

TEST_F(ZipArchiveTest, AFileIsPackedAlone) {
  put("a.txt", "one");
  ASSERT_TRUE(ZipArchive().archiveFile(package / "a.txt", "a.txt", zipFile, {}));
  EXPECT_EQ(runProgram({"unzip", "-p", zipFile, "a.txt"}).output, "one");
}

TEST_F(ZipArchiveTest, TheFolderHasTheGivenNameInside) {
  put("a.txt", "one");
  ASSERT_TRUE(ZipArchive().archiveFile(package, "Other.qpk", zipFile, {}));
  EXPECT_EQ(runProgram({"unzip", "-p", zipFile, "Other.qpk/a.txt"}).output, "one");
  for (const char* name : {"", ".", "..", "a/b", "../x"}) {
    const Result<void> packed = ZipArchive().archiveFile(package, name, zipFile, {});
    ASSERT_FALSE(packed) << name;
    EXPECT_EQ(packed.error().kind, ErrorKind::Unsafe);
  }
}

TEST_F(ZipArchiveTest, ProgressGrowsByBytesFromZeroToAHundred) {
  put("small.txt", std::string(100, 's'));
  put("large.mp4", std::string(20 << 20, 'l'));
  std::vector<double> seen;
  ASSERT_TRUE(pack([&](double percentage) {
    seen.push_back(percentage);
    return true;
  }));
  ASSERT_GE(seen.size(), 15U);
  EXPECT_EQ(seen.front(), 0);
  EXPECT_EQ(seen.back(), 100);
  EXPECT_TRUE(std::is_sorted(seen.begin(), seen.end()));
  EXPECT_EQ(std::adjacent_find(seen.begin(), seen.end()), seen.end());
}

TEST_F(ZipArchiveTest, CancellingLeavesNothingAndKeepsWhatWasThere) {
  put("large.mp4", std::string(20 << 20, 'l'));
  writeFile(zipFile, "the archive of yesterday");
  for (int stopAt = 0; stopAt < 12; ++stopAt) {
    int calls = 0;
    const Result<void> packed = pack([&](double) { return calls++ != stopAt; });
    ASSERT_FALSE(packed);
    EXPECT_EQ(packed.error().kind, ErrorKind::Cancelled);
    EXPECT_EQ(calls, stopAt + 1) << "the block is not asked again";
    EXPECT_THAT(namesIn(out), ElementsAre(zipFile.filename().string()));
    EXPECT_EQ(bytesOf(zipFile), "the archive of yesterday");
  }
}

TEST_F(ZipArchiveTest, AFullDiskLeavesNothing) {
  put("large.mp4", std::string(4 << 20, 'l'));
  rlimit before{};
  ASSERT_EQ(getrlimit(RLIMIT_FSIZE, &before), 0);
  rlimit small = before;
  small.rlim_cur = 1 << 20;
  const auto previous = std::signal(SIGXFSZ, SIG_IGN);
  ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &small), 0);
  const Result<void> packed = pack();
  ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &before), 0);
  std::signal(SIGXFSZ, previous);
  ASSERT_FALSE(packed);
  EXPECT_THAT(packed.error().text, HasSubstr("The archive cannot be written"));
  EXPECT_TRUE(namesIn(out).empty());
}

TEST_F(ZipArchiveTest, LinksAndDevicesAreRefusedByName) {
  put("a.txt", "one");
  std::filesystem::create_symlink("/etc/passwd", package / "innocent.txt");
  const Result<void> link = pack();
  ASSERT_FALSE(link);
  EXPECT_EQ(link.error().kind, ErrorKind::Unsafe);
  EXPECT_EQ(link.error().text, "\"Épisode 1.qpk/innocent.txt\" is a link or a device, which is not packed.");
  std::filesystem::remove(package / "innocent.txt");

  ASSERT_EQ(mkfifo((package / "pipe").c_str(), 0600), 0);
  const Result<void> pipe = pack();
  ASSERT_FALSE(pipe);
  EXPECT_EQ(pipe.error().kind, ErrorKind::Unsafe);
  std::filesystem::remove(package / "pipe");

  std::filesystem::create_directory_symlink(package, folder / "link");
  EXPECT_FALSE(ZipArchive().archiveFile(folder / "link", "link", zipFile, {}));
  EXPECT_TRUE(namesIn(out).empty());
}

TEST_F(ZipArchiveTest, ALinkThatAppearsWhilePackingIsNotFollowed) {
  put("a.mp4", std::string(8 << 20, 'l'));
  put("b.txt", "one");
  const Result<void> packed = pack([&](double percentage) {
    if (percentage > 0 && !std::filesystem::is_symlink(package / "b.txt")) {
      std::filesystem::remove(package / "b.txt");
      std::filesystem::create_symlink("/etc/passwd", package / "b.txt");
    }
    return true;
  });
  ASSERT_FALSE(packed);
  EXPECT_EQ(packed.error().file, package / "b.txt");
  EXPECT_TRUE(namesIn(out).empty());
}

TEST_F(ZipArchiveTest, WhatIsMissingOrUnreadableIsNamed) {
  const Result<void> missing = ZipArchive().archiveFile(folder / "nothing", "nothing", zipFile, {});
  ASSERT_FALSE(missing);
  EXPECT_EQ(missing.error().kind, ErrorKind::NotFound);
  put("a\xFF.txt", "one");
  const Result<void> name = pack();
  ASSERT_FALSE(name);
  EXPECT_EQ(name.error().text, "A name in the folder is no UTF-8 text.");
  std::filesystem::remove(package / "a\xFF.txt");
  const Result<void> nowhere =
      ZipArchive().archiveFile(package, package.filename().native(), out / "no" / "such.zip", {});
  ASSERT_FALSE(nowhere);
  EXPECT_THAT(nowhere.error().text, HasSubstr("The archive cannot be written"));
}

TEST_F(ZipArchiveTest, SixtySixThousandEntriesNeedTheLongFormAndNoDescriptors) {
  for (int i = 0; i < 66000; ++i) writeFile(package / std::to_string(i), "");
  const std::size_t before = openDescriptors();
  std::size_t most = 0;
  ASSERT_TRUE(pack([&](double) {
    most = std::max(most, openDescriptors());
    return true;
  }));
  EXPECT_EQ(openDescriptors(), before);
  EXPECT_LE(most, before + 4);
  const ProgramResult count = runProgram(
      {"python3", "-c", "import sys, zipfile; print(len(zipfile.ZipFile(sys.argv[1]).namelist()))", zipFile});
  EXPECT_EQ(count.output, "66001\n");
}

}  // namespace
}  // namespace quilt::platform
