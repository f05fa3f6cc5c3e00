// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <exception>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// While one lives, what observers throw on this thread is held back, so that a change, or several that belong
/// together, end as a whole: every observer is told, and the model is left as without the exception. The first that was
/// held is thrown when the outermost one of the thread ends, to whoever called the operation; not when another
/// exception is on its way there already. Declare it first, so that it ends after the locks.
///
/// An observer, and a block that the main thread runs for another thread, begins anew: what is thrown inside an
/// operation that it calls reaches it.
class QUILT_EXPORT Uninterrupted {
 public:
  Uninterrupted();
  Uninterrupted(const Uninterrupted&) = delete;
  Uninterrupted& operator=(const Uninterrupted&) = delete;
  ~Uninterrupted() noexcept(false);

  /// Keeps the exception for the end of the outermost; only while one lives on this thread.
  static void hold(std::exception_ptr thrown);

  /// Has what runs while it lives begin anew, as without any Uninterrupted on this thread.
  class QUILT_EXPORT Suspended {
   public:
    Suspended();
    Suspended(const Suspended&) = delete;
    Suspended& operator=(const Suspended&) = delete;
    ~Suspended();

   private:
    const std::size_t _depth;
    const std::exception_ptr _first;
  };

 private:
  const int _onTheirWay = std::uncaught_exceptions();
};

}  // namespace quilt::platform
