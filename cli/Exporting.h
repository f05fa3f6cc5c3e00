// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <vector>

#include "cli/ActingDelegate.h"
#include "quilt/documents/QuiltDocument.h"

namespace quilt::cli {

/// Where a finished package goes, and as what.
struct ExportTarget {
  Path folder;
  bool zip = false;
  std::vector<std::string> formats;  ///< never empty
};

/// Throws a Failure when a package cannot go there: the folder is a file, or lies in the library (none when empty),
/// where the package would become part of the library or of another package.
void checkDestination(const Path& folder, const Path& library);

/// The destination folder with the parents that had to be made; removes what it made and is empty when it is let go.
class Destination {
 public:
  /// Throws a Failure when the folder cannot be made.
  explicit Destination(const Path& folder);
  Destination(const Destination&) = delete;
  Destination& operator=(const Destination&) = delete;
  ~Destination();

 private:
  std::vector<Path> _made;  // innermost first
};

/// Exports, with the progress in the last part of the bar, from `startPercent` on. The path of the package, which is
/// complete. Throws a Failure, and leaves no package, when it cannot be made or lacks an item, or when the user asks to
/// stop. `name` is what messages call the document.
Path exportPackage(QuiltDocument& document, const std::string& name, const ExportTarget& target, const Context& context,
                   double startPercent = 0);

}  // namespace quilt::cli
