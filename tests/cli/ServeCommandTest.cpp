// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <csignal>

#include "tests/support/HttpClient.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::support {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::MatchesRegex;
using ::testing::Not;
using ::testing::StartsWith;

/// "quilt serve" as a process. What it serves has tests of its own.
class ServeCommandTest : public QuiltProgramTest {
 protected:
  /// A document with a link and a theme.
  void makeDocument() {
    quilt({"new", "document", "Talk"});
    EXPECT_EQ(0, quilt({"set", "Talk", "theme=" QUILT_SOURCE_FOLDER "/quilt/resources/themes/olive.qth"}).exit);
    EXPECT_EQ(0, quilt({"add", "Talk", "https://example.org/"}).exit);
  }
  /// The address that it prints.
  static std::string addressOf(const RunningProgram& program) {
    EXPECT_TRUE(waitUntil([&] { return program.outputSoFar().find('\n') != std::string::npos; }))
        << program.errorsSoFar();
    const std::string out = program.outputSoFar();
    return out.substr(0, out.find('\n'));
  }
  static std::uint16_t portOf(const std::string& address) {
    return static_cast<std::uint16_t>(std::stoi(address.substr(address.find(':', 7) + 1)));
  }
  static HttpAnswer get(const std::string& address) {
    HttpClient client(portOf(address));
    const std::size_t path = address.find('/', 7);
    client.send("GET " + address.substr(path) + " HTTP/1.1\r\nHost: " + address.substr(7, path - 7) + "\r\n\r\n");
    return client.read();
  }
  static std::string tokenOf(const std::string& address) {
    const std::size_t begin = address.find('/', 7) + 1;
    return address.substr(begin, address.find('/', begin) - begin);
  }
  /// What any user of the machine sees of all that runs.
  static std::string argumentsOfEveryProcess() {
    std::string all;
    for (const auto& entry : std::filesystem::directory_iterator("/proc"))
      if (std::isdigit(entry.path().filename().native().front()) != 0) all += read(entry.path() / "cmdline");
    return all;
  }
  [[nodiscard]] std::filesystem::path package() const {
    return nlohmann::json(quiltJson({"show", "Talk"})["result"]["path"]).get<std::string>();
  }
};

TEST_F(ServeCommandTest, PrintsTheAddressAndServesUntilCtrlC) {
  makeDocument();
  const auto program = start({"serve", "Talk"});
  const std::string address = addressOf(*program);
  EXPECT_THAT(address, MatchesRegex("http://127\\.0\\.0\\.1:[0-9]+/[0-9a-f]{32}/package/"));
  const HttpAnswer page = get(address);
  EXPECT_EQ(200, page.status);
  EXPECT_THAT(page.body, HasSubstr("<script src=\"../conveyor.js\"></script>"));
  EXPECT_THAT(get(address + "controllers/data.js").body, StartsWith("var appData = {"));
  EXPECT_THAT(argumentsOfEveryProcess(), AllOf(HasSubstr("serve"), Not(HasSubstr(tokenOf(address)))));
  const Ended refused = quilt({"set", "Talk", "title=Other"});
  EXPECT_EQ(6, refused.exit) << "it is the library's writer";
  EXPECT_THAT(refused.err, HasSubstr("process "));
  program->signal(SIGINT);
  const Ended run = program->wait();
  EXPECT_EQ(130, run.exit);
  EXPECT_EQ(address + "\n", run.out);
  EXPECT_THAT(run.err, Not(HasSubstr(tokenOf(address)))) << "the secret is in the result alone";
  EXPECT_THAT(run.err, HasSubstr("quilt: Stopped. Every edit is saved"));
  EXPECT_THAT(run.err, Not(HasSubstr("error"))) << "that is how serving ends";
  EXPECT_EQ(0, quilt({"set", "Talk", "title=Other"}).exit);
}

TEST_F(ServeCommandTest, EndsBySigtermAlsoWithClientsThere) {
  makeDocument();
  const auto program = start({"serve", "Talk"});
  const std::string address = addressOf(*program);
  HttpClient client(portOf(address));
  client.send("GET / HTTP/1.1\r\n");
  program->signal(SIGTERM);
  EXPECT_EQ(143, program->wait().exit);
}

TEST_F(ServeCommandTest, PrintsOneJsonDocument) {
  makeDocument();
  const auto program = start({"serve", "Talk", "--json"});
  EXPECT_TRUE(waitUntil([&] { return program->outputSoFar().ends_with("}\n"); }));
  program->signal(SIGINT);
  const Ended run = program->wait();
  EXPECT_EQ(130, run.exit);
  const nlohmann::json document = run.json();
  EXPECT_EQ(true, document["ok"]);
  EXPECT_EQ("Talk", document["result"]["title"]);
  EXPECT_THAT(document["result"]["address"].get<std::string>(), StartsWith("http://127.0.0.1:"));
}

