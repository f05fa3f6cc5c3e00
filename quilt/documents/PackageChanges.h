// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <vector>

#include "quilt/platform/interfaces/FileManager.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt {

/// The places that a properties record names, relative to the package: "media/UUID/sources/UUID/derivatives/FILE" and
/// the folders on the way. Of the previews, those that are written; posters are named by no record.
std::set<std::string> placesNamedBy(const Dictionary& record);

/// The changes below a package's "media" folder that no saved record tells of yet. Files come before the record that
/// names them and go after the record that no longer does: what is made is marked as unfinished, what is removed is set
/// aside, until the next save. What a killed process left so is brought back or cleared away before the first change.
/// Any thread.
class PackageChanges {
 public:
  /// For a package that did not exist before: nothing can have been left in it.
  void beginNew();
  /// Clears away what killed processes left in the package, the first time; as its saved record decides.
  void begin(const Path& package);
  /// To be called before a file or folder of the package is made. Makes the folders above it where a mark needs them.
  void willMake(const Path& package, const Path& item);
  /// Takes a file or folder out of the package. `warning` is logged with its path and the error's text when it cannot
  /// be taken out, or, after the next save, not be deleted.
  void remove(const Path& package, const Path& item, const char* warning);
  /// To be called when the record has been saved: what it names is finished, what it no longer names is deleted.
  void recorded(const Path& package, const Dictionary& record);
  /// To be called when the record could not be saved: what it still names comes back, until a save succeeds.
  void notRecorded(const Path& package);

 private:
  struct Removal {
    Path item;
    Path aside;  // where it is: the item's own place again after a save that failed
    const char* warning;
  };
  void sweepOnce(const Path& package);
  void hold(const Path& package);

  std::mutex _mutex;
  bool _hasBegun = false;
  std::map<Path, Path> _made;  // to its mark; without one: hidden itself
  std::vector<Removal> _removed;
  std::unique_ptr<platform::FolderHold> _hold;  // while there are any
};

}  // namespace quilt
