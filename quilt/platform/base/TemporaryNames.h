// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "quilt/platform/base/Export.h"

// The one family of names under which this library keeps what is not finished. Whoever finds one of them, and no living
// process that works in the folder, may clear it away: docs/record-format.md, "The order of writing".

namespace quilt::platform {

/// What a name says of its item.
enum class HiddenKind {
  None,        ///< nothing: it is not of this family
  Half,        ///< made, or deleted, half-way: nobody misses it
  Aside,       ///< taken out of its place; whether it goes or comes back, the record decides
  Unfinished,  ///< a mark: the item of the other name beside it is not finished
};

/// A name of the family, and the name in its folder that it goes with; empty where the name does not tell.
struct HiddenName {
  HiddenKind kind = HiddenKind::None;  ///< of which kind
  std::string_view of;                 ///< a part of the text that was looked at
};

/// @{
/// The name under which an item is made before it takes the place `name` beside it: ".NAME.LETTERS.tmp"; to which the
/// item `name` is set aside: ".NAME.LETTERS.old"; of the mark that it is not finished: ".NAME.LETTERS.new". At most 255
/// bytes long, with eight letters that differ at each call.
QUILT_EXPORT std::string hiddenNameBeside(std::string_view name);
QUILT_EXPORT std::string asideNameBeside(std::string_view name);
QUILT_EXPORT std::string unfinishedNameBeside(std::string_view name);
/// @}

/// What the name is. Half are also ".UUID.EXTENSION", under which conversions and exports are made, and ".NAME.UUID"
/// with or without six more letters, of archives.
QUILT_EXPORT HiddenName hiddenNameFrom(std::string_view name);

/// Whether the name is of the family.
QUILT_EXPORT bool isHiddenTemporaryName(std::string_view name);

/// The names of a folder's listing that are there to be seen: not those that begin with "." and not those of which a
/// mark says that they are not finished.
QUILT_EXPORT std::vector<std::string> finishedNames(const std::vector<std::string>& listing);

}  // namespace quilt::platform
