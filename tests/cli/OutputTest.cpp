// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <unistd.h>

#include <cstdlib>

#include "cli/Output.h"

namespace quilt::cli {
namespace {

using ::testing::HasSubstr;

class OutputTest : public ::testing::Test {
 protected:
  ~OutputTest() override {
    std::fclose(_out);
    std::fclose(_err);
    std::free(_outBytes);
    std::free(_errBytes);
  }

  Output output(bool json) { return {_out, json, false, false, _messages}; }
  std::string out() const { return {_outBytes, _outSize}; }
  std::string err() const { return {_errBytes, _errSize}; }
  Json document() const { return Json::parse(out()); }

 private:
  char* _outBytes = nullptr;
  char* _errBytes = nullptr;
  std::size_t _outSize = 0;
  std::size_t _errSize = 0;
  std::FILE* _out = open_memstream(&_outBytes, &_outSize);
  std::FILE* _err = open_memstream(&_errBytes, &_errSize);
  Messages _messages{_err, false, false};
};

TEST_F(OutputTest, ItemsAreLinesForPeople) {
  Output printed = output(false);
  printed.item({{"uuid", "1"}}, "1\tMovie\tA");
  printed.item({{"uuid", "2"}}, "2\tMovie\tB");
  EXPECT_EQ(ExitCode::Done, printed.finish(std::nullopt));
  EXPECT_EQ("1\tMovie\tA\n2\tMovie\tB\n", out());
}

TEST_F(OutputTest, ItemsAreOneListInJson) {
  Output printed = output(true);
  printed.item({{"uuid", "1"}}, "1");
  printed.item({{"uuid", "2"}}, "2");
  EXPECT_EQ("", out());
  EXPECT_EQ(ExitCode::Done, printed.finish(std::nullopt));
  EXPECT_EQ(Json::parse(R"({"schema":1,"ok":true,"result":[{"uuid":"1"},{"uuid":"2"}]})"), document());
}

TEST_F(OutputTest, AnEmptyListIsAListStill) {
  Output printed = output(true);
  printed.beginList();
  printed.finish(std::nullopt);
  EXPECT_EQ(Json::array(), document()["result"]);
}

TEST_F(OutputTest, AFailureIsAnErrorOnBothStreams) {
  Output printed = output(true);
  EXPECT_EQ(ExitCode::NotFound, printed.finish(Failure(ExitCode::NotFound, "There is no file \"a\"", "/a")));
  EXPECT_EQ(
      Json::parse(
          R"({"schema":1,"ok":false,"error":{"code":"not-found","message":"There is no file \"a\"","path":"/a"},"result":null})"),
      document());
  EXPECT_EQ("quilt: error: There is no file \"a\"\n", err());
}

TEST_F(OutputTest, SomeOfSeveralKeepTheResultsAndNameEachCause) {
  Output printed = output(true);
  printed.item({{"uuid", "1"}}, "1");
  std::optional<Failure> failure;
  try {
    throwIfAny({Failure(ExitCode::NotFound, "no a", "/a"), Failure(ExitCode::Invalid, "bad b", "/b")}, 1, "failed");
  } catch (const Failure& thrown) {
    failure = thrown;
  }
  EXPECT_EQ(ExitCode::Partial, printed.finish(failure));
  const Json error = document()["error"];
  EXPECT_EQ("partial", error["code"]);
  EXPECT_EQ("2 of 3 failed", error["message"]);
  EXPECT_EQ("/a", error["path"]);
  EXPECT_EQ("invalid", error["causes"][1]["code"]);
  EXPECT_EQ(1U, document()["result"].size());
  EXPECT_EQ("quilt: error: no a\nquilt: error: bad b\nquilt: error: 2 of 3 failed\n", err());
}

TEST_F(OutputTest, NamesThatAreNoUtf8DoNotSpoilTheDocument) {
  Output printed = output(true);
  printed.object({{"path", "/a\xff"}}, "");
  printed.finish(std::nullopt);
  EXPECT_EQ("/a\xef\xbf\xbd", document()["result"]["path"]);
}

TEST(OutputStreamTest, AFullDiskUnderTheResultsIsAFailure) {
  std::FILE* full = std::fopen("/dev/full", "w");
  ASSERT_TRUE(full);
  char* bytes = nullptr;
  std::size_t size = 0;
  std::FILE* errors = open_memstream(&bytes, &size);
  Messages messages(errors, false, false);
  Output output(full, false, false, false, messages);
  output.object({}, "text");
  EXPECT_EQ(ExitCode::InputOutput, output.finish(std::nullopt));
  EXPECT_THAT(std::string(bytes, size), HasSubstr("The results could not be written: No space left on device"));
  std::fclose(full);
  std::fclose(errors);
  std::free(bytes);
}

TEST(FailureTest, OneOfOneKeepsItsCodeAndSeveralAlikeShareIt) {
  const auto codeOf = [](const std::vector<Failure>& failures, std::size_t done) {
    try {
      throwIfAny(failures, done, "failed");
    } catch (const Failure& failure) {
      return failure.code;
    }
    return ExitCode::Done;
  };
  const Failure missing(ExitCode::NotFound, "a");
  const Failure damaged(ExitCode::Invalid, "b");
  EXPECT_EQ(ExitCode::Done, codeOf({}, 0));
  EXPECT_EQ(ExitCode::NotFound, codeOf({missing}, 0));
  EXPECT_EQ(ExitCode::Partial, codeOf({missing}, 1));
  EXPECT_EQ(ExitCode::NotFound, codeOf({missing, missing}, 0));
  EXPECT_EQ(ExitCode::Failed, codeOf({missing, damaged}, 0));
}

TEST(FailureTest, EveryKindOfErrorHasItsExitCode) {
  using platform::ErrorKind;
  EXPECT_EQ(ExitCode::NotFound, exitCodeFor(ErrorKind::NotFound));
  EXPECT_EQ(ExitCode::Failed, exitCodeFor(ErrorKind::AlreadyExists));
  EXPECT_EQ(ExitCode::InputOutput, exitCodeFor(ErrorKind::PermissionDenied));
  EXPECT_EQ(ExitCode::InputOutput, exitCodeFor(ErrorKind::NoSpace));
  EXPECT_EQ(ExitCode::InputOutput, exitCodeFor(ErrorKind::InputOutput));
  EXPECT_EQ(ExitCode::Invalid, exitCodeFor(ErrorKind::Damaged));
  EXPECT_EQ(ExitCode::Invalid, exitCodeFor(ErrorKind::Unsupported));
  EXPECT_EQ(ExitCode::Interrupted, exitCodeFor(ErrorKind::Cancelled));
  EXPECT_EQ(ExitCode::Locked, exitCodeFor(ErrorKind::Locked));
  EXPECT_EQ(ExitCode::Invalid, exitCodeFor(ErrorKind::Unsafe));
}

}  // namespace
}  // namespace quilt::cli
