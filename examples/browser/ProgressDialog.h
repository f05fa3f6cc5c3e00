// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <QString>
#include <functional>

#include "quilt/platform/base/ProgressionBlock.h"

class QWidget;

namespace browser {

/// Runs a long operation of the library on a thread of its own, behind a dialog with its percentage and a Cancel
/// button, and returns when it has ended. The dialog shows after a moment only, and Cancel makes the block answer false
/// from then on. Answers whether the user let it run to its end.
///
/// The window's own loop turns meanwhile (a nested one), so the job's changes show at once. Not to be called from a
/// drop: the program that drags would have to wait. Post the call to the loop.
bool runWithProgress(QWidget* window, const QString& label,
                     const std::function<void(const quilt::platform::ProgressionBlock& block)>& job);

}  // namespace browser
