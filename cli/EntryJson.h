// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "cli/Catalogue.h"
#include "cli/Failure.h"
#include "quilt/media/QuiltMedia.h"

namespace quilt::cli {

/// {"uuid", "title", "type", "path"}, and "damage" with the reason when it does not open; a collection also has its
/// "documents".
Json toJson(const DocumentEntry& document);
Json toJson(const CollectionEntry& collection);

/// {"uuid", "title", "category", "path"}.
Json toJson(const QuiltMedia& item);
Json toJson(const QuiltMediaSource& source);

}  // namespace quilt::cli
