// SPDX-License-Identifier: Apache-2.0
#include "cli/ForeignEntries.h"

#include "cli/Failure.h"
#include "cli/Text.h"
#include "quilt/documents/QuiltDocument.h"

namespace quilt::cli {

void checkForeignEntries(const DocumentEntry& document, const std::string& cannot) {
  if (document.type != kQuiltDocumentTypeInteractive) return;
  std::string names;
  for (const std::string& name : QuiltDocument::entriesNoThemeBrought(document.path))
    names += (names.empty() ? "" : ", ") + inQuotes(name);
  if (names.empty()) return;
  throw Failure(ExitCode::Usage,
                cannot + ": It would delete " + names + " from the package, which no theme brought; move " +
                    "what you need elsewhere, or say --force",
                document.path);
}

}  // namespace quilt::cli
