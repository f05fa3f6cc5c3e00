// SPDX-License-Identifier: Apache-2.0
#include "quilt/collections/UnfinishedItem.h"

#include <utility>

#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/ModelFiles.h"

namespace quilt {

using platform::services;

UnfinishedItem::UnfinishedItem(Path folder) : _folder(std::move(folder)) {
  sweepLevel(_folder.parent_path());
  _hold = services().files->holdFolder(_folder.parent_path());
  // Without a mark it is made in the open, as a file system wants it that takes no mark.
  if (auto mark = services().files->markUnfinished(_folder)) _mark = *std::move(mark);
}

UnfinishedItem::~UnfinishedItem() {
  if (_isFinished) return;
  platform::FileManager& files = *services().files;
  const Path parent = _folder.parent_path();
  (void)files.removeItem(_folder, parent);
  if (!_mark.empty() && !files.fileExistsAtPath(_folder)) (void)files.removeItem(_mark, parent);
}

bool UnfinishedItem::finish() {
  if (!_mark.empty() && !services().files->removeMark(_mark)) return false;
  _isFinished = true;
  return true;
}

}  // namespace quilt
