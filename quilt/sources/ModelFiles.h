// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <initializer_list>
#include <string>
#include <string_view>

#include "quilt/platform/base/Result.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt {

class QuiltDocument;
class QuiltMedia;

/// The file routines that several classes of the model share. Any thread.

/// The folder of an item as text; empty outside a document. A path keeps each component as a text of its own, so that
/// building one step by step down to a file would be most of the cost of a record.
std::string folderOf(const QuiltMedia& media);

/// @{
/// The names below `folder`, one in the other, as text or as a path; nothing without a folder.
std::string below(std::string folder, std::initializer_list<std::string_view> names);
Path pathBelow(std::string folder, std::initializer_list<std::string_view> names);
/// @}

/// Makes the folder with its parents unless something is there.
platform::Result<void> createDirectoryIfMissing(const Path& path);

/// The same for a folder of the document's package. Unsafe when a symbolic link leads it out of the package.
platform::Result<void> createDirectoryInPackage(const Path& path, const std::shared_ptr<QuiltDocument>& document);

/// The same; a failure logs the debug line `failure` with the path and the error's text, and answers false.
bool makeFolderInPackage(const Path& path, const std::shared_ptr<QuiltDocument>& document, const char* failure);

/// Takes a file or folder out of the document's package, when something is there: QuiltDocument::removeItem(). A
/// failure (also: the item lies outside the package, or there is no document) logs `warning` with the path and the
/// error's text.
void deleteFromPackage(const Path& path, const std::shared_ptr<QuiltDocument>& document, const char* warning);

/// Clears away what killed processes left half made in a folder in which nothing is recorded but what is there: one of
/// packages, of collections, of exports. One level; costs one listing.
void sweepLevel(const Path& folder);

/// A size in megabytes: the bytes in single precision, divided twice by 1024.
platform::Result<double> megaBytesOfFile(const Path& path);

/// While one lives, megaBytesOfFile looks at each file once on this thread. A record states the size of a file three
/// times: with the derivative, in the source's total and in the item's; and each look asks the disk.
class OneLookAtEachFile {
 public:
  OneLookAtEachFile();
  OneLookAtEachFile(const OneLookAtEachFile&) = delete;
  OneLookAtEachFile& operator=(const OneLookAtEachFile&) = delete;
  ~OneLookAtEachFile();
};

/// Whether a picture was not written because of what it is, and not because of where it was to be written: the same
/// attempt would fail again.
bool cannotBeDrawn(const platform::Error& error);

/// A title as the base of a file name: "." becomes "_" and "/" becomes "-". Cut, between characters, to leave room for
/// a counter and an extension in a file name's 255 bytes.
std::string fileNameForTitle(const std::string& title);

/// The localised "Untitled Episode".
std::string untitledEpisode();

/// Copies one file with copyfile_callback, which hands the percentage copied to the block. `size` is the file's size in
/// bytes. The copy routine's result: negative when it failed or the block answered false; nothing is left then.
int copyReportingPercentage(const Path& source, const Path& destination, std::uint64_t size,
                            const ProgressionBlock& block);

}  // namespace quilt
