// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "quilt/platform/base/IndexSet.h"
#include "quilt/platform/base/ProgressionBlock.h"
#include "quilt/platform/base/PropertyList.h"
#include "quilt/platform/base/Url.h"
#include "quilt/platform/interfaces/ImageWrapper.h"

/// The platform's words, as the model uses them.
namespace quilt {

using platform::Array;
using platform::ContinueBlock;
using platform::Date;
using platform::Dictionary;
using platform::ImageWrapper;
using platform::IndexSet;
using platform::ObjectProgressionBlock;
using platform::ProgressionBlock;
using platform::Url;

using Path = std::filesystem::path;       ///< empty: none
using Text = std::optional<std::string>;  ///< UTF-8

/// The timecode of a source or preview that has none; it is not written to a source's record.
inline constexpr double kNoTimecode = std::numeric_limits<float>::max();

/// The index of a preview that has none.
inline constexpr std::size_t kNoIndex = std::numeric_limits<std::size_t>::max();

}  // namespace quilt
