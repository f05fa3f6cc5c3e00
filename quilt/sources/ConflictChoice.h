// SPDX-License-Identifier: Apache-2.0
#pragma once

namespace quilt {

/// What a save does with a thing that its object and another hand, another program or another object on the same file,
/// have both changed since the object last read or wrote it. What only one of them changed is kept in any case.
enum class ConflictChoice {
  Refuse,      ///< nothing is written, and the save fails
  KeepMine,    ///< the value of the object that saves
  KeepTheirs,  ///< the value in the file, which the object takes over
};

}  // namespace quilt
