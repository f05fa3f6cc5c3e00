// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <string>

#include "quilt/platform/files/SystemCalls.h"

namespace quilt::platform {

/// An item in the making, under a hidden name beside the final one. Removed by the destructor unless it was put in
/// place. The folder stays open, and is held against sweeps, while this lives. Operations answer 0 or an error number.
class TemporaryItem {
 public:
  TemporaryItem(SystemCalls& system, int folder, std::string finalName);
  TemporaryItem(const TemporaryItem&) = delete;
  TemporaryItem& operator=(const TemporaryItem&) = delete;
  ~TemporaryItem();

  /// Calls `make` with fresh names until it no longer answers EEXIST.
  int create(const std::function<int(const std::string& name)>& make);

  /// Renames to the final name: over a file that is there, or only when nothing is there.
  int replace();
  int putIfFree();

  /// Renames a file over what is there and syncs the folder. After an error the old file is in its place, or nothing is
  /// when nothing was.
  int replaceSafely();

  [[nodiscard]] const std::string& name() const { return _name; }

 private:
  bool exchange();

  SystemCalls& _system;
  const int _folder;
  const std::string _finalName;
  std::string _name;
  bool _exists = false;
};

}  // namespace quilt::platform
