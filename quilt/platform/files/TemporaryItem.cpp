// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/files/TemporaryItem.h"

#include <cerrno>
#include <utility>

#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/files/Folders.h"

namespace quilt::platform {

TemporaryItem::TemporaryItem(SystemCalls& system, int folder, std::string finalName)
    : _system(system), _folder(folder), _finalName(std::move(finalName)) {}

TemporaryItem::~TemporaryItem() {
  bool changed = false;
  if (_exists) removeTree(_system, _folder, _name, changed);
}

int TemporaryItem::create(const std::function<int(const std::string&)>& make) {
  int error = EEXIST;
  for (int attempt = 0; error == EEXIST && attempt < 100; ++attempt) {
    _name = hiddenNameBeside(_finalName);
    error = make(_name);
  }
  _exists = error != EEXIST;  // what failed half-way is removed too
  return error;
}

int TemporaryItem::replace() {
  if (_system.renameAt(_folder, _name.c_str(), _folder, _finalName.c_str(), 0) != 0) return errno;
  _exists = false;
  return 0;
}

int TemporaryItem::putIfFree() {
  const int error = renameIfFree(_system, _folder, _name, _folder, _finalName);
  if (error == 0) _exists = false;
  return error;
}

}  // namespace quilt::platform
