// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/QuiltMediaDerivative.h"

#include "quilt/platform/base/FDYLogger.h"
#include "quilt/scripting/AccessorTable.h"

namespace quilt::scripting::table {

using platform::FDYLogger;

namespace {

Text joined(const std::optional<std::vector<std::string>>& tags) {
  if (!tags) return std::nullopt;
  std::string text;
  for (const std::string& tag : *tags) text.append(text.empty() ? "" : ",").append(tag);
  return text;
}

}  // namespace

std::span<const Accessor> ofDerivative() {
  using Self = QuiltMediaDerivative;
  static const Accessor accessors[] = {
      getter<Self>("cvUUID", "Its identity.",
                   [](const Self& derivative) {
                     FDYLogger::logDebug("Conveyor is getting source derivative \"%@\" uuid", derivative.uuid());
                     return derivative.uuid();
                   }),
      getter<Self>("cvContentType", "Its type identifier.",
                   [](const Self& derivative) {
                     FDYLogger::logDebug("Conveyor is getting source derivative \"%@\" type \"%@\"", derivative.uuid(),
                                         derivative.contentType());
                     return derivative.contentType();
                   }),
      getter<Self>("cvCompatibilityTags", "The grades that it serves: \"Desktop\", \"720p\", \"480p\".",
                   [](const Self& derivative) {
                     FDYLogger::logDebug("Conveyor is getting source derivative \"%@\" compatibility tags \"%@\"",
                                         derivative.uuid(), joined(derivative.compatibilityTags()));
                     return derivative.compatibilityTags();
                   }),
      getter<Self>("cvPath", "Where the file lies; the path part of the address of a web page.",
                   [](const Self& derivative) {
                     const auto url = derivative.url();
                     const Text path = url ? Text(url->relativePath().native()) : std::nullopt;
                     FDYLogger::logDebug("Conveyor is getting source derivative \"%@\" path \"%@\"", derivative.uuid(),
                                         path);
                     return path;
                   }),
      getter<Self>("cvURL", "The address of the file or web page.",
                   [](const Self& derivative) {
                     const auto url = derivative.url();
                     const Text address = url ? Text(url->absoluteString()) : std::nullopt;
                     FDYLogger::logDebug("Conveyor is getting source derivative \"%@\" url \"%@\"", derivative.uuid(),
                                         address);
                     return address;
                   }),
  };
  return accessors;
}

}  // namespace quilt::scripting::table
