// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "cli/Delegate.h"
#include "cli/Failure.h"
#include "cli/Options.h"
#include "cli/Parser.h"

namespace quilt::cli {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

/// What a delegate is asked when these words are typed.
Command asked(const std::vector<std::string>& words) {
  RecordingDelegate delegate;
  dispatch(parse(words).command, delegate);
  EXPECT_EQ(1U, delegate.commands.size());
  return delegate.commands.front();
}

/// The message of the usage error that the words end in; empty when they end in none.
std::string complaint(const std::vector<std::string>& words) {
  try {
    (void)parse(words);
  } catch (const Failure& failure) {
    EXPECT_EQ(ExitCode::Usage, failure.code);
    return failure.message;
  }
  return "";
}

TEST(ParserTest, ImportTakesFilesAndACollection) {
  EXPECT_EQ(Command(ImportRequest{.files = {"a.mp4", "b.mp3"}, .collection = "Talks"}),
            asked({"import", "a.mp4", "--collection", "Talks", "b.mp3"}));
}

TEST(ParserTest, ImportReadsAListFromTheInput) {
  EXPECT_EQ(Command(ImportRequest{.filesFromInput = true}), asked({"import", "-"}));
  EXPECT_EQ(Command(ImportRequest{.filesFromInput = true, .nulSeparated = true}), asked({"import", "-0"}));
  EXPECT_EQ(Command(ImportRequest{.files = {"a"}, .filesFromInput = true, .nulSeparated = true}),
            asked({"import", "-0", "a", "-"}));
}

TEST(ParserTest, ImportWithoutFilesIsRefused) { EXPECT_THAT(complaint({"import"}), HasSubstr("FILE is missing")); }

TEST(ParserTest, NothingAfterTwoDashesIsAnOption) {
  EXPECT_EQ(Command(ImportRequest{.files = {"-v", "--", "--json"}}), asked({"import", "--", "-v", "--", "--json"}));
  EXPECT_FALSE(parse({"import", "--", "--json"}).settings.json);
  EXPECT_EQ(Command(ListRequest{"--help"}), asked({"list", "--", "--help"}));
}

TEST(ParserTest, WordsInBracketsAndNamesOfCommandsStayWords) {
  EXPECT_EQ(Command(ImportRequest{.files = {"[a,b]", "list"}, .collection = "[x]"}),
            asked({"import", "[a,b]", "list", "--collection", "[x]"}));
}

TEST(ParserTest, TheOtherCommandsBecomeRequests) {
  EXPECT_EQ(Command(ListRequest{}), asked({"list"}));
  EXPECT_EQ(Command(ListRequest{"Talks"}), asked({"list", "Talks"}));
  EXPECT_EQ(Command(ShowRequest{"A talk"}), asked({"show", "A talk"}));
  EXPECT_EQ(Command(InfoRequest{{"a", "b"}}), asked({"info", "a", "b"}));
  EXPECT_EQ(Command(NewCollectionRequest{"Talks"}), asked({"new", "collection", "Talks"}));
  EXPECT_EQ(Command(NewDocumentRequest{"T", std::nullopt, "Interactive"}), asked({"new", "document", "T"}));
  EXPECT_EQ(Command(NewDocumentRequest{"T", "C", "PDF"}),
            asked({"new", "document", "T", "--collection", "C", "--type", "pdf"}));
  EXPECT_EQ(Command(RemoveRequest{{"A"}, std::nullopt, true}), asked({"remove", "A", "--force"}));
  EXPECT_EQ(Command(RemoveRequest{{"1", "2"}, "D", false}), asked({"remove", "1", "2", "--from", "D"}));
  EXPECT_EQ(Command(CheckRequest{}), asked({"check"}));
  EXPECT_EQ(Command(CheckRequest{{"A", "B"}}), asked({"check", "A", "B"}));
  EXPECT_EQ(Command(ServeRequest{"D", 0, false}), asked({"serve", "D"}));
  EXPECT_EQ(Command(ServeRequest{"D", 4711, true}), asked({"serve", "D", "--open", "--port", "4711"}));
  EXPECT_EQ(Command(DoctorRequest{}), asked({"doctor"}));
  EXPECT_EQ(Command(ThemesRequest{}), asked({"themes"}));
  EXPECT_EQ(Command(FinalizeRequest{"D"}), asked({"finalize", "D"}));
  EXPECT_EQ(Command(BuildRequest{"m.json", "out"}), asked({"build", "m.json", "--output", "out"}));
  EXPECT_EQ(Command(BuildRequest{"m.json", "out", true, {"720p"}, "olive"}),
            asked({"build", "--zip", "--format", "720P", "--theme", "olive", "m.json", "--output", "out"}));
  EXPECT_EQ(Command(HelpRequest{"import"}), asked({"help", "import"}));
  EXPECT_EQ(Command(HelpRequest{"import"}), asked({"import", "--help"}));
  EXPECT_EQ(Command(HelpRequest{}), asked({"-h"}));
  EXPECT_EQ(Command(VersionRequest{}), asked({"--version"}));
}

TEST(ParserTest, AddTellsWhatTheSourcesBecome) {
  using Kind = AddRequest::Kind;
  EXPECT_EQ(Command(AddRequest{"D", {"a", "b"}}), asked({"add", "D", "a", "b"}));
  EXPECT_EQ(Command(AddRequest{"D", {"a"}, Kind::Items, "T", "voice"}),
            asked({"add", "D", "a", "--title", "T", "--commentary", "voice"}));
  EXPECT_EQ(Command(AddRequest{"D", {"a", "b"}, Kind::Montage, "T", "voice", {0, 4.5}}),
            asked({"add", "D", "a", "b", "--montage", "--title", "T", "--commentary", "voice", "--timecode", "0",
                   "--timecode", "4.5"}));
  EXPECT_EQ(Command(AddRequest{"D", {"a", "b"}, Kind::DualSource}), asked({"add", "D", "a", "b", "--dual"}));
  EXPECT_EQ(Command(AddRequest{"D", {"a", "b"}, Kind::Extras, {}, {}, {}, "I"}),
            asked({"add", "D", "a", "b", "--extra-of", "I"}));
  EXPECT_EQ(Command(AddRequest{"D", {"a"}, Kind::Commentary, {}, {}, {}, "I"}),
            asked({"add", "D", "a", "--commentary-of", "I"}));
}

TEST(ParserTest, AddRefusesWhatDoesNotGoTogether) {
  EXPECT_THAT(complaint({"add", "D"}), HasSubstr("SOURCE is missing"));
  EXPECT_THAT(complaint({"add", "D", "a", "--dual", "--montage"}),
              HasSubstr("--montage and --dual do not go together"));
  EXPECT_THAT(complaint({"add", "D", "a", "b", "--title", "T"}), HasSubstr("--title goes with one item"));
  EXPECT_THAT(complaint({"add", "D", "a", "b", "--commentary", "v"}), HasSubstr("--commentary goes with one item"));
  EXPECT_THAT(complaint({"add", "D", "a", "--commentary", "v", "--extra-of", "I"}), HasSubstr("new items only"));
  EXPECT_THAT(complaint({"add", "D", "a", "b", "--commentary-of", "I"}), HasSubstr("one commentary"));
  EXPECT_THAT(complaint({"add", "D", "a", "--timecode", "1", "--timecode", "2"}), HasSubstr("more timecodes"));
  for (const char* wrong : {"x", "-1", "1s", "", "nan", "inf"})
    EXPECT_THAT(complaint({"add", "D", "a", std::string("--timecode=") + wrong}), HasSubstr("--timecode")) << wrong;
  EXPECT_THAT(complaint({"add", "D", "a", "--title", "\xff"}), HasSubstr("not UTF-8"));
}

TEST(ParserTest, MoveAndConvertNeedTheirOptions) {
  EXPECT_EQ(Command(MoveRequest{"D", {"1", "2"}, 3}), asked({"move", "D", "1", "2", "--to", "3"}));
  EXPECT_THAT(complaint({"move", "D", "1"}), HasSubstr("--to is missing"));
  for (const char* wrong : {"-1", "x", "1.5", "99999999999999999999"})
    EXPECT_THAT(complaint({"move", "D", "1", std::string("--to=") + wrong}), HasSubstr("counted from 0")) << wrong;
  EXPECT_EQ(Command(ConvertRequest{"D", {"720p", "480p"}}),
            asked({"convert", "D", "--format", "720p", "--format", "480P", "--format", "720p"}));
  EXPECT_THAT(complaint({"convert", "D"}), HasSubstr("--format is missing"));
}

TEST(ParserTest, SetSplitsAtTheFirstEqualsSign) {
  EXPECT_EQ(Command(SetRequest{"D", {{"title", "a=b"}, {"author", ""}, {"keywords", "-x"}}}),
            asked({"set", "D", "title=a=b", "author=", "keywords=-x"}));
  EXPECT_THAT(complaint({"set", "D", "title"}), HasSubstr("\"title\" is not of the form KEY=VALUE"));
  EXPECT_THAT(complaint({"set", "D", "=x"}), HasSubstr("KEY=VALUE"));
  EXPECT_THAT(complaint({"set", "D", "title=a", "title=b"}), HasSubstr("given twice"));
  EXPECT_THAT(complaint({"set", "D"}), HasSubstr("KEY=VALUE is missing"));
  EXPECT_THAT(complaint({"set", "D", "title=\xff"}), HasSubstr("not UTF-8"));
}

TEST(ParserTest, ExportTakesFormatsInAnyCaseOnceEach) {
  EXPECT_EQ(Command(ExportRequest{"D", "out", true, {"720p", "480p"}, "olive"}),
            asked({"export", "D", "out", "--format", "720P", "--zip", "--format=480p", "--format", "720p", "--theme",
                   "olive"}));
  EXPECT_EQ(Command(ExportRequest{"D", "out", false, {"Desktop"}, std::nullopt}), asked({"export", "D", "out"}));
  EXPECT_THAT(complaint({"export", "D", "out", "--format", "1080p"}),
              HasSubstr("--format is Desktop, 720p or 480p, not \"1080p\""));
  EXPECT_THAT(complaint({"export", "D"}), HasSubstr("DIR is missing"));
  EXPECT_THAT(complaint({"export", "D", "out", "more"}), HasSubstr("\"more\" is one argument too many"));
}

TEST(ParserTest, CommonOptionsStandAnywhereBeforeTheDashes) {
  const Settings expected{
      .library = "/l", .json = true, .quiet = true, .noColor = true, .progress = ProgressStyle::Json};
  EXPECT_EQ(expected, parse({"--library", "/l", "--json", "-q", "list", "--no-color", "--progress=json"}).settings);
  EXPECT_EQ(expected,
            parse({"list", "--quiet", "--json", "--library=/l", "--no-color", "--progress", "JSON"}).settings);
}

TEST(ParserTest, OnlyCommandsThatWriteCanBePreviewed) {
  for (const CommandDescription& command : commands()) {
    const bool offered = complaint({std::string(command.name), "--dry-run"}).find("no option") == std::string::npos;
    EXPECT_EQ(command.writes, offered) << command.name;
  }
  EXPECT_TRUE(parse({"import", "a", "--dry-run"}).settings.dryRun);
}

TEST(ParserTest, MistakesAreNamed) {
  EXPECT_THAT(complaint({}), HasSubstr("No command is given"));
  EXPECT_THAT(complaint({"--json"}), HasSubstr("No command is given"));
  EXPECT_THAT(complaint({"improt", "a"}), HasSubstr("did you mean \"import\"?"));
  EXPECT_THAT(complaint({"frobnicate"}), HasSubstr("There is no command \"frobnicate\"; see \"quilt help\""));
  EXPECT_THAT(complaint({"import", "-z"}), HasSubstr("There is no option \"-z\" here; see \"quilt help import\""));
  EXPECT_THAT(complaint({"import", "a", "--collection"}), HasSubstr("--collection needs a value"));
  EXPECT_THAT(complaint({"import", "a", "--collection", "b", "--collection", "c"}), HasSubstr("more than once"));
  EXPECT_THAT(complaint({"list", "--library", ""}), HasSubstr("--library is empty"));
  EXPECT_THAT(complaint({"list", "-q", "-v"}), HasSubstr("exclude each other"));
  EXPECT_THAT(complaint({"new", "thing", "T"}), HasSubstr("KIND is collection or document, not \"thing\""));
  EXPECT_THAT(complaint({"new", "collection", "T", "--type", "PDF"}), HasSubstr("goes with \"new document\" only"));
  EXPECT_THAT(complaint({"new", "document", ""}), HasSubstr("TITLE is empty"));
  EXPECT_THAT(complaint({"new", "document", "a\x01"}), HasSubstr("has control characters"));
  EXPECT_THAT(complaint({"remove", "a", "b"}), HasSubstr("one document or collection at a time"));
}

TEST(ParserTest, TheWishForJsonIsKnownWithoutParsing) {
  EXPECT_TRUE(asksForJson({"frobnicate", "--json"}));
  EXPECT_FALSE(asksForJson({"import", "--", "--json"}));
}

TEST(OptionsTest, EveryCommandIsFoundByItsNameAndHasAUsageLine) {
  for (const CommandDescription& command : commands()) {
    EXPECT_EQ(&command, findCommand(command.name));
    EXPECT_THAT(usageOf(command), HasSubstr("quilt " + std::string(command.name)));
  }
  EXPECT_EQ("quilt export DOCUMENT DIR [--zip] [--format FORMAT]... [--theme THEME] [--force] [--dry-run]",
            usageOf(*findCommand("export")));
}

}  // namespace
}  // namespace quilt::cli
