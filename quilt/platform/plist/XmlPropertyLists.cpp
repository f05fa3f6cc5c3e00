// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/XmlPropertyLists.h"

#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/plist/BinaryReader.h"
#include "quilt/platform/plist/XmlReader.h"
#include "quilt/platform/plist/XmlWriter.h"

namespace quilt::platform {

namespace {

constexpr std::uint64_t kLongestFile = std::uint64_t{256} << 20U;

Result<PropertyList> parseBuffer(std::string& buffer) {
  if (buffer.size() > kLongestFile) return Error{ErrorKind::Damaged, "The property list is too long", {}};
  return std::string_view(buffer).starts_with(kBinaryMagic) ? readBinary(buffer) : readXml(buffer);
}

}  // namespace

Result<PropertyList> XmlPropertyLists::parse(std::string_view bytes) const {
  std::string buffer(bytes);
  return parseBuffer(buffer);
}

std::string XmlPropertyLists::serialize(const PropertyList& value) const { return writeXml(value); }

Result<Dictionary> XmlPropertyLists::readDictionary(const std::filesystem::path& path) const {
  auto buffer = services().files->readFile(path, kLongestFile);
  if (!buffer) return buffer.error();
  auto value = parseBuffer(*buffer);
  if (!value) return Error{value.error().kind, value.error().text, path};
  auto* dictionary = value->as<Dictionary>();
  if (!dictionary) return Error{ErrorKind::Damaged, "The property list is no dictionary", path};
  return std::move(*dictionary);
}

Result<void> XmlPropertyLists::writeDictionary(const Dictionary& dictionary, const std::filesystem::path& path) {
  // The entries are written from where they are; only the list around them is made here.
  return services().files->writeAtomically(path, writeXml(dictionary));
}

}  // namespace quilt::platform