TEST_F(ServeCommandTest, FinalizesWhatIsStaleAndNothingElse) {
  makeDocument();
  const auto serveOnce = [&] {
    const auto program = start({"serve", "Talk"});
    (void)addressOf(*program);
    program->signal(SIGINT);
    program->wait();
    return std::filesystem::last_write_time(package() / "controllers" / "data.js");
  };
  const auto touch = [&](std::chrono::seconds ago) {
    std::filesystem::last_write_time(package() / "controllers" / "data.js",
                                     std::filesystem::file_time_type::clock::now() - ago);
    return std::filesystem::last_write_time(package() / "controllers" / "data.js");
  };
  serveOnce();
  const auto later = touch(std::chrono::seconds(-10));
  EXPECT_EQ(later, serveOnce()) << "written after the last change";
  const auto earlier = touch(std::chrono::hours(1));
  EXPECT_NE(earlier, serveOnce()) << "written before it";
  touch(std::chrono::seconds(-10));
  std::filesystem::remove(package() / "index.html");
  serveOnce();
  EXPECT_TRUE(std::filesystem::exists(package() / "index.html"));
}

TEST_F(ServeCommandTest, RefusesWhatHasNoPage) {
  quilt({"new", "document", "Plain"});
  quilt({"new", "document", "Paper", "--type", "PDF"});
  const Ended plain = quilt({"serve", "Plain"});
  EXPECT_EQ(2, plain.exit);
  EXPECT_THAT(plain.err, HasSubstr("It has no theme"));
  const Ended paper = quilt({"serve", "Paper"});
  EXPECT_EQ(2, paper.exit);
  EXPECT_THAT(paper.err, HasSubstr("no Interactive document"));
  EXPECT_EQ(3, quilt({"serve", "None"}).exit);
}

TEST_F(ServeCommandTest, APortThatIsTakenIsReported) {
  makeDocument();
  const auto program = start({"serve", "Talk"});
  const std::uint16_t port = portOf(addressOf(*program));
  std::filesystem::copy(library(), folder() / "other", std::filesystem::copy_options::recursive);
  RunningProgram second({"--library", folder() / "other", "serve", "Talk", "--port", std::to_string(port)}, environment,
                        "");
  const Ended refused = second.wait();
  EXPECT_EQ(1, refused.exit) << refused.out;
  EXPECT_THAT(refused.err, HasSubstr("Port " + std::to_string(port) + " cannot be had"));
  program->signal(SIGINT);
  program->wait();

  const auto again = start({"serve", "Talk", "--port", std::to_string(port)});
  EXPECT_EQ(port, portOf(addressOf(*again))) << "it is free at once";
  again->signal(SIGINT);
  again->wait();
  for (const char* wrong : {"0", "65536", "-1", "x", "80x"})
    EXPECT_EQ(2, quilt({"serve", "Talk", "--port", wrong}).exit);
}

TEST_F(ServeCommandTest, ADryRunServesAndChangesNothing) {
  makeDocument();
  const Snapshot before = snapshot(library());
  const Ended run = quilt({"serve", "Talk", "--dry-run"});
  EXPECT_EQ(0, run.exit);
  EXPECT_THAT(run.out, HasSubstr("Would finalize the document \"Talk\""));
  EXPECT_EQ(before, snapshot(library()));
}

TEST_F(ServeCommandTest, OpensTheBrowserThroughAFileOfTheUsersOwn) {
  makeDocument();
  // Writes down what it is started with, and the file that it is given.
  write(folder() / "bin" / "xdg-open",
        "#!/bin/sh\nstat -c %a \"$(dirname \"$1\")\" > '" + (folder() / "mode").string() + "'\ncat \"$1\" > '" +
            (folder() / "page").string() + "'\necho \"$@\" > '" + (folder() / "words").string() + "'\n");
  ASSERT_EQ(0, chmod((folder() / "bin" / "xdg-open").c_str(), 0755));
  environment["PATH"] = (folder() / "bin").string() + ":/usr/bin:/bin";
  environment["XDG_RUNTIME_DIR"] = folder();
  const auto program = start({"serve", "Talk", "--open"});
  const std::string address = addressOf(*program);
  EXPECT_TRUE(waitUntil([&] { return !read(folder() / "words").empty(); }));
  program->signal(SIGINT);
  program->wait();
  const std::string words = read(folder() / "words");
  EXPECT_THAT(words, StartsWith((folder() / "quilt-serve-").string()));
  EXPECT_THAT(words, Not(HasSubstr("127.0.0.1"))) << "other users see it";
  EXPECT_THAT(read(folder() / "page"), HasSubstr("url=" + address + "\""));
  EXPECT_EQ("700\n", read(folder() / "mode"));
  EXPECT_FALSE(std::filesystem::exists(words.substr(0, words.size() - 1))) << "and is gone with the program";
}

TEST_F(ServeCommandTest, WithoutABrowserItSaysSoAndServes) {
  makeDocument();
  environment["PATH"] = "/nonexistent";
  const auto program = start({"serve", "Talk", "--open"});
  EXPECT_EQ(200, get(addressOf(*program)).status);
  program->signal(SIGINT);
  EXPECT_THAT(program->wait().err, HasSubstr("There is no \"xdg-open\""));
}

}  // namespace
}  // namespace quilt::support
