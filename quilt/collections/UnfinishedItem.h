// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>

#include "quilt/platform/interfaces/FileManager.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt {

/// A folder that is being made under its final name: a package or a collection. Until finish() a mark beside it says
/// that it is not finished, so that nobody opens it, and so that it is cleared away when this process is killed. The
/// destructor of one that was not finished deletes it.
class UnfinishedItem {
 public:
  /// Clears away first what killed processes left in the folder around it.
  explicit UnfinishedItem(Path folder);
  UnfinishedItem(const UnfinishedItem&) = delete;
  UnfinishedItem& operator=(const UnfinishedItem&) = delete;
  ~UnfinishedItem();

  /// False when the mark cannot be taken away: then the item is not there for good.
  bool finish();

 private:
  const Path _folder;
  std::unique_ptr<platform::FolderHold> _hold;
  Path _mark;
  bool _isFinished = false;
};

}  // namespace quilt
