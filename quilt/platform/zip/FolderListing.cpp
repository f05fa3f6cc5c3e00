// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/zip/FolderListing.h"

#include <algorithm>
#include <optional>
#include <system_error>

namespace quilt::platform::zip {

namespace {

namespace fs = std::filesystem;

// Adds the item; answers what is wrong with it.
std::optional<Error> add(const fs::path& file, const std::string& name, std::vector<Entry>& entries) {
  std::error_code error;
  const fs::file_status status = fs::symlink_status(file, error);
  if (!fs::exists(status)) return Error{ErrorKind::NotFound, "There is nothing to pack.", file};
  if (fs::is_directory(status)) {
    entries.push_back({name + "/", file, true, 0});
    return std::nullopt;
  }
  if (!fs::is_regular_file(status)) {
    return Error{ErrorKind::Unsafe, "\"" + name + "\" is a link or a device, which is not packed.", file};
  }
  const std::uint64_t size = fs::file_size(file, error);
  if (error) return Error{ErrorKind::InputOutput, "A file of the folder cannot be read.", file};
  entries.push_back({name, file, false, size});
  return std::nullopt;
}

}  // namespace

Result<std::vector<Entry>> listFolder(const fs::path& file, std::string_view underName) {
  const fs::path top = file.has_filename() ? file : file.parent_path();
  std::vector<Entry> entries;
  if (std::optional<Error> wrong = add(top, std::string(underName), entries)) return *wrong;
  // Folders are listed as they are met, not by recursion, so that a deep tree costs no stack.
  for (std::size_t next = 0; next < entries.size(); ++next) {
    if (!entries[next].isFolder) continue;
    const Entry folder = entries[next];
    std::error_code error;
    fs::directory_iterator item(folder.file, error);
    for (; !error && item != fs::directory_iterator(); item.increment(error)) {
      if (std::optional<Error> wrong = add(item->path(), folder.name + item->path().filename().string(), entries)) {
        return *wrong;
      }
    }
    if (error) return Error{ErrorKind::InputOutput, "A folder cannot be read.", folder.file};
  }
  std::sort(entries.begin(), entries.end(), [](const Entry& a, const Entry& b) { return a.name < b.name; });
  return entries;
}

}  // namespace quilt::platform::zip
