// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Object.h"
#include "quilt/platform/base/Result.h"

namespace quilt::scripting {

/// What a script gives and gets: none, a text, a number (a count or index as an integer), a list of texts, or an object
/// of an exposed class, never null.
using Value = std::variant<std::monostate, std::string, std::int64_t, double, std::vector<std::string>,
                           std::shared_ptr<platform::Object>>;

/// What a method takes: nothing, a text or none, or an index.
enum class Argument { None, Text, Index };
/// What a method answers; all but a number may be none.
enum class Answer { Nothing, Text, Number, Texts, Object };

/// One method that a script may call. It writes one debug line and goes through the object's own operation.
struct Accessor {
  std::string_view name;     ///< as scripts say it, with a colon when it takes an argument: "cvSetTitle:"
  Argument argument;         ///< what it takes
  Answer answer;             ///< what it answers
  std::string_view summary;  ///< one sentence for people who write scripts
  Value (*perform)(platform::Object& receiver,
                   const Value& argument);  ///< the receiver is of the class; the argument fits
  /// Whether the answer now stands where nothing is stored; null for an accessor that answers what is stored.
  bool (*standsIn)(const platform::Object& receiver) = nullptr;
};

/// One class that scripts may reach.
struct ExposedClass {
  std::string_view name;                               ///< "QuiltDocument"
  std::span<const Accessor> accessors;                 ///< every method, in the order of the documentation
  bool (*isInstance)(const platform::Object& object);  ///< also true for derived classes
};

/// The six classes.
QUILT_EXPORT std::span<const ExposedClass> exposedClasses();

/// The class whose accessors the object has: an extra's is the source's. Null for an object that scripts cannot reach.
QUILT_EXPORT const ExposedClass* exposedClassOf(const platform::Object& object);

/// The accessor of that name that scripts may call on the object; null when there is none. Any thread.
QUILT_EXPORT const Accessor* accessorOf(const platform::Object& object, std::string_view name);

/// What the object answers to a script host that asks whether a method is kept from scripts: every name is, but those
/// of the object's accessors.
QUILT_EXPORT bool isExcludedFromScripts(const platform::Object& object, std::string_view name);

/// Calls an accessor. Unsupported for a name that is excluded, Damaged for arguments of the wrong count or kind; then
/// nothing is done and nothing is logged. A setter takes a text or none, an index accessor an integer. What changes the
/// model saves it as the setter does. Any thread that may call the receiver's class.
QUILT_EXPORT platform::Result<Value> perform(platform::Object& receiver, std::string_view name,
                                             std::span<const Value> arguments);

/// Whether the accessor of that name answers something at present although the object stores nothing there, as a
/// document without a title or description does. False for a name that is excluded. Any thread that may call the
/// receiver's class.
QUILT_EXPORT bool answersStandIn(const platform::Object& receiver, std::string_view name);

}  // namespace quilt::scripting
