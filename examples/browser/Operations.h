// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <QString>
#include <memory>
#include <string>
#include <vector>

#include "quilt/collections/QuiltCollectionsController.h"

namespace browser {

/// What went wrong with which file, and what the user can do about it.
struct Problem {
  QString what;
  QString advice;
};
using Problems = std::vector<Problem>;

// Quick ones, on the main thread.

/// Puts items of the document, in their order, before the item that is at `gap` now; at the end when there is none.
/// False when the document does not hold them all.
bool moveItems(quilt::QuiltDocument& document, const std::vector<std::string>& uuids, std::size_t gap);

/// Moves documents of the library, with their packages, to a collection. One that cannot be moved stays.
Problems moveDocuments(const quilt::QuiltCollectionsController& library, const std::vector<std::string>& uuids,
                       const std::shared_ptr<quilt::QuiltCollection>& to);

// Long ones, on a worker. Each stops when the block answers false; that is no problem, and nothing half made stays.

/// Makes a document of each movie, sound, PDF and EPUB file, and one interactive document of all other files.
Problems importFiles(const std::shared_ptr<quilt::QuiltCollection>& collection, const std::vector<quilt::Path>& files,
                     const quilt::ProgressionBlock& block);

/// Adds each file as an item.
Problems addFiles(const std::shared_ptr<quilt::QuiltDocument>& document, const std::vector<quilt::Path>& files,
                  const quilt::ProgressionBlock& block);

struct Exported {
  quilt::Path path;  ///< empty when it was cancelled or failed
  Problems problems;
};
/// As a folder, with its media in the format ("Desktop", "720p" or "480p").
Exported exportDocument(const std::shared_ptr<quilt::QuiltDocument>& document, const quilt::Path& folder,
                        const std::string& format, const quilt::ProgressionBlock& block);

}  // namespace browser
