// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <QMimeData>
#include <memory>
#include <string>
#include <vector>

#include "quilt/platform/base/Pasteboard.h"
#include "quilt/sources/ModelTypes.h"

namespace browser {

/// What a drag of documents or items carries: their UUIDs, a line each, under the library's drag type. The receiver
/// looks the objects up; nothing is made of a drag.
std::unique_ptr<QMimeData> dragDataOf(const std::vector<std::shared_ptr<quilt::platform::PasteboardItem>>& items);

/// The UUIDs under the type; empty when there are none.
std::vector<std::string> uuidsIn(const QMimeData& data, const char* type);

/// The files that a file manager has dragged here.
std::vector<quilt::Path> filesIn(const QMimeData& data);

}  // namespace browser
