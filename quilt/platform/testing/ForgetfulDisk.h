// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <map>
#include <mutex>
#include <string>

#include "quilt/platform/files/Descriptor.h"
#include "quilt/platform/files/SystemCalls.h"

namespace quilt::platform {

/// A disk that remembers what was synced, so that a test can take its power away.
///
///     auto disk = std::make_shared<ForgetfulDisk>(folder);
///     PosixFileManager(disk).writeAtomically(folder / "file", "new");
///     disk->losePower(ForgetfulDisk::Loss::Both);
///     // what is in the folder now is what the disk guarantees
///
/// A file's bytes are safe once the file was synced; a name in a folder, its making, renaming and deletion, once the
/// folder was. Watches the calls made through it on items below `root`; all that is there at first is safe.
class ForgetfulDisk : public SystemCalls {
 public:
  enum class Loss {
    Names,  ///< folders hold the names of their last sync, files all their bytes
    Bytes,  ///< files hold the bytes of their last sync, folders all their names
    Both,
  };

  explicit ForgetfulDisk(std::filesystem::path root);

  int sync(int file) override;

  /// Rewrites the folder to what may be left after a power cut, which then counts as safe.
  void losePower(Loss loss);

 private:
  struct Identity {
    dev_t device;
    ino_t inode;
    auto operator<=>(const Identity&) const = default;  // NOLINT(modernize-use-nullptr): its own expansion
  };
  struct Item {
    Descriptor pin;  // keeps the inode, and its number, from being given to another file
    bool isFolder = false;
    bool isLink = false;
    std::string bytes;                        // a file's synced bytes, a link's target
    std::map<std::string, Identity> entries;  // a folder's synced names
  };

  Identity remember(int folder, const char* name);
  void rememberTree(const std::filesystem::path& path);
  void store(Identity identity, int file);
  [[nodiscard]] std::string bytesOf(Identity identity, Loss loss) const;
  [[nodiscard]] std::map<std::string, Identity> entriesOf(Identity identity, Loss loss);
  void writeTree(Identity identity, Loss loss, const std::filesystem::path& to);

  const std::filesystem::path _root;
  std::mutex _mutex;
  std::map<Identity, Item> _items;
};

}  // namespace quilt::platform
