// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/files/TemporaryItem.h"

#include <fcntl.h>
#include <linux/fs.h>
#include <sys/stat.h>

#include <cerrno>
#include <utility>

#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/files/Folders.h"

namespace quilt::platform {

TemporaryItem::TemporaryItem(SystemCalls& system, int folder, std::string finalName)
    : _system(system), _folder(folder), _finalName(std::move(finalName)) {
  holdFolderOf(folder);
}

TemporaryItem::~TemporaryItem() {
  bool changed = false;
  // What a disk refuses once it may grant the second time; else the next sweep tries again.
  if (_exists && removeTree(_system, _folder, _name, changed) != 0) removeTree(_system, _folder, _name, changed);
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

int TemporaryItem::replaceSafely() {
  struct stat status {};
  const bool isThere = ::fstatat(_folder, _finalName.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0;
  // Two files change places, so that the old one can come back until the new one is known to stay. The old one, which
  // then has the hidden name, is removed by the destructor.
  if (isThere && S_ISREG(status.st_mode) && exchange()) {
    const int error = syncFolder(_system, _folder);
    if (error != 0) exchange();
    return error;
  }
  if (const int error = replace()) return error;
  const int error = syncFolder(_system, _folder);
  if (error != 0 && !isThere) _system.unlinkAt(_folder, _finalName.c_str(), 0);
  return error;
}

bool TemporaryItem::exchange() {
  return _system.renameAt(_folder, _name.c_str(), _folder, _finalName.c_str(), RENAME_EXCHANGE) == 0;
}

int TemporaryItem::putIfFree() {
  const int error = renameIfFree(_system, _folder, _name, _folder, _finalName);
  if (error == 0) _exists = false;
  return error;
}

}  // namespace quilt::platform
