// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "quilt/platform/base/Result.h"

namespace quilt {

class QuiltDocument;

/// The script that the theme's page reads ("controllers/data.js"): the document's record without the theme's path, and
/// what the page has to know besides. With a poster, it tells where that lies. Any thread.
std::string dataScript(QuiltDocument& document, bool hasPoster);

/// Writes a script to its place in the package.
platform::Result<void> writeDataScript(QuiltDocument& document, const std::string& script);

/// Has the files that finalizing derives from the document's texts, the script and the store metadata, say what the
/// document says now. Makes neither for a document that was never finalized.
platform::Result<void> refreshFinalizedTexts(QuiltDocument& document);

}  // namespace quilt
