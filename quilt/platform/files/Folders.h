// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include "quilt/platform/files/Descriptor.h"
#include "quilt/platform/files/SystemCalls.h"

// Steps on folders that several operations share. Each answers 0 or an error number.

namespace quilt::platform {

/// How far below its top an operation follows a tree; each level keeps a descriptor or two open.
inline constexpr int kDeepestFolder = 256;

/// An item named by its opened folder and its name in it.
struct Place {
  Descriptor folder;
  std::string name;
};

/// Opens the folder of `path` for reading, links followed. Fails with ENOENT for a path that names no item.
int openPlace(SystemCalls& system, const std::filesystem::path& path, Place& place);

/// The part of `path` below `root`: plain components parted by single slashes. None when the path does not lie below,
/// climbs with "..", or holds a NUL. By the text alone.
std::optional<std::string> partBelow(const std::filesystem::path& path, const std::filesystem::path& root);

/// Opens `part`, as partBelow gives it, passing no symbolic link; a link at the end fails with ELOOP too.
/// An empty part opens the root again.
int openBelow(SystemCalls& system, int root, const std::string& part, int flags, Descriptor& opened);

/// The names in an opened folder, without "." and "..", in the file system's order.
int listFolder(int folder, std::vector<std::string>& names);

/// Deletes an item with its content; links themselves, never what they point to. A folder first disappears whole,
/// under a hidden name. When it cannot be deleted it comes back under its own, unless a part of it is gone: then the
/// rest stays hidden for a later sweep. Never enters another file system (EXDEV). `changed` tells whether anything was
/// deleted.
int removeTree(SystemCalls& system, int folder, const std::string& name, bool& changed);

/// Renames unless something is at `to`.
int renameIfFree(SystemCalls& system, int fromFolder, const std::string& from, int toFolder, const std::string& to);

/// Keeps sweeps away from the opened folder until the descriptor is closed; waits for one that is under way.
void holdFolderOf(int folder);

/// A sync of a folder; file systems that cannot sync one need none.
int syncFolder(SystemCalls& system, int folder);

}  // namespace quilt::platform
