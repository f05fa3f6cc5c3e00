// SPDX-License-Identifier: Apache-2.0
#include "cli/Program.h"

#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <cstring>
#include <new>

#include "cli/ActingDelegate.h"
#include "cli/Parser.h"
#include "cli/Text.h"

namespace quilt::cli {

namespace {

bool wantsColor(int descriptor, bool refused) {
  const char* noColor = std::getenv("NO_COLOR");
  const char* terminal = std::getenv("TERM");
  return !refused && !(noColor && *noColor) && isatty(descriptor) && terminal && std::strcmp(terminal, "dumb") != 0;
}

// The failure that the action threw, if it threw one.
template <class Action>
std::optional<Failure> failureOf(const Action& action) {
  try {
    action();
    return std::nullopt;
  } catch (const Failure& failure) {
    return failure;
  } catch (const std::bad_alloc&) {
    return Failure(ExitCode::Failed, "There is not enough memory");
  } catch (const std::exception& error) {
    return Failure(ExitCode::Failed, "Something unexpected happened: " + escaped(error.what()));
  }
}

void carryOut(const Request& request, Messages& messages, Output& output) {
  const Settings& settings = request.settings;
  ProgressStyle style = settings.progress;
  if (settings.quiet && style == ProgressStyle::Automatic) style = ProgressStyle::None;
  Progress progress(messages, style);
  const auto log = std::make_shared<LogCollector>(messages, settings.verbose);
  platform::FDYLogger::addSink(log);
  const Context context{settings, messages, output, progress, *log};
  const std::optional<Failure> failure = failureOf([&] {
    if (settings.dryRun) {
      PreviewDelegate delegate(context);
      dispatch(request.command, delegate);
    } else {
      ActingDelegate delegate(context);
      dispatch(request.command, delegate);
    }
    progress.finish();
    if (!settings.quiet) log->showWarnings();
  });
  platform::FDYLogger::removeSink(log);
  if (failure) throw *failure;
}

}  // namespace

int run(const std::vector<std::string>& arguments) {
  // A reader that goes away is told by the failed write, so that nothing is left half done.
  std::signal(SIGPIPE, SIG_IGN);
  std::optional<Request> request;
  std::optional<Failure> failure = failureOf([&] { request = parse(arguments); });
  const bool noColor = request && request->settings.noColor;
  const bool json = request ? request->settings.json : asksForJson(arguments);
  Messages messages(stderr, isatty(STDERR_FILENO) != 0, wantsColor(STDERR_FILENO, noColor));
  Output output(stdout, json, isatty(STDOUT_FILENO) != 0, wantsColor(STDOUT_FILENO, noColor), messages);
  if (request) {
    messages.setQuiet(request->settings.quiet);
    failure = failureOf([&] { carryOut(*request, messages, output); });
  }
  return static_cast<int>(output.finish(failure));
}

}  // namespace quilt::cli
