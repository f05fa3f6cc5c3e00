// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/files/Folders.h"

#include <dirent.h>
#include <fcntl.h>
#include <linux/fs.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <memory>
#include <string_view>

#include "quilt/platform/base/TemporaryNames.h"

namespace quilt::platform {

namespace {

bool holdsNul(const std::filesystem::path& path) { return path.native().find('\0') != std::string::npos; }

// Without empty components and ".".
std::vector<std::string> components(const std::filesystem::path& path) {
  std::vector<std::string> parts;
  for (const auto& part : path)
    if (!part.empty() && part != ".") parts.push_back(part.native());
  return parts;
}

// What openBeneath does, step by step, for kernels without it.
int walkBelow(SystemCalls& system, int root, std::string_view part, int flags, Descriptor& opened) {
  Descriptor folder;
  int at = root;
  for (;;) {
    const std::size_t slash = part.find('/');
    const std::string name(part.substr(0, slash));
    struct stat status {};
    // A link that refuses to open as a folder fails with ENOTDIR, so it is told apart first; should it be put there
    // between the two steps, O_NOFOLLOW still refuses it.
    if (::fstatat(at, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0) return errno;
    if (S_ISLNK(status.st_mode)) return ELOOP;
    const bool isLast = slash == std::string_view::npos;
    Descriptor next(system.openAt(at, name.c_str(), (isLast ? flags : O_PATH | O_DIRECTORY) | O_NOFOLLOW, 0));
    if (!next) return errno;
    if (isLast) {
      opened = std::move(next);
      return 0;
    }
    folder = std::move(next);
    at = folder.number();
    part.remove_prefix(slash + 1);
  }
}

// Deletes what is in a folder. The recursion is bounded in stack and descriptors: a folder that lies deeper than
// kDeepest below the top is first moved up to the top, which is emptied again.
class Emptying {
 public:
  Emptying(SystemCalls& system, int top, dev_t device, bool& changed)
      : _system(system), _top(top), _device(device), _changed(changed) {}

  int run() {
    int error = 0;
    do {
      _movedUp = false;
      error = empty(_top, 0);
    } while (error == 0 && _movedUp);
    return error;
  }

 private:
  static constexpr int kDeepest = 64;

  int empty(int folder, int depth) {
    std::vector<std::string> names;
    if (const int error = listFolder(folder, names)) return error;
    for (const std::string& name : names)
      if (const int error = remove(folder, name, depth)) return error;
    return 0;
  }

  int remove(int folder, const std::string& name, int depth) {
    if (_system.unlinkAt(folder, name.c_str(), 0) == 0) {
      _changed = true;
      return 0;
    }
    if (errno == ENOENT) return 0;
    if (errno != EISDIR && errno != EPERM) return errno;
    const int refusal = errno;
    Descriptor child(_system.openAt(folder, name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW, 0));
    if (!child) return errno == ENOTDIR ? refusal : errno;
    struct stat status {};
    if (::fstat(child.number(), &status) != 0) return errno;
    if (status.st_dev != _device) return EXDEV;
    // Folders copied from a read-only place are read-only themselves. When the change is refused, so is the rest.
    if ((status.st_mode & S_IRWXU) != S_IRWXU) _system.changeMode(child.number(), S_IRWXU);
    if (depth == kDeepest) {
      if (_system.renameAt(folder, name.c_str(), _top, hiddenNameBeside(name).c_str(), 0) != 0) return errno;
      _movedUp = true;
      return 0;
    }
    if (const int error = empty(child.number(), depth + 1)) return error;
    if (_system.unlinkAt(folder, name.c_str(), AT_REMOVEDIR) != 0) return errno;
    _changed = true;
    return 0;
  }

  SystemCalls& _system;
  const int _top;
  const dev_t _device;
  bool& _changed;
  bool _movedUp = false;
};

}  // namespace

int openPlace(SystemCalls& system, const std::filesystem::path& path, Place& place) {
  if (holdsNul(path)) return ENOENT;
  std::string text = path.native();
  while (text.size() > 1 && text.back() == '/') text.pop_back();
  const std::filesystem::path clean = text;
  place.name = clean.filename().native();
  if (place.name.empty() || place.name == "." || place.name == "..") return ENOENT;
  const std::string folder = clean.has_parent_path() ? clean.parent_path().native() : ".";
  place.folder = Descriptor(system.openAt(AT_FDCWD, folder.c_str(), O_RDONLY | O_DIRECTORY, 0));
  return place.folder ? 0 : errno;
}

std::optional<std::string> partBelow(const std::filesystem::path& path, const std::filesystem::path& root) {
  if (holdsNul(path) || holdsNul(root)) return std::nullopt;
  const std::vector<std::string> whole = components(path);
  const std::vector<std::string> above = components(root);
  if (above.empty() || whole.size() <= above.size() || !std::equal(above.begin(), above.end(), whole.begin()))
    return std::nullopt;
  std::string part;
  for (std::size_t i = above.size(); i < whole.size(); ++i) {
    if (whole[i] == "..") return std::nullopt;
    part.append(part.empty() ? "" : "/").append(whole[i]);
  }
  return part;
}

int openBelow(SystemCalls& system, int root, const std::string& part, int flags, Descriptor& opened) {
  const std::string target = part.empty() ? "." : part;
  opened = Descriptor(system.openBeneath(root, target.c_str(), flags));
  if (opened) return 0;
  // EPERM: a sandbox that does not know the call.
  if (errno == ENOSYS || errno == EPERM) return walkBelow(system, root, target, flags, opened);
  return errno;
}

int listFolder(int folder, std::vector<std::string>& names) {
  // Opened anew, so that every listing starts at the beginning.
  Descriptor again(::openat(folder, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!again) return errno;
  const std::unique_ptr<DIR, int (*)(DIR*)> entries(::fdopendir(again.number()), ::closedir);
  if (!entries) return errno;
  again.release();
  for (;;) {
    errno = 0;
    const dirent* entry = ::readdir(entries.get());
    if (!entry) return errno;
    const std::string_view name = entry->d_name;
    if (name != "." && name != "..") names.emplace_back(name);
  }
}

int removeTree(SystemCalls& system, int folder, const std::string& name, bool& changed) {
  changed = false;
  if (system.unlinkAt(folder, name.c_str(), 0) == 0) {
    changed = true;
    return 0;
  }
  if (errno != EISDIR && errno != EPERM) return errno;
  const int refusal = errno;
  const Descriptor item(system.openAt(folder, name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW, 0));
  if (!item) return errno == ENOTDIR ? refusal : errno;
  struct stat status {};
  struct stat outside {};
  if (::fstat(item.number(), &status) != 0 || ::fstat(folder, &outside) != 0) return errno;
  if (status.st_dev != outside.st_dev) return EXDEV;
  if ((status.st_mode & S_IRWXU) != S_IRWXU) system.changeMode(item.number(), S_IRWXU);

  // On a full disk the renaming may fail; the deletion then happens in the open. What is hidden already stays so.
  const std::string hidden = hiddenNameBeside(name);
  const bool isHidden = hiddenNameFrom(name).kind != HiddenKind::Half &&
                        system.renameAt(folder, name.c_str(), folder, hidden.c_str(), RENAME_NOREPLACE) == 0;
  const std::string& current = isHidden ? hidden : name;
  int error = Emptying(system, item.number(), status.st_dev, changed).run();
  if (error == 0 && system.unlinkAt(folder, current.c_str(), AT_REMOVEDIR) != 0) error = errno;
  if (error == 0) changed = true;
  if (error != 0 && isHidden && !changed)
    system.renameAt(folder, hidden.c_str(), folder, name.c_str(), RENAME_NOREPLACE);
  return error;
}

int renameIfFree(SystemCalls& system, int fromFolder, const std::string& from, int toFolder, const std::string& to) {
  if (system.renameAt(fromFolder, from.c_str(), toFolder, to.c_str(), RENAME_NOREPLACE) == 0) return 0;
  if (errno != EINVAL && errno != ENOSYS) return errno;
  // A file system without the flag; the same error for a folder moved into itself comes back from the plain call.
  struct stat status {};
  if (::fstatat(toFolder, to.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0) return EEXIST;
  if (errno != ENOENT) return errno;
  return system.renameAt(fromFolder, from.c_str(), toFolder, to.c_str(), 0) == 0 ? 0 : errno;
}

void holdFolderOf(int folder) {
  while (::flock(folder, LOCK_SH) != 0 && errno == EINTR) {
  }
}

int syncFolder(SystemCalls& system, int folder) {
  if (system.sync(folder) == 0 || errno == EINVAL || errno == EOPNOTSUPP) return 0;
  return errno;
}

}  // namespace quilt::platform
