// SPDX-License-Identifier: Apache-2.0
#pragma once

/// The whole library but the bridge: the model from the collections down, the accessors for scripts, and the installed
/// platform. Includes nothing but standard headers besides.

#include "quilt/collections/LibraryLock.h"
#include "quilt/collections/QuiltCollectionsController.h"
#include "quilt/platform/base/Worker.h"
#include "quilt/platform/install.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/scripting/Accessor.h"
#include "quilt/themes/QuiltThemesController.h"
#include "quilt/version.h"
