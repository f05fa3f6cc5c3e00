// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/XmlPropertyLists.h"

#include <new>

#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/plist/BinaryReader.h"
#include "quilt/platform/plist/Limits.h"
#include "quilt/platform/plist/XmlReader.h"
#include "quilt/platform/plist/XmlWriter.h"

namespace quilt::platform {

namespace {

Error notEnoughMemory(const std::filesystem::path& file) {
  return {ErrorKind::InputOutput, "There is not enough memory", file};
}

Result<PropertyList> parseBuffer(std::string& buffer) {
  return std::string_view(buffer).starts_with(kBinaryMagic) ? readBinary(buffer) : readXml(buffer);
}

}  // namespace

Result<PropertyList> XmlPropertyLists::parse(std::string_view bytes) const try {
  if (bytes.size() > kLongestPropertyList) return Error{ErrorKind::Damaged, "The property list is too long", {}};
  std::string buffer(bytes);
  return parseBuffer(buffer);
} catch (const std::bad_alloc&) {
  return notEnoughMemory({});
}

std::string XmlPropertyLists::serialize(const PropertyList& value) const { return writeXml(value); }

Result<Dictionary> XmlPropertyLists::readDictionary(const std::filesystem::path& path) const try {
  auto buffer = services().files->readFile(path, kLongestPropertyList);
  if (!buffer) return buffer.error();
  auto value = parseBuffer(*buffer);
  if (!value) return Error{value.error().kind, value.error().text, path};
  auto* dictionary = value->as<Dictionary>();
  if (!dictionary) return Error{ErrorKind::Damaged, "The property list is no dictionary", path};
  return std::move(*dictionary);
} catch (const std::bad_alloc&) {
  return notEnoughMemory(path);
}

Result<void> XmlPropertyLists::writeDictionary(const Dictionary& dictionary, const std::filesystem::path& path) try {
  // The entries are written from where they are; only the list around them is made here.
  return services().files->writeAtomically(path, writeXml(dictionary));
} catch (const std::bad_alloc&) {
  return notEnoughMemory(path);
}

Result<FileIdentity> XmlPropertyLists::replaceDictionary(const Dictionary& dictionary,
                                                         const std::filesystem::path& path,
                                                         const FileIdentity& replaced) try {
  return services().files->replaceAtomically(path, writeXml(dictionary), replaced);
} catch (const std::bad_alloc&) {
  return notEnoughMemory(path);
}

}  // namespace quilt::platform
