// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <chrono>
#include <functional>
#include <memory>
#include <thread>

#include "quilt/documents/QuiltDocument.h"

namespace quilt::scripting {

/// Keeps what clients edit. The document's record holds an edit before the client hears that it is done; items and
/// sources do not save themselves when a text of theirs changes, so that is the host's part and done here. What the
/// page reads is brought up to date after every save of the document, whoever made it: when somebody asks for it, and
/// else once edits have paused.
class EditKeeper {
 public:
  explicit EditKeeper(std::shared_ptr<QuiltDocument> document);

  /// Main thread: makes the edit and, when it answers true, sees to it that it is saved. False when the record cannot
  /// be written. While a long operation holds the document, the save follows once that has ended.
  bool keep(const std::function<bool()>& edit);

  /// Whether the page's data is older than the record. Any thread.
  [[nodiscard]] bool isPageOld() const { return _isPageOld; }
  /// Whether there is something to settle and nobody has edited for a moment; true once. Any thread.
  bool isDue();
  /// Main thread, or the only thread left: saves what is not saved, and brings the page's data up to date. False when
  /// the record cannot be written.
  bool settle();

 private:
  using Clock = std::chrono::steady_clock;

  bool save();

  const std::shared_ptr<QuiltDocument> _document;
  std::atomic<std::thread::id> _editor{};  // the thread of an edit under way
  bool _hasSaved = false;                  // whether that edit has made the document save; that thread's own
  std::atomic<bool> _isUnsaved{false};
  std::atomic<bool> _isPageOld{false};
  std::atomic<bool> _wantsSettling{false};
  std::atomic<Clock::time_point> _lastEdit{Clock::now()};
  platform::Observation _saves;  // last: it ends first
};

}  // namespace quilt::scripting
