// SPDX-License-Identifier: Apache-2.0
#include "cli/Saving.h"

#include "cli/DiskTrouble.h"
#include "cli/Text.h"

namespace quilt::cli {

namespace {

bool isDiskFull(const Path& at) {
  constexpr std::uintmax_t kNothing = std::uintmax_t{64} << 10;
  std::error_code error;
  const std::filesystem::space_info space = std::filesystem::space(at, error);
  return !error && space.available < kNothing;
}

}  // namespace

bool changeAndSave(QuiltDocument& document, const std::function<void()>& change) {
  document.setIsProcessing(true);  // or each setter would save
  change();
  document.setIsProcessing(false);
  return document.update();
}

bool changeAndSave(QuiltCollection& collection, const std::function<void()>& change) {
  collection.setIsLoading(true);  // or each setter would save
  change();
  collection.setIsLoading(false);
  return collection.update();
}

Failure explain(const std::string& what, const LogCollector& log, const Path& file, const Path& target) {
  const std::string cause = log.cause();
  ExitCode code = exitCodeForCause(cause);
  std::string message = what;
  const auto trouble = code == ExitCode::Failed ? DiskTrouble::first() : std::nullopt;
  if (code == ExitCode::Failed && (isDiskFull(target) || (trouble && trouble->kind == platform::ErrorKind::NoSpace))) {
    code = ExitCode::InputOutput;
    message += ": The disk is full";
  } else if (trouble) {
    code = exitCodeFor(trouble->kind);
    message += ": " + escaped(trouble->text) + " (" + escaped(trouble->file.native()) + ")";
  } else if (!cause.empty()) {
    message += ": " + escaped(cause);
  }
  return {code, message + "; --verbose shows every step", file};
}

}  // namespace quilt::cli
