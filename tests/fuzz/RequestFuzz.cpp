// SPDX-License-Identifier: Apache-2.0
// Requests to the bridge from strangers on the same machine: who comes in, and which bytes of which files they get.
#include <sys/stat.h>

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <string_view>

#include "quilt/platform/install.h"
#include "quilt/scripting/bridge/Calls.h"
#include "quilt/scripting/bridge/Door.h"
#include "quilt/scripting/bridge/http/Files.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/ScratchFolder.h"

using namespace quilt::scripting;
namespace fs = std::filesystem;

namespace {

constexpr std::uint16_t kPort = 4711;
constexpr std::string_view kToken = "TOKEN";
constexpr std::string_view kSecret = "not for guests";

[[noreturn]] void fail(const char* what) {
  std::fprintf(stderr, "%s\n", what);
  std::abort();
}

/// A package with two files to be had, beside much that is not.
class Premises {
 public:
  Premises() {
    const fs::path package = this->package();
    quilt::support::writePlainly(package / "index.html", "<html><head></head></html>");
    quilt::support::writePlainly(package / "media/a b.mp4", std::string(5000, 'm'));
    quilt::support::writePlainly(package / ".hidden", std::string(kSecret));
    quilt::support::writePlainly(_scratch / "outside.txt", std::string(kSecret));
    fs::create_symlink(_scratch / "outside.txt", package / "link.txt");
    fs::create_directory_symlink("/etc", package / "media/etc");
  }

  [[nodiscard]] fs::path package() const { return _scratch / "package"; }

  [[nodiscard]] bool isForGuests(const http::FileStretch& stretch) const {
    struct stat answered {};
    struct stat own {};
    if (fstat(stretch.file.number(), &answered) != 0) return false;
    for (const char* name : {"index.html", "media/a b.mp4"}) {
      if (stat((package() / name).c_str(), &own) == 0 && own.st_ino == answered.st_ino && own.st_dev == answered.st_dev)
        return stretch.offset <= static_cast<std::uint64_t>(own.st_size) &&
               stretch.length <= static_cast<std::uint64_t>(own.st_size) - stretch.offset;
    }
    return false;
  }

 private:
  quilt::support::ScratchFolder _scratch;
};

void checkResponse(const http::Response& response, const Premises& premises) {
  if (std::string_view(http::reasonOf(response.status)) == "Unknown") fail("an answer of an unknown status");
  for (const auto& [name, value] : response.fields) {
    for (const char character : name + value)
      if (static_cast<unsigned char>(character) < ' ') fail("a field that a reader takes for two");
  }
  if (response.body.find(kSecret) != std::string::npos) fail("a body with what is not for guests");
  if (response.file && !premises.isForGuests(*response.file)) fail("a file that is not for guests");
}

/// What may come in, by rules that are written apart from the door's own.
void checkGuest(const http::RequestHead& head) {
  const auto host = head.only("host");
  if (host != "127.0.0.1:4711" && host != "localhost:4711" && host != "[::1]:4711") fail("a guest of another host");
  for (const auto& [name, value] : head.fields)
    if (name == "origin" && value != "http://" + std::string(*host)) fail("a guest from another site");
  const std::string_view path = head.path();
  if (path != "/TOKEN" && !path.starts_with("/TOKEN/")) fail("a guest without the token");
  if (head.method == "GET" || head.method == "HEAD") return;
  if (head.method != "POST") fail("a guest with another method");
  if (head.only("x-conveyor-token") != kToken) fail("a caller that does not show the token");
  if (!head.only("content-type").value_or("").starts_with("application/json")) fail("a call in another language");
}

}  // namespace

// A request: its head, the empty line included, and its body.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const bool isInstalled = (quilt::platform::install(), true);
  static_cast<void>(isInstalled);
  static const Premises premises;
  static const Door door(kPort, std::string(kToken));
  const std::string_view bytes(reinterpret_cast<const char*>(data), size);
  const std::size_t end = bytes.find("\r\n\r\n");
  if (end == std::string_view::npos) {
    if (http::parseHead(bytes)) fail("a head without an end was read");
    return 0;
  }
  const auto head = http::parseHead(bytes.substr(0, end + 4));
  if (!head) return 0;
  static_cast<void>(http::bodyLengthOf(*head));
  static_cast<void>(head->parameter("session"));
  if (const auto refusal = door.judge(*head)) {
    checkResponse(*refusal, premises);
    return 0;
  }
  checkGuest(*head);
  const std::string_view path = door.pathBehind(*head).value_or("");
  if (head->method != "POST") {
    checkResponse(http::answerFile({premises.package(), nullptr}, path, *head), premises);
    return 0;
  }
  Sessions sessions(1, 1, std::chrono::minutes(1));
  MainThreadCalls mainThread;
  EditKeeper keeper(quilt::QuiltDocument::init());
  Calls calls(sessions, mainThread, keeper, {}, std::chrono::milliseconds(1));
  checkResponse(calls.answer(path, std::string(bytes.substr(end + 4))), premises);
  return 0;
}
