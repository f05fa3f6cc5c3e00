// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/office/OfficeDocuments.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <cstdlib>
#include <fstream>
#include <system_error>
#include <utility>
#include <vector>

#include "quilt/platform/base/Paths.h"
#include "quilt/platform/base/Url.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/office/ChildProcess.h"

namespace quilt::platform {

namespace {

namespace fs = std::filesystem;
using office::ChildEnd;
using office::ChildResult;

constexpr const char* kProgramName = "soffice.bin";
constexpr const char* kRemedy = "Install LibreOffice (Debian: libreoffice-writer-nogui and libreoffice-impress-nogui).";

// The program asks so to be started again, after it has set up its profile.
constexpr int kStartAgain = 81;

// No macros, no links followed, no pictures from elsewhere.
constexpr const char* kProfile = R"(<?xml version="1.0" encoding="UTF-8"?>
<oor:items xmlns:oor="http://openoffice.org/2001/registry" xmlns:xs="http://www.w3.org/2001/XMLSchema" xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance">
<item oor:path="/org.openoffice.Office.Common/Security/Scripting"><prop oor:name="DisableMacrosExecution" oor:op="fuse"><value>true</value></prop></item>
<item oor:path="/org.openoffice.Office.Common/Security/Scripting"><prop oor:name="MacroSecurityLevel" oor:op="fuse"><value>3</value></prop></item>
<item oor:path="/org.openoffice.Office.Common/Security/Scripting"><prop oor:name="BlockUntrustedRefererLinks" oor:op="fuse"><value>true</value></prop></item>
<item oor:path="/org.openoffice.Office.Writer/Content/Update"><prop oor:name="Link" oor:op="fuse"><value>0</value></prop></item>
<item oor:path="/org.openoffice.Office.Calc/Content/Update"><prop oor:name="Link" oor:op="fuse"><value>2</value></prop></item>
<item oor:path="/org.openoffice.Office.Common/Misc"><prop oor:name="UseOpenCL" oor:op="fuse"><value>false</value></prop></item>
</oor:items>
)";

// Between two questions whether to go on waiting for another conversion.
constexpr std::chrono::milliseconds kTurn(50);

Error cancelled(const fs::path& path) {
  return {ErrorKind::Cancelled, "The conversion of the document was cancelled.", path};
}

bool isProgram(const fs::path& path) {
  std::error_code error;
  return fs::is_regular_file(path, error) && access(path.c_str(), X_OK) == 0;
}

// The user's fonts and language, and nothing that could lead to a network or a display.
std::vector<std::string> environmentFor(const fs::path& work) {
  std::vector<std::string> environment{"TMPDIR=" + work.native(), "SAL_USE_VCLPLUGIN=svp",
                                       "XDG_RUNTIME_DIR=" + work.native(), "GSETTINGS_BACKEND=memory"};
  for (const char* name :
       {"HOME", "PATH", "LANG", "LC_ALL", "LC_CTYPE", "LC_TIME", "LC_NUMERIC", "XDG_DATA_HOME", "XDG_CACHE_HOME"}) {
    if (const char* value = std::getenv(name)) environment.push_back(std::string(name) + "=" + value);
  }
  return environment;
}

// A document's kind may show in its extension alone. Anything else of its name stays out of the command.
std::string plainExtension(const fs::path& path) {
  constexpr std::size_t longest = 8;
  const std::string extension = pathExtension(path);
  const bool isPlain = std::ranges::all_of(extension, [](unsigned char c) {
    return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
  });
  return isPlain && extension.size() <= longest ? extension : "";
}

// "7": all that distributions tell beside the program, as "UpdateID=LibreOffice_7_en-US_…". Asking the program itself
// would start it.
std::string majorVersion(const fs::path& program) {
  constexpr std::string_view key = "UpdateID=LibreOffice_";
  std::ifstream settings(program.parent_path() / "versionrc");
  for (std::string line; std::getline(settings, line);) {
    if (line.starts_with(key)) return line.substr(key.size(), line.find('_', key.size()) - key.size());
  }
  return "";
}

// Many programs call their web pages ".doc". Left to itself LibreOffice turns these into blank pages.
bool isWebPage(const fs::path& path) {
  constexpr std::size_t length = 256;
  const Result<std::string> start = services().files->readStart(path, length);
  if (!start) return false;
  std::string text = start->substr(start->starts_with("\xEF\xBB\xBF") ? 3 : 0);
  text.erase(0, text.find_first_not_of(" \t\r\n"));
  std::ranges::transform(text, text.begin(), [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
  return text.starts_with("<!doctype html") || text.starts_with("<html");
}

bool isOfficeDocument(const fs::path& path) {
  const std::optional<std::string> type = FDYTypePreferredIdentifier(path);
  return type && types::isOneOf(*services().types, *type, types::kOfficeDocuments);
}

}  // namespace

fs::path OfficeDocuments::findProgram() {
  std::error_code error;
  const char* searched = std::getenv("PATH");
  for (std::string list = searched ? searched : ""; !list.empty();) {
    const std::size_t end = std::min(list.find(':'), list.size());
    const fs::path program = fs::path(list.substr(0, end)) / "soffice";
    list.erase(0, end + 1);
    if (!program.is_absolute() || !isProgram(program)) continue;
    const fs::path real = fs::canonical(program, error).parent_path() / kProgramName;
    if (!error && isProgram(real)) return real;
  }
  for (const char* folder :
       {"/usr/lib/libreoffice/program", "/usr/lib64/libreoffice/program", "/opt/libreoffice/program"})
    if (const fs::path program = fs::path(folder) / kProgramName; isProgram(program)) return program;
  return {};
}

Capability OfficeDocuments::capability() {
  const char* name = "Office documents (LibreOffice)";
  const fs::path program = findProgram();
  if (program.empty()) return {name, false, "", kRemedy};
  return {name, true, majorVersion(program), ""};
}

OfficeDocuments::OfficeDocuments(std::shared_ptr<const DocumentToolkit> pdf)
    : OfficeDocuments(std::move(pdf), Settings()) {}

OfficeDocuments::OfficeDocuments(std::shared_ptr<const DocumentToolkit> pdf, Settings settings)
    : _pdf(std::move(pdf)), _settings(std::move(settings)), _cache(_settings.cache, _settings.maximumCache) {}

Result<std::shared_ptr<PagedDocument>> OfficeDocuments::openDocument(const fs::path& path,
                                                                     const ContinueBlock& goesOn) const {
  return isOfficeDocument(path) ? openConverted(path, goesOn) : _pdf->openDocument(path, goesOn);
}

Result<std::shared_ptr<PagedDocument>> OfficeDocuments::openConverted(const fs::path& path,
                                                                      const ContinueBlock& goesOn) const {
  std::unique_lock lock(_conversion, std::defer_lock);
  while (!lock.try_lock_for(kTurn)) {
    if (goesOn && !goesOn()) return cancelled(path);
  }
  const std::string extension = plainExtension(path);
  const Result<fs::path> kept = _cache.pathFor(path, extension);
  if (!kept) return kept.error();
  if (_cache.use(*kept)) {
    // One that cannot be opened was damaged in the cache, and is made anew.
    if (Result<std::shared_ptr<PagedDocument>> opened = _pdf->openDocument(*kept)) return opened;
  }
  const Result<fs::path> converted = convert(path, extension, goesOn);
  if (!converted) return converted.error();
  Result<std::shared_ptr<PagedDocument>> opened = _pdf->openDocument(*converted);
  if (!opened) return Error{opened.error().kind, opened.error().text, path};
  return opened;
}

Result<fs::path> OfficeDocuments::convert(const fs::path& path, const std::string& extension,
                                          const ContinueBlock& goesOn) const {
  if (_settings.program.empty()) {
    return Error{ErrorKind::NotFound, "LibreOffice, which office documents need, is not installed.", path};
  }
  const Result<fs::path> work = _cache.makeWorkFolder();
  if (!work) return work.error();
  const fs::path copy = *work / withExtension("document", extension);
  Result<fs::path> pdf = Error{ErrorKind::InputOutput, "The document cannot be copied to be converted.", path};
  if (services().files->copyfile(path, copy, nullptr, nullptr) == 0) pdf = _cache.pathFor(copy, extension);
  if (pdf) {
    Result<void> made = convertIn(*work, path, copy, goesOn);
    if (made) made = _cache.put(*work / "out/document.pdf", *pdf);
    if (!made) pdf = made.error();
  }
  std::error_code ignored;
  fs::remove_all(*work, ignored);
  return pdf;
}

Result<void> OfficeDocuments::convertIn(const fs::path& work, const fs::path& path, const fs::path& copy,
                                        const ContinueBlock& goesOn) const {
  const fs::path profile = work / "profile";
  for (const fs::path& folder : {profile / "user", work / "out"}) {
    if (const Result<void> made = services().files->createDirectoryAtPath(folder); !made) return made.error();
  }
  const Result<void> written = services().files->writeAtomically(profile / "user/registrymodifications.xcu", kProfile);
  if (!written) return written.error();

  std::vector<std::string> arguments{"-env:UserInstallation=" + Url::fileUrl(profile).absoluteString(),
                                     "--headless",
                                     "--nologo",
                                     "--norestore",
                                     "--nodefault",
                                     "--nolockcheck",
                                     "--convert-to",
                                     "pdf",
                                     "--outdir",
                                     (work / "out").native()};
  if (isWebPage(copy)) arguments.emplace_back("--infilter=HTML (StarWriter)");
  arguments.push_back(copy.native());
  ChildResult result = office::runChild(_settings.program, arguments, environmentFor(work), _settings.timeout, goesOn);
  if (result.end == ChildEnd::Exited && result.status == kStartAgain) {
    result = office::runChild(_settings.program, arguments, environmentFor(work), _settings.timeout, goesOn);
  }
  switch (result.end) {
    case ChildEnd::NotStarted:
      return Error{ErrorKind::NotFound, "LibreOffice, which office documents need, cannot be started.", path};
    case ChildEnd::TimedOut:
      return Error{ErrorKind::Damaged, "LibreOffice took too long to convert the document.", path};
    case ChildEnd::Cancelled:
      return cancelled(path);
    case ChildEnd::Killed:
      return Error{ErrorKind::Damaged, "LibreOffice crashed on the document.", path};
    case ChildEnd::Exited:
      break;
  }
  // It exits with 0 also when it could not read the document.
  if (services().files->kindOfItemAtPath(work / "out/document.pdf") == FileKind::File) return {};
  return Error{ErrorKind::Damaged, "LibreOffice cannot read the document; it is damaged or protected by a password.",
               path};
}

}  // namespace quilt::platform
