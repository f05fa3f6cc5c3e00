// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "cli/Catalogue.h"
#include "quilt/documents/QuiltDocument.h"

namespace quilt::cli {

/// A file or web address that is to become a source, looked at: the library takes it.
struct NewSource {
  platform::Url url;
  std::string title;              ///< the one in its metadata, else its name; the address of a web page
  std::string category;           ///< "Movie", "Audio", "Image", "Document" or "Web"
  std::uint64_t size = 0;         ///< bytes; 0 for a web page
  double timecode = kNoTimecode;  ///< seconds from the item's start; kNoTimecode: none
  Text description = std::nullopt;
};

/// An item that is to be added to a document.
struct NewItem {
  std::string title;
  Text description = std::nullopt;
  Text category = std::nullopt;  ///< "Montage" or "DualSource"; none: that of its one source
  std::vector<NewSource> sources = {};
  std::vector<NewSource> extras = {};
  std::optional<NewSource> commentary = std::nullopt;
};

/// Whether the text is the address of something on the web, and no file's name.
bool isWebAddress(const std::string& text);

/// Looks at a file or web address as typed; a relative path is taken from `base`, or from the working folder when that
/// is empty. Throws a Failure when it is missing or nothing that can be shown.
NewSource lookAt(const std::string& typed, const Path& base = {});

/// Whether sources of these categories make an item of the category. Throws a Failure (Invalid) when they do not: a
/// montage is made of images, a dual-source item of two sources that play.
void checkSources(const NewItem& item);

/// Throws a Failure (Invalid) when the source is no sound.
void checkCommentary(const NewSource& commentary);

/// How much work an item is, for shares of progress: its bytes, and a little more for each file.
double weightOf(const NewSource& source);
double weightOf(const NewItem& item);

/// Whether an addition saves the document, or leaves that to its caller, who adds many.
enum class SaveTime { Now, Later };

/// Adds the item to the end of the document, with its files copied into the package, and saves. Null when it could not
/// be done or the block answered false: the document is then as it was. On a worker; the block gets 0 to 100.
std::shared_ptr<QuiltMedia> addItem(QuiltDocument& document, const NewItem& item, const ProgressionBlock& block,
                                    SaveTime time = SaveTime::Now);

/// Adds an extra to an item, its file copied into the package, and saves. As addItem.
std::shared_ptr<QuiltMediaExtra> addExtra(QuiltDocument& document, QuiltMedia& item, const NewSource& extra,
                                          const ProgressionBlock& block);

/// Makes the source the item's audio commentary, copied into the package, and saves; the files of the one before are
/// deleted. As addItem.
std::shared_ptr<QuiltMediaSource> setCommentary(QuiltDocument& document, QuiltMedia& item, const NewSource& commentary,
                                                const ProgressionBlock& block);

}  // namespace quilt::cli
