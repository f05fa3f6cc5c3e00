// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/testing/ForgetfulDisk.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <fstream>
#include <iterator>
#include <stdexcept>
#include <system_error>
#include <utility>
#include <vector>

#include "quilt/platform/files/Folders.h"

namespace quilt::platform {

namespace fs = std::filesystem;

namespace {

fs::path pathOf(const Descriptor& pin) { return "/proc/self/fd/" + std::to_string(pin.number()); }

std::string contentOf(const fs::path& path) {
  std::ifstream stream(path, std::ios::binary);
  if (!stream) throw std::runtime_error("cannot read back " + path.string());
  return {std::istreambuf_iterator<char>(stream), {}};
}

[[noreturn]] void fail(const char* what) { throw std::system_error(errno, std::generic_category(), what); }

}  // namespace

ForgetfulDisk::ForgetfulDisk(fs::path root) : _root(std::move(root)) { rememberTree(_root); }

// Notes an item of which nothing but its existence is safe.
ForgetfulDisk::Identity ForgetfulDisk::remember(int folder, const char* name) {
  Descriptor pin(::openat(folder, name, O_PATH | O_NOFOLLOW | O_CLOEXEC));
  struct stat status {};
  if (!pin || ::fstat(pin.number(), &status) != 0) fail("remember");
  const Identity identity{status.st_dev, status.st_ino};
  const auto [place, isNew] = _items.try_emplace(identity);
  if (isNew) {
    Item& item = place->second;
    item.pin = std::move(pin);
    item.isFolder = S_ISDIR(status.st_mode);
    item.isLink = S_ISLNK(status.st_mode);
    if (item.isLink) {
      std::vector<char> target(static_cast<std::size_t>(status.st_size) + 1);
      const ssize_t length = ::readlinkat(item.pin.number(), "", target.data(), target.size());
      if (length < 0) fail("readlink");
      item.bytes.assign(target.data(), static_cast<std::size_t>(length));
    }
  }
  return identity;
}

void ForgetfulDisk::rememberTree(const fs::path& path) {
  const Identity identity = remember(AT_FDCWD, path.c_str());
  if (_items.at(identity).isLink) return;
  const Descriptor file(::open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_CLOEXEC));
  if (!file) fail("open");
  store(identity, file.number());
  if (!_items.at(identity).isFolder) return;
  for (const auto& entry : fs::directory_iterator(path)) rememberTree(entry.path());
}

// Takes over the item's present state as the safe one.
void ForgetfulDisk::store(Identity identity, int file) {
  if (!_items.at(identity).isFolder) {
    _items.at(identity).bytes = contentOf("/proc/self/fd/" + std::to_string(file));
    return;
  }
  std::vector<std::string> names;
  if (listFolder(file, names) != 0) fail("list");
  std::map<std::string, Identity> entries;
  for (const std::string& name : names) entries.emplace(name, remember(file, name.c_str()));
  _items.at(identity).entries = std::move(entries);
}

int ForgetfulDisk::sync(int file) {
  const int answer = SystemCalls::sync(file);
  if (answer != 0) return answer;
  const std::lock_guard guard(_mutex);
  struct stat status {};
  if (::fstat(file, &status) != 0) fail("fstat");
  const Identity identity{status.st_dev, status.st_ino};
  const std::string path = "/proc/self/fd/" + std::to_string(file);
  if (_items.find(identity) == _items.end()) {
    Item& item = _items[identity];
    item.pin = Descriptor(::open(path.c_str(), O_PATH | O_CLOEXEC));
    if (!item.pin) fail("pin");
    item.isFolder = S_ISDIR(status.st_mode);
  }
  store(identity, file);
  return 0;
}

std::string ForgetfulDisk::bytesOf(Identity identity, Loss loss) const {
  const Item& item = _items.at(identity);
  return loss == Loss::Names && !item.isLink ? contentOf(pathOf(item.pin)) : item.bytes;
}

std::map<std::string, ForgetfulDisk::Identity> ForgetfulDisk::entriesOf(Identity identity, Loss loss) {
  if (loss != Loss::Bytes) return _items.at(identity).entries;
  std::map<std::string, Identity> entries;
  for (const auto& entry : fs::directory_iterator(pathOf(_items.at(identity).pin)))
    entries.emplace(entry.path().filename(), remember(AT_FDCWD, entry.path().c_str()));
  return entries;
}

void ForgetfulDisk::writeTree(Identity identity, Loss loss, const fs::path& to) {
  const bool isFolder = _items.at(identity).isFolder;
  if (isFolder) {
    fs::create_directories(to);
    for (const auto& [name, child] : entriesOf(identity, loss)) writeTree(child, loss, to / name);
  } else if (_items.at(identity).isLink) {
    fs::create_symlink(bytesOf(identity, loss), to);
  } else {
    std::ofstream(to, std::ios::binary) << bytesOf(identity, loss);
  }
}

void ForgetfulDisk::losePower(Loss loss) {
  const std::lock_guard guard(_mutex);
  const fs::path left = _root.native() + ".left";
  writeTree(remember(AT_FDCWD, _root.c_str()), loss, left);
  _items.clear();
  fs::remove_all(_root);
  fs::rename(left, _root);
  rememberTree(_root);
}

}  // namespace quilt::platform
