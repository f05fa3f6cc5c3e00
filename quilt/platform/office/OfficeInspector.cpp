// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/office/OfficeInspector.h"

#include <algorithm>
#include <fstream>
#include <string>
#include <string_view>

#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform {

namespace {

constexpr std::string_view kPacked = "PK\x03\x04";
constexpr std::string_view kCompound = "\xD0\xCF\x11\xE0\xA1\xB1\x1A\xE1";

std::string bytesAt(std::ifstream& file, std::uint64_t offset, std::size_t length) {
  std::string bytes(length, '\0');
  file.clear();
  file.seekg(static_cast<std::streamoff>(offset));
  file.read(bytes.data(), static_cast<std::streamsize>(length));
  bytes.resize(static_cast<std::size_t>(std::max<std::streamsize>(file.gcount(), 0)));
  return bytes;
}

/// A little-endian number; 0 past the end.
std::uint32_t numberAt(std::string_view bytes, std::size_t offset, std::size_t length = 4) {
  std::uint32_t number = 0;
  for (std::size_t i = length; i-- > 0;)
    number = number << 8U | (offset + i < bytes.size() ? static_cast<unsigned char>(bytes[offset + i]) : 0U);
  return number;
}

/// Whether a zip archive ends in its directory (APPNOTE.TXT 4.3.16), and that begins where it says.
bool hasDirectory(std::ifstream& file, std::uint64_t size) {
  constexpr std::size_t recordLength = 22;
  constexpr std::size_t longestComment = 65535;
  const std::uint64_t length = std::min<std::uint64_t>(size, recordLength + longestComment);
  const std::string end = bytesAt(file, size - length, static_cast<std::size_t>(length));
  const std::size_t record = end.rfind("PK\x05\x06");
  if (record == std::string::npos) return false;
  const std::uint64_t position = size - length + record;
  const std::uint64_t directory = numberAt(end, record + 12);
  if (directory == 0xFFFFFFFF) return true;  // told elsewhere, in archives beyond 4 GiB
  return directory <= position && bytesAt(file, position - directory, 4) == "PK\x01\x02";
}

/// Whether the sectors that hold a compound file's table, and its first folder, lie in the file ([MS-CFB] 2.2).
bool hasTables(std::ifstream& file, std::uint64_t size) {
  constexpr std::size_t headerLength = 512;
  constexpr std::uint32_t unused = 0xFFFFFFFA;  // and above
  const std::string header = bytesAt(file, 0, headerLength);
  const std::uint32_t shift = numberAt(header, 30, 2);
  if (header.size() < headerLength || (shift != 9 && shift != 12)) return false;
  const auto isInside = [&](std::uint32_t sector) { return ((std::uint64_t{sector} + 1) << shift) < size; };
  if (!isInside(numberAt(header, 48))) return false;
  const std::uint32_t tables = std::min<std::uint32_t>(numberAt(header, 44), 109);
  for (std::uint32_t i = 0; i < tables; ++i) {
    const std::uint32_t sector = numberAt(header, 76 + std::size_t{i} * 4);
    if (sector < unused && !isInside(sector)) return false;
  }
  return tables > 0;
}

}  // namespace

Result<MediaFacts> OfficeInspector::inspect(const std::filesystem::path& path) const {
  const auto identifier = FDYTypePreferredIdentifier(path);
  if (identifier && !types::isOneOf(*services().types, *identifier, types::kOfficeDocuments))
    return Error{ErrorKind::Unsupported, "This is no office document.", path};
  const Result<FileAttributes> attributes = services().files->attributesOfItemAtPath(path);
  if (!attributes) return attributes.error();
  const Result<std::string> start = services().files->readStart(path, kCompound.size());
  if (!start) return start.error();
  if (start->empty()) return Error{ErrorKind::Damaged, "The file is empty.", path};
  std::ifstream file(path, std::ios::binary);
  if ((start->starts_with(kPacked) && !hasDirectory(file, attributes->size)) ||
      (start->starts_with(kCompound) && !hasTables(file, attributes->size)))
    return Error{ErrorKind::Damaged, "The office document is damaged; a part of it is missing.", path};
  MediaFacts facts;
  if (identifier) facts.mimeType = services().types->mimeType(*identifier);
  return facts;
}

}  // namespace quilt::platform
