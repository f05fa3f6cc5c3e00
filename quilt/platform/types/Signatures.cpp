// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/types/Signatures.h"

#include <algorithm>

#include "quilt/platform/interfaces/TypeIdentifiers.h"

namespace quilt::platform {

using namespace types;
using namespace std::string_view_literals;

namespace {

struct Signature {
  std::size_t offset;
  std::string_view bytes;
  const char* identifier;
};

const Signature kSignatures[] = {
    {0, "\xFF\xD8\xFF"sv, kJPEG},
    {0, "\x89PNG\r\n\x1A\n"sv, kPNG},
    {0, "GIF87a"sv, kGIF},
    {0, "GIF89a"sv, kGIF},
    {0, "II*\0"sv, kTIFF},
    {0, "MM\0*"sv, kTIFF},
    {0, "\0\0\0\x0CjP  "sv, kJPEG2000},
    {0, "\xFF\x4F\xFF\x51"sv, kJPEG2000},
    {0, "icns"sv, kICNS},
    {0, "%PDF-"sv, kPDF},
    {0, "\xD0\xCF\x11\xE0\xA1\xB1\x1A\xE1"sv, kWordDoc},  // every compound document; the extension tells which
    {0, "\x1A\x45\xDF\xA3"sv, kMatroska},
    {0, "\0\0\x01\xBA"sv, kMPEG},
    {0, "\0\0\x01\xB3"sv, kMPEG},
    {0, "ID3"sv, kMP3},
    {0, "fLaC"sv, "org.xiph.flac"},
    {0, "OggS"sv, "org.xiph.ogg-audio"},
    {30, "mimetypeapplication/epub+zip"sv, kEPUBContainer},
    {30, "mimetypeapplication/vnd.oasis.opendocument.text"sv, kTextDocument},
    {30, "mimetypeapplication/vnd.oasis.opendocument.presentation"sv, kPresentation},
    {0, "PK\x03\x04"sv, "public.zip-archive"},
};

struct Brand {
  std::string_view name;
  const char* identifier;
};

const Brand kBrands[] = {{"M4A ", kM4A},  {"M4B ", kM4A},  {"M4P ", kProtectedMPEG4Audio},
                         {"M4V ", kM4V},  {"M4VP", kM4V},  {"qt  ", kMovieContainer},
                         {"3gp", k3GPP},  {"3g2", k3GPP},  {"heic", kHEIC},
                         {"heix", kHEIC}, {"mif1", kHEIC}, {"msf1", kHEIC}};

bool holds(std::string_view start, std::size_t offset, std::string_view bytes) {
  return start.size() >= offset + bytes.size() && start.substr(offset, bytes.size()) == bytes;
}

const char* typeOfBoxes(std::string_view start) {
  if (holds(start, 4, "ftyp")) {
    const std::string_view brand = start.substr(8, 4);
    for (const Brand& known : kBrands)
      if (brand.starts_with(known.name)) return known.identifier;
    return kMPEG4;
  }
  for (const std::string_view box : {"moov"sv, "mdat"sv, "wide"sv, "pnot"sv})
    if (holds(start, 4, box)) return kMovieContainer;
  return nullptr;
}

const char* typeOfChunks(std::string_view start) {
  if (holds(start, 0, "RIFF")) {
    if (holds(start, 8, "WAVE")) return kWAV;
    if (holds(start, 8, "AVI ")) return kAVI;
    if (holds(start, 8, "WEBP")) return "org.webmproject.webp";
  }
  if (holds(start, 0, "FORM")) {
    if (holds(start, 8, "AIFF")) return kAIFF;
    if (holds(start, 8, "AIFC")) return kAIFC;
  }
  return nullptr;
}

// The name of the first file of a zip archive, as far as it can be seen.
std::string_view firstPackedName(std::string_view start) {
  constexpr std::size_t lengthAt = 26, nameAt = 30;
  if (start.size() < nameAt) return {};
  const auto low = static_cast<unsigned char>(start[lengthAt]), high = static_cast<unsigned char>(start[lengthAt + 1]);
  return start.substr(nameAt, low + std::size_t{high} * 256);
}

// Office documents say what they are in the names of their parts, of which some lie at the start.
const char* typeOfPackage(std::string_view start) {
  if (!start.starts_with("PK\x03\x04")) return nullptr;
  if (start.find("word/document.xml") != std::string_view::npos) return kWordOpenXML;
  if (start.find("ppt/presentation.xml") != std::string_view::npos) return kPowerPointOpenXML;
  return nullptr;
}

bool isBmp(std::string_view start) {
  // Two letters alone would claim texts; the header's length behind them is one of few.
  if (!holds(start, 0, "BM") || start.size() < 18) return false;
  const auto header = static_cast<unsigned char>(start[14]);
  return start[15] == 0 && (header == 12 || header == 40 || header == 52 || header == 56 || header == 64 ||
                            header == 108 || header == 124);
}

}  // namespace

const char* typeOfContent(std::string_view start) {
  if (const char* boxes = typeOfBoxes(start)) return boxes;
  if (const char* chunks = typeOfChunks(start)) return chunks;
  if (const char* package = typeOfPackage(start)) return package;
  for (const Signature& signature : kSignatures)
    if (holds(start, signature.offset, signature.bytes)) return signature.identifier;
  if (isBmp(start)) return kBMP;
  // A frame header of MPEG audio: eleven set bits, then a layer that is not reserved.
  if (start.size() > 2 && start[0] == '\xFF' && (start[1] & '\xE0') == '\xE0' && (start[1] & '\x06') != 0 &&
      (start[2] & '\xF0') != '\xF0')
    return kMP3;
  return nullptr;
}

bool mayBePackedDocument(std::string_view start) {
  const std::string_view name = firstPackedName(start);
  if (name.empty()) return true;
  for (const std::string_view known :
       {"mimetype"sv, "[Content_Types].xml"sv, "_rels/"sv, "docProps/"sv, "customXml/"sv, "word/"sv, "ppt/"sv,
        "META-INF/"sv, "Configurations"sv, "Thumbnails/"sv, "Pictures/"sv, "content.xml"sv, "styles.xml"sv,
        "meta.xml"sv, "settings.xml"sv, "layout-cache"sv}) {
    if (name.starts_with(known)) return true;
  }
  return false;
}

bool isPlainText(std::string_view start) {
  return !start.empty() && typeOfContent(start) == nullptr && std::all_of(start.begin(), start.end(), [](char c) {
    const auto byte = static_cast<unsigned char>(c);
    return byte >= 0x20 || c == '\n' || c == '\r' || c == '\t' || c == '\f';
  });
}

}  // namespace quilt::platform
