// SPDX-License-Identifier: Apache-2.0
#include "cli/Failure.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <system_error>

#include "cli/Interrupt.h"
#include "cli/Text.h"

namespace quilt::cli {

namespace {

std::string_view withoutPeriod(std::string_view sentence) {
  if (sentence.ends_with('.')) sentence.remove_suffix(1);
  return sentence;
}

}  // namespace

const char* nameOf(ExitCode code) {
  switch (code) {
    case ExitCode::Done:
      return "done";
    case ExitCode::Failed:
      return "failed";
    case ExitCode::Usage:
      return "usage";
    case ExitCode::NotFound:
      return "not-found";
    case ExitCode::Invalid:
      return "invalid";
    case ExitCode::Partial:
      return "partial";
    case ExitCode::Locked:
      return "locked";
    case ExitCode::InputOutput:
      return "io";
    case ExitCode::HungUp:
      return "hung-up";
    case ExitCode::Interrupted:
      return "interrupted";
    case ExitCode::Terminated:
      return "terminated";
  }
  return "failed";
}

ExitCode exitCodeFor(platform::ErrorKind kind) {
  using platform::ErrorKind;
  switch (kind) {
    case ErrorKind::NotFound:
      return ExitCode::NotFound;
    case ErrorKind::AlreadyExists:
      return ExitCode::Failed;
    case ErrorKind::PermissionDenied:
      return ExitCode::InputOutput;
    case ErrorKind::NoSpace:
      return ExitCode::InputOutput;
    case ErrorKind::InputOutput:
      return ExitCode::InputOutput;
    case ErrorKind::Damaged:
      return ExitCode::Invalid;
    case ErrorKind::Unsupported:
      return ExitCode::Invalid;
    case ErrorKind::Cancelled:
      return Interrupt::exitCode();
    case ErrorKind::Locked:
      return ExitCode::Locked;
    case ErrorKind::Changed:
      return ExitCode::Failed;
    case ErrorKind::Unsafe:
      return ExitCode::Invalid;
  }
  return ExitCode::Failed;
}

ExitCode exitCodeForCause(std::string_view cause) {
  // Where the library answers no error but a log line, the sentences of the errors that stand in such lines.
  constexpr std::array<std::string_view, 9> kDiskTrouble{
      "disk is full",        "disk quota is used up",     "larger than the disk allows",
      "read or write error", "Permission was refused",    "refused access",
      "can only be read",    "Reading or writing failed", "could not be read or written"};
  constexpr std::array<int, 7> kDiskErrors{ENOSPC, EDQUOT, EFBIG, EIO, EROFS, EACCES, EPERM};
  const bool isDiskTrouble =
      std::any_of(kDiskTrouble.begin(), kDiskTrouble.end(),
                  [&](std::string_view sentence) { return cause.find(sentence) != std::string_view::npos; }) ||
      std::any_of(kDiskErrors.begin(), kDiskErrors.end(),
                  [&](int number) { return cause == std::generic_category().message(number); });
  return isDiskTrouble ? ExitCode::InputOutput : ExitCode::Failed;
}

Failure::Failure(const std::string& what, const platform::Error& error)
    : Failure(exitCodeFor(error.kind), what + ": " + escaped(withoutPeriod(error.text)), error.file) {}

Json Failure::toJson() const {
  Json json{{"code", nameOf(code)}, {"message", message}};
  json["path"] = path.empty() ? Json() : Json(path.native());
  if (details.is_object()) json.update(details);
  if (!causes.empty()) {
    json["causes"] = Json::array();
    for (const Failure& cause : causes) json["causes"].push_back(cause.toJson());
  }
  return json;
}

void throwIfAny(const std::vector<Failure>& failures, std::size_t done, const char* whatFailed) {
  if (failures.empty()) return;
  if (failures.size() == 1 && done == 0) throw failures.front();
  const bool alike = std::all_of(failures.begin(), failures.end(),
                                 [&](const Failure& failure) { return failure.code == failures.front().code; });
  const ExitCode code = done > 0 ? ExitCode::Partial : alike ? failures.front().code : ExitCode::Failed;
  Failure all(code, fmt::format("{} of {} {}", failures.size(), failures.size() + done, whatFailed),
              failures.front().path);
  all.causes = failures;
  throw all;
}

}  // namespace quilt::cli
