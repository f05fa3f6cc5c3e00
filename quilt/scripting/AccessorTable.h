// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <concepts>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <variant>
#include <vector>

#include "quilt/scripting/Accessor.h"

namespace quilt::scripting {

/// What the tables of the classes are written with.
namespace table {

/// A number that is an integer or a real one, as the case may be.
using Number = std::variant<std::int64_t, double>;

inline Value valueOf(std::string text) { return text; }
inline Value valueOf(const Number& number) {
  return std::visit([](const auto& value) { return Value(value); }, number);
}
inline Value valueOf(const std::filesystem::path& path) { return path.empty() ? Value() : Value(path.native()); }
inline Value valueOf(std::int32_t number) { return std::int64_t{number}; }
inline Value valueOf(double number) { return number; }
inline Value valueOf(std::vector<std::string> texts) { return texts; }
template <std::derived_from<platform::Object> T>
Value valueOf(const std::shared_ptr<T>& object) {
  return object ? Value(std::static_pointer_cast<platform::Object>(object)) : Value();
}
template <class T>
Value valueOf(std::optional<T> value) {
  return value ? valueOf(*std::move(value)) : Value();
}

template <class T>
constexpr Answer answerOf() {
  if constexpr (std::is_same_v<T, std::string> || std::is_same_v<T, std::optional<std::string>> ||
                std::is_same_v<T, std::filesystem::path>) {
    return Answer::Text;
  } else if constexpr (std::is_arithmetic_v<T> || std::is_same_v<T, Number>) {
    return Answer::Number;
  } else if constexpr (std::is_same_v<T, std::optional<std::vector<std::string>>>) {
    return Answer::Texts;
  } else {
    return Answer::Object;
  }
}

template <class T>
T& as(platform::Object& object) {
  return static_cast<T&>(object);
}

/// `get` takes the receiver and logs before it answers.
template <class T, class Get>
Accessor getter(std::string_view name, std::string_view summary, Get) {
  using Result = std::remove_cvref_t<std::invoke_result_t<Get, T&>>;
  return {name, Argument::None, answerOf<Result>(), summary,
          [](platform::Object& receiver, const Value&) { return valueOf(Get{}(as<T>(receiver))); }};
}

/// A getter that answers a text of its own where the receiver stores none: `stored` takes the receiver and answers the
/// text that it stores.
template <class T, class Get, class Stored>
Accessor getterWithStandIn(std::string_view name, std::string_view summary, Get get, Stored) {
  Accessor accessor = getter<T>(name, summary, get);
  accessor.standsIn = [](const platform::Object& receiver) {
    const std::optional<std::string> text = Stored{}(static_cast<const T&>(receiver));
    return !text || text->empty();
  };
  return accessor;
}

/// `get` takes the receiver and the index as the script gave it.
template <class T, class Get>
Accessor indexGetter(std::string_view name, std::string_view summary, Get) {
  return {name, Argument::Index, Answer::Object, summary, [](platform::Object& receiver, const Value& argument) {
            return valueOf(Get{}(as<T>(receiver), std::get<std::int64_t>(argument)));
          }};
}

/// `act` takes the receiver and the index, and answers nothing.
template <class T, class Act>
Accessor indexAction(std::string_view name, std::string_view summary, Act) {
  return {name, Argument::Index, Answer::Nothing, summary, [](platform::Object& receiver, const Value& argument) {
            Act{}(as<T>(receiver), std::get<std::int64_t>(argument));
            return Value();
          }};
}

/// `set` takes the receiver and the new text or none, and logs before it sets.
template <class T, class Set>
Accessor setter(std::string_view name, std::string_view summary, Set) {
  return {name, Argument::Text, Answer::Nothing, summary, [](platform::Object& receiver, const Value& argument) {
            const auto* text = std::get_if<std::string>(&argument);
            Set{}(as<T>(receiver), text ? std::optional(*text) : std::nullopt);
            return Value();
          }};
}

/// A count as scripts get it.
inline std::int32_t countOf(std::size_t count) { return static_cast<std::int32_t>(count); }
/// An index as the lists take it; a negative one is beyond every list.
inline std::size_t positionOf(std::int64_t index) { return static_cast<std::size_t>(index); }

/// The identity of an object that may be missing.
template <class T>
std::optional<std::string> identityOf(const std::shared_ptr<T>& object) {
  return object ? std::optional(object->uuid()) : std::nullopt;
}

std::span<const Accessor> ofCollection();
std::span<const Accessor> ofDocument();
std::span<const Accessor> ofMedia();
std::span<const Accessor> ofSource();
std::span<const Accessor> ofDerivative();
std::span<const Accessor> ofPreview();

}  // namespace table

}  // namespace quilt::scripting
