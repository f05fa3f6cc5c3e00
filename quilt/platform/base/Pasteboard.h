// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/PropertyList.h"

namespace quilt::platform {

class PasteboardItem;

/// What is being copied or dragged: property lists by type, in memory. A host carries them over to its toolkit's
/// clipboard. One thread at a time.
class QUILT_EXPORT Pasteboard {
 public:
  /// Forgets what was written.
  void clearContents() { _items.clear(); }
  /// Appends what the object writes of itself, one property list for each of its types.
  void writeObject(const PasteboardItem& object);

  /// The types of the first item, best first.
  [[nodiscard]] std::vector<std::string> types() const;
  /// What each item holds for the type, in the order of writing; items without it are left out.
  [[nodiscard]] std::vector<PropertyList> propertyListsForType(const std::string& type) const;

 private:
  using Item = std::vector<std::pair<std::string, PropertyList>>;
  std::vector<Item> _items;
};

/// No options for writing to a pasteboard.
inline constexpr unsigned kPasteboardNoOptions = 0;
/// The reader takes what a pasteboard holds as a text.
inline constexpr unsigned kPasteboardReadingAsString = 1;

/// An object that can be put on a pasteboard.
class QUILT_EXPORT PasteboardItem {
 public:
  virtual ~PasteboardItem() = default;

  /// Best first.
  [[nodiscard]] virtual std::vector<std::string> writableTypesForPasteboard(const Pasteboard& pasteboard) const = 0;
  /// kPasteboardNoOptions, or flags.
  [[nodiscard]] virtual unsigned writingOptionsForType(const std::string& type, const Pasteboard& pasteboard) const = 0;
  /// What the object is under one of its writable types.
  [[nodiscard]] virtual PropertyList pasteboardPropertyListForType(const std::string& type) const = 0;
};

}  // namespace quilt::platform
