// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/Pasteboard.h"

namespace quilt::platform {

void Pasteboard::writeObject(const PasteboardItem& object) {
  Item item;
  for (const std::string& type : object.writableTypesForPasteboard(*this))
    item.emplace_back(type, object.pasteboardPropertyListForType(type));
  _items.push_back(std::move(item));
}

std::vector<std::string> Pasteboard::types() const {
  std::vector<std::string> types;
  if (!_items.empty())
    for (const auto& [type, value] : _items.front()) types.push_back(type);
  return types;
}

std::vector<PropertyList> Pasteboard::propertyListsForType(const std::string& type) const {
  std::vector<PropertyList> values;
  for (const Item& item : _items)
    for (const auto& [name, value] : item)
      if (name == type) values.push_back(value);
  return values;
}

}  // namespace quilt::platform
