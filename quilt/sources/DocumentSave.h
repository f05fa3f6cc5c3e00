// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <exception>
#include <memory>

namespace quilt {

class QuiltDocument;

/// Has the document save itself unless it is processing; null is ignored. Inside a SaveDeferral of this thread, the
/// document saves when the outermost one ends.
void requestSave(const std::shared_ptr<QuiltDocument>& document);

/// Holds back the saves that this thread requests, for work that changes children while it holds the lock of a list
/// below the document's: a save takes the document's own lock, and locks are only ever taken down the tree. Declare it
/// before the lock. What an observer throws while it saves comes out of its end, unless another exception is on its
/// way.
class SaveDeferral {
 public:
  SaveDeferral();
  SaveDeferral(const SaveDeferral&) = delete;
  SaveDeferral& operator=(const SaveDeferral&) = delete;
  ~SaveDeferral() noexcept(false);

 private:
  const int _onTheirWay = std::uncaught_exceptions();
};

}  // namespace quilt
