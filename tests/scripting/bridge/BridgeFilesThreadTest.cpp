// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <sys/stat.h>

#include "tests/support/BridgeFixture.h"

namespace quilt::scripting {
namespace {

using support::HttpAnswer;
using support::HttpClient;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;

/// The package as it is served.
class BridgeFilesThreadTest : public support::BridgeFixture {
 protected:
  BridgeFilesThreadTest() {
    writeFile(package() / "clip.mp4", "0123456789");
    writeFile(package() / "a b" / "ü#%.txt", "text");
    writeFile(folder() / "secret.txt", "secret");
  }
  [[nodiscard]] Path package() const { return document()->path(); }
  [[nodiscard]] HttpAnswer get(const std::string& name, const Fields& fields = {}) const {
    return ask("GET", path("package/" + name), fields);
  }
};

TEST_F(BridgeFilesThreadTest, FilesComeWithTheirTypes) {
  const HttpAnswer clip = get("clip.mp4");
  EXPECT_EQ(200, clip.status);
  EXPECT_EQ("0123456789", clip.body);
  EXPECT_EQ("video/mp4", clip.fields.at("content-type"));
  EXPECT_EQ("bytes", clip.fields.at("accept-ranges"));
  EXPECT_EQ("10", clip.fields.at("content-length"));
  const HttpAnswer text = get("a%20b/%C3%BC%23%25.txt");
  EXPECT_EQ("text", text.body);
  EXPECT_EQ("text/plain; charset=utf-8", text.fields.at("content-type"));
  EXPECT_EQ("text", get("a%20b/%C3%BC%23%25.txt?version=2").body);
  for (const auto& [name, type] :
       std::vector<std::pair<std::string, std::string>>{{"x.html", "text/html; charset=utf-8"},
                                                        {"x.JS", "text/javascript; charset=utf-8"},
                                                        {"x.css", "text/css; charset=utf-8"},
                                                        {"x.svg", "image/svg+xml"},
                                                        {"x.asc", "application/octet-stream"},
                                                        {"x", "application/octet-stream"}}) {
    writeFile(package() / name, "x");
    EXPECT_EQ(type, get(name).fields.at("content-type")) << name;
  }
}

TEST_F(BridgeFilesThreadTest, HeadIsAnsweredWithoutTheFile) {
  HttpClient client(port());
  client.send(request("HEAD", path("package/clip.mp4")) + request("GET", path("package/clip.mp4")));
  const HttpAnswer head = client.read(false);
  EXPECT_EQ(200, head.status);
  EXPECT_EQ("10", head.fields.at("content-length"));
  EXPECT_EQ("0123456789", client.read().body);
}

TEST_F(BridgeFilesThreadTest, APartIsAnsweredAsAPart) {
  struct Case {
    const char* range;
    const char* part;
    const char* place;
  };
  for (const Case& one : {Case{"bytes=0-0", "0", "bytes 0-0/10"}, Case{"bytes=2-4", "234", "bytes 2-4/10"},
                          Case{"bytes=7-", "789", "bytes 7-9/10"}, Case{"bytes=8-99", "89", "bytes 8-9/10"},
                          Case{"bytes=-3", "789", "bytes 7-9/10"}, Case{"bytes=-99", "0123456789", "bytes 0-9/10"}}) {
    const HttpAnswer answer = get("clip.mp4", {{"Range", one.range}});
    EXPECT_EQ(206, answer.status) << one.range;
    EXPECT_EQ(one.part, answer.body) << one.range;
    EXPECT_EQ(one.place, answer.fields.at("content-range"));
  }
}

TEST_F(BridgeFilesThreadTest, PartsThatAreNotThereAndListsAreRefused) {
  std::string longList = "bytes=0-1";
  for (int i = 0; i < 1000; ++i) longList += ",0-1";
  for (const std::string& range :
       {std::string("bytes=10-"), std::string("bytes=99-100"), std::string("bytes=5-2"), std::string("bytes=-0"),
        std::string("bytes=0-1,3-4"), longList, std::string("bytes="), std::string("bytes=-"), std::string("bytes=x-1"),
        std::string("bytes=1-x"), std::string("bytes=1--2"), std::string("bytes=0-99999999999999999999999"),
        std::string("bytes=18446744073709551616-"), std::string("bytes=+1-2"), std::string("bytes= 1-2")}) {
    const HttpAnswer answer = get("clip.mp4", {{"Range", range}});
    EXPECT_EQ(416, answer.status) << range;
    EXPECT_EQ("bytes */10", answer.fields.at("content-range"));
    EXPECT_THAT(answer.body, Not(HasSubstr("0123")));
  }
  EXPECT_EQ(416, get("clip.mp4", {{"Range", "bytes=0-1"}, {"Range", "bytes=0-1"}}).status);
  EXPECT_EQ(200, get("clip.mp4", {{"Range", "lines=1-2"}}).status) << "another unit is not for us";
  writeFile(package() / "empty.mp4", "");
  EXPECT_EQ(416, get("empty.mp4", {{"Range", "bytes=0-"}}).status);
  EXPECT_EQ(200, get("empty.mp4").status);
}

TEST_F(BridgeFilesThreadTest, AFileThatIsKnownIsNotSentAgain) {
  const std::string tag = get("clip.mp4").fields.at("etag");
  EXPECT_EQ(304, get("clip.mp4", {{"If-None-Match", tag}}).status);
  EXPECT_EQ(206, get("clip.mp4", {{"Range", "bytes=0-1"}, {"If-Range", tag}}).status);
  EXPECT_EQ(200, get("clip.mp4", {{"Range", "bytes=0-1"}, {"If-Range", "\"other\""}}).status);
  writeFile(package() / "clip.mp4", "changed and longer");
  EXPECT_EQ("changed and longer", get("clip.mp4", {{"If-None-Match", tag}}).body);
  EXPECT_EQ(200, get("clip.mp4", {{"Range", "bytes=0-1"}, {"If-Range", tag}}).status)
      << "parts of two files do not mix";
}

TEST_F(BridgeFilesThreadTest, NothingOutsideThePackageIsReached) {
  writeFile(package() / ".hidden", "hidden");
  std::filesystem::create_symlink(folder() / "secret.txt", package() / "link.txt");
  std::filesystem::create_symlink("clip.mp4", package() / "inner.mp4");
  std::filesystem::create_directory_symlink(folder(), package() / "linked");
  ASSERT_EQ(0, mkfifo((package() / "pipe").c_str(), 0600));
  for (const char* name : {"../secret.txt",
                           "%2e%2e/secret.txt",
                           "..%2fsecret.txt",
                           "%2e%2e%2fsecret.txt",
                           "a%20b/../../secret.txt",
                           "./clip.mp4",
                           "a%20b/../clip.mp4",
                           "a%20b/%2e%2e/clip.mp4",
                           "..%5csecret.txt",
                           "..\\secret.txt",
                           "%00",
                           "clip.mp4%00.txt",
                           "clip.mp4/",
                           "clip.mp4/x",
                           "/clip.mp4",
                           "/etc/passwd",
                           "//etc/passwd",
                           "%2fetc%2fpasswd",
                           "a%20b",
                           "a%20b/",
                           "",
                           "link.txt",
                           "inner.mp4",
                           "linked/secret.txt",
                           "pipe",
                           ".hidden",
                           "%2ehidden",
                           "%",
                           "%2",
                           "%zz",
                           "%25%32%65%25%32%65/secret.txt",
                           "..",
                           ".",
                           "..;/secret.txt",
                           "%c0%ae%c0%ae/secret.txt"}) {
    const HttpAnswer answer = get(name);
    EXPECT_EQ(404, answer.status) << name;
    EXPECT_EQ("There is no such file.\n", answer.body) << name;
  }
  EXPECT_EQ(404, ask("GET", path("")).status);
  EXPECT_EQ(404, ask("GET", path("package")).status);
  EXPECT_EQ(404, ask("GET", path("../package/clip.mp4")).status);
  EXPECT_EQ(401, ask("GET", "/x/../" + token() + "/package/clip.mp4").status) << "no path is resolved";
}

TEST_F(BridgeFilesThreadTest, ANameOf300BytesIsNotFound) {
  EXPECT_EQ(404, get(std::string(300, 'a')).status);
  std::string deep;
  for (int i = 0; i < 2000; ++i) deep += "a/";
  EXPECT_EQ(404, get(deep + "x").status);
}

TEST_F(BridgeFilesThreadTest, ThePageGetsConveyorAndLosesThePolicyThatBarsIt) {
  writeFile(package() / "index.html",
            "<!DOCTYPE html><HTML><head lang=\"a>b\"><META content=\"connect-src 'none'; img-src >\" "
            "http-equiv='Content-Security-Policy'><meta charset=utf-8><script src=\"app.js\"></script></head></html>");
  const std::string wanted =
      "<!DOCTYPE html><HTML><head lang=\"a>b\"><script src=\"../conveyor.js\"></script><meta charset=utf-8>"
      "<script src=\"app.js\"></script></head></html>";
  for (const char* name : {"", "index.html", "index.html?x"}) {
    EXPECT_EQ(wanted, get(name).body) << name;
    EXPECT_EQ("text/html; charset=utf-8", get(name).fields.at("content-type"));
  }
  EXPECT_THAT(get("").fields.at("content-security-policy"), HasSubstr("connect-src 'self'"));
  const HttpAnswer script = ask("GET", path("conveyor.js"));
  EXPECT_EQ(200, script.status);
  EXPECT_EQ("text/javascript; charset=utf-8", script.fields.at("content-type"));
  EXPECT_EQ(readFile(QUILT_SOURCE_FOLDER "/quilt/resources/scripting/conveyor.js"), script.body);
  EXPECT_THAT(readFile(package() / "index.html"), StartsWith("<!DOCTYPE html><HTML><head lang=\"a>b\"><META"))
      << "on disk";
}

TEST_F(BridgeFilesThreadTest, ALargeFileComesWhole) {
  std::string bytes(3 << 20, '\0');
  for (std::size_t i = 0; i < bytes.size(); ++i) bytes[i] = static_cast<char>(i * 2654435761U >> 24);
  writeFile(package() / "large.bin", bytes);
  EXPECT_TRUE(bytes == get("large.bin").body);
  EXPECT_TRUE(bytes.substr(1000000) == get("large.bin", {{"Range", "bytes=1000000-"}}).body);
}

}  // namespace
}  // namespace quilt::scripting
