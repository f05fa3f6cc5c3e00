// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/Accessor.h"

#include <algorithm>

#include "quilt/collections/QuiltCollection.h"
#include "quilt/documents/QuiltDocument.h"
#include "quilt/media/QuiltMedia.h"
#include "quilt/scripting/AccessorTable.h"
#include "quilt/sources/QuiltMediaPreview.h"

namespace quilt::scripting {

namespace {

template <class T>
bool isA(const platform::Object& object) {
  return dynamic_cast<const T*>(&object) != nullptr;
}

bool fits(Argument argument, std::span<const Value> given) {
  switch (argument) {
    case Argument::None:
      return given.empty();
    case Argument::Text:
      return given.size() == 1 &&
             (std::holds_alternative<std::string>(given[0]) || std::holds_alternative<std::monostate>(given[0]));
    case Argument::Index:
      return given.size() == 1 && std::holds_alternative<std::int64_t>(given[0]);
  }
  return false;
}

std::string_view wanted(Argument argument) {
  switch (argument) {
    case Argument::None:
      return "no argument";
    case Argument::Text:
      return "one text, or none";
    case Argument::Index:
      return "one whole number";
  }
  return {};
}

}  // namespace

std::span<const ExposedClass> exposedClasses() {
  static const ExposedClass classes[] = {
      {"QuiltCollection", table::ofCollection(), isA<QuiltCollection>},
      {"QuiltDocument", table::ofDocument(), isA<QuiltDocument>},
      {"QuiltMedia", table::ofMedia(), isA<QuiltMedia>},
      {"QuiltMediaSource", table::ofSource(), isA<QuiltMediaSource>},
      {"QuiltMediaDerivative", table::ofDerivative(), isA<QuiltMediaDerivative>},
      {"QuiltMediaPreview", table::ofPreview(), isA<QuiltMediaPreview>},
  };
  return classes;
}

const ExposedClass* exposedClassOf(const platform::Object& object) {
  for (const ExposedClass& type : exposedClasses())
    if (type.isInstance(object)) return &type;
  return nullptr;
}

const Accessor* accessorOf(const platform::Object& object, std::string_view name) {
  const ExposedClass* type = exposedClassOf(object);
  if (!type) return nullptr;
  const auto found = std::find_if(type->accessors.begin(), type->accessors.end(),
                                  [name](const Accessor& accessor) { return accessor.name == name; });
  return found == type->accessors.end() ? nullptr : &*found;
}

bool isExcludedFromScripts(const platform::Object& object, std::string_view name) {
  return accessorOf(object, name) == nullptr;
}

platform::Result<Value> perform(platform::Object& receiver, std::string_view name, std::span<const Value> arguments) {
  const Accessor* accessor = accessorOf(receiver, name);
  if (!accessor)
    return platform::Error{platform::ErrorKind::Unsupported, "\"" + std::string(name) + "\" is no accessor here", {}};
  if (!fits(accessor->argument, arguments))
    return platform::Error{
        platform::ErrorKind::Damaged, std::string(name) + " takes " + std::string(wanted(accessor->argument)), {}};
  return accessor->perform(receiver, arguments.empty() ? Value() : arguments[0]);
}

bool answersStandIn(const platform::Object& receiver, std::string_view name) {
  const Accessor* accessor = accessorOf(receiver, name);
  return accessor && accessor->standsIn && accessor->standsIn(receiver);
}

}  // namespace quilt::scripting
