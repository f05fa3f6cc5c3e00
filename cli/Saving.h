// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>

#include "cli/Failure.h"
#include "cli/LogCollector.h"
#include "quilt/collections/QuiltCollection.h"

namespace quilt::cli {

/// Makes several changes to a document or collection and saves once. False when it could not be saved.
bool changeAndSave(QuiltDocument& document, const std::function<void()>& change);
bool changeAndSave(QuiltCollection& collection, const std::function<void()>& change);

/// Words what an operation of the library that answered false came to: `what` could not be done, the cause from the
/// log, and a full disk at `target`, which the log may not tell.
Failure explain(const std::string& what, const LogCollector& log, const Path& file, const Path& target);

}  // namespace quilt::cli
