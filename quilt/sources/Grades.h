// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/sources/QuiltMediaDerivative.h"

/// The grades by their short names, best first, for those who write of nothing else.
namespace quilt {

inline constexpr const char* kDesktop = kQuiltMediaDerivativeCompatibilityTagDesktop;
inline constexpr const char* k720p = kQuiltMediaDerivativeCompatibilityTag720p;
inline constexpr const char* k480p = kQuiltMediaDerivativeCompatibilityTag480p;

}  // namespace quilt
