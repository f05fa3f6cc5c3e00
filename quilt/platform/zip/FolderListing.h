// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

#include "quilt/platform/base/Result.h"

namespace quilt::platform::zip {

/// One file or folder to be packed.
struct Entry {
  std::string name;            ///< in the archive: "Folder/file.txt"; a folder's ends with "/"
  std::filesystem::path file;  ///< on disk
  bool isFolder = false;
  std::uint64_t size = 0;  ///< bytes; 0 for a folder
};

/// The file, or the folder with everything in it, called `underName`, sorted by name. Unsafe, with the name in the
/// sentence, when there is a symbolic link, a device, a pipe or a socket.
Result<std::vector<Entry>> listFolder(const std::filesystem::path& file, std::string_view underName);

}  // namespace quilt::platform::zip
