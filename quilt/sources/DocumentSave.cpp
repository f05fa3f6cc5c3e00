// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/DocumentSave.h"

#include <algorithm>
#include <utility>
#include <vector>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/Uninterrupted.h"

namespace quilt {

namespace {

struct Deferred {
  std::size_t depth = 0;
  std::vector<std::shared_ptr<QuiltDocument>> documents;
};

thread_local Deferred deferred;

}  // namespace

void requestSave(const std::shared_ptr<QuiltDocument>& document) {
  if (!document) return;
  if (document->isBusy()) return document->noteUnsavedChange();
  if (deferred.depth == 0) {
    document->saveChange();
  } else if (std::find(deferred.documents.begin(), deferred.documents.end(), document) == deferred.documents.end()) {
    deferred.documents.push_back(document);
  }
}

SaveDeferral::SaveDeferral() { ++deferred.depth; }

SaveDeferral::~SaveDeferral() noexcept(false) {
  if (--deferred.depth > 0) return;
  try {
    const platform::Uninterrupted whole;
    for (const auto& document : std::exchange(deferred.documents, {})) requestSave(document);
  } catch (...) {
    if (std::uncaught_exceptions() == _onTheirWay) throw;
  }
}

}  // namespace quilt
