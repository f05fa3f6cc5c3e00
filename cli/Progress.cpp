// SPDX-License-Identifier: Apache-2.0
#include "cli/Progress.h"

#include <fmt/format.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>

#include "cli/Failure.h"
#include "cli/Text.h"

namespace quilt::cli {

namespace {

using namespace std::chrono_literals;

constexpr double kAlmostDone = 99.9;
constexpr auto kLineEvery = 1s;
constexpr auto kBarEvery = 100ms;

std::size_t terminalColumns() {
  winsize size = {};
  const bool known = ioctl(STDERR_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0;
  return known ? size.ws_col : 80;
}

// The first `width` columns of a text.
std::string cut(const std::string& text, std::size_t width) {
  if (columns(text) <= width) return text;
  std::string out = text;
  while (columns(out) + 1 > width && !out.empty()) out.pop_back();
  while (!out.empty() && (static_cast<unsigned char>(out.back()) & 0xc0U) == 0xc0U) out.pop_back();  // half a character
  return out + "…";
}

}  // namespace

Progress::Progress(Messages& messages, ProgressStyle style, Clock clock)
    : _messages(messages), _style(style), _clock(std::move(clock)) {}

void Progress::report(const std::string& stage, double percent) {
  const std::lock_guard guard(_mutex);
  if (std::isnan(percent)) return;
  if (_percent < 0) {
    _started = _clock();
    _firstPercent = std::clamp(percent, 0.0, kAlmostDone);
  }
  _stage = stage;
  _percent = std::max(_percent, std::clamp(percent, 0.0, kAlmostDone));
  show(false);
}

void Progress::finish() {
  const std::lock_guard guard(_mutex);
  if (_percent < 0) return;
  _percent = 100;
  show(true);
}

double Progress::remainingSeconds() const {
  const double elapsed = std::chrono::duration<double>(_clock() - _started).count();
  const double done = _percent - _firstPercent;
  if (elapsed < 1 || done < 1) return -1;
  return elapsed * (100 - _percent) / done;
}

void Progress::show(bool complete) {
  if (_style == ProgressStyle::None) return;
  const int tenths = static_cast<int>(_percent * 10);
  const bool news = tenths != _shownTenths || _stage != _shownStage;
  if (_style == ProgressStyle::Json) {
    if (!news) return;
    showEvent(complete);
  } else if (_messages.isTerminal()) {
    if (complete) {
      _messages.setStatus("");
    } else {
      if (!news || (_shownTenths >= 0 && _clock() - _shownAt < kBarEvery)) return;
      showBar();
    }
  } else {
    showLine(complete);
    return;
  }
  _shownAt = _clock();
  _shownTenths = tenths;
  _shownStage = _stage;
}

void Progress::showEvent(bool complete) const {
  Json event{{"event", "progress"}, {"stage", _stage}, {"percent", std::floor(_percent * 10) / 10}};
  const double remaining = complete ? 0 : remainingSeconds();
  event["remaining"] = remaining < 0 ? Json() : Json(std::round(remaining * 10) / 10);
  _messages.line(event.dump(-1, ' ', false, Json::error_handler_t::replace));
}

void Progress::showBar() const {
  constexpr std::size_t kBar = 24;
  const auto filled = static_cast<std::size_t>(_percent * kBar / 100);
  std::string bar;
  for (std::size_t i = 0; i < kBar; ++i) bar += i < filled ? "█" : "░";
  const double remaining = remainingSeconds();
  const std::string tail = fmt::format(" {} {:3} %{}", bar, static_cast<int>(_percent),
                                       remaining < 0 ? "" : "  " + durationText(remaining) + " left");
  const std::size_t width = terminalColumns();
  const std::size_t room = width > columns(tail) + 1 ? width - columns(tail) - 1 : 0;
  _messages.setStatus(cut(cut(escaped(_stage), room) + tail, width - 1));
}

void Progress::showLine(bool complete) {
  // An operation that is over within a second says nothing.
  const Time now = _clock();
  if (_shownTenths < 0 && _shownAt == Time()) _shownAt = now;
  if (now - _shownAt < kLineEvery && !(complete && _shownTenths >= 0)) return;
  const double remaining = complete ? -1 : remainingSeconds();
  _messages.line(fmt::format("{}: {} %{}", escaped(_stage), static_cast<int>(_percent),
                             remaining < 0 ? "" : ", " + durationText(remaining) + " left"));
  _shownAt = now;
  _shownTenths = static_cast<int>(_percent * 10);
}

double ExportProgress::percent(double reported) {
  // The bands in which an export reports its stages: sixths of the whole.
  constexpr double kBand = 100.0 / 6;
  constexpr double kEdge = 0.0001;
  if (reported < kBand - kEdge) {
    _stage = "Copying";
  } else if (reported < 2 * kBand + kEdge) {
    _stage = "Converting";
    const double share = kBand / static_cast<double>(_formats);
    if (reported < _last - kEdge && _format + 1 < _formats) ++_format;
    _last = reported;
    return kBand + share * static_cast<double>(_format) + std::clamp(reported - kBand, 0.0, share);
  } else if (reported < 3 * kBand + kEdge) {
    _stage = "Finalizing";
  } else if (reported < 4 * kBand) {
    _stage = "Copying into the package";
  } else if (reported < 5 * kBand - kEdge || !_zip) {
    _stage = "Finalizing the package";
  } else {
    _stage = "Archiving";
  }
  _last = reported;
  return reported;
}

}  // namespace quilt::cli
