// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// The type identifiers that the model names. Public ones where one is in general use, else this library's own.
namespace types {
/// @{
/// The families: what every item is, web addresses and folders, and the kinds of media.
inline constexpr const char* kItem = "public.item";
inline constexpr const char* kURL = "public.url";
inline constexpr const char* kFolder = "public.folder";
inline constexpr const char* kAudiovisual = "public.audiovisual-content";
inline constexpr const char* kMovie = "public.movie";
inline constexpr const char* kVideo = "public.video";
inline constexpr const char* kAudio = "public.audio";
inline constexpr const char* kImage = "public.image";
/// @}

/// @{
/// Sound.
inline constexpr const char* kAIFF = "public.aiff-audio";
inline constexpr const char* kAIFC = "public.aifc-audio";
inline constexpr const char* kM4A = "org.quilt.m4a-audio";
inline constexpr const char* kMP3 = "public.mp3";
inline constexpr const char* kMPEG4Audio = "public.mpeg-4-audio";
inline constexpr const char* kProtectedMPEG4Audio = "org.quilt.protected-mpeg-4-audio";
inline constexpr const char* kWAV = "org.quilt.waveform-audio";
/// @}

/// @{
/// Movies.
inline constexpr const char* kMovieContainer = "org.quilt.movie-container";
inline constexpr const char* kMPEG4 = "public.mpeg-4";
inline constexpr const char* kMPEG = "public.mpeg";
inline constexpr const char* kProtectedMPEG4Video = "org.quilt.protected-mpeg-4-video";
inline constexpr const char* kM4V = "org.quilt.m4v-video";
inline constexpr const char* k3GPP = "public.3gpp";
inline constexpr const char* kAVI = "public.avi";
inline constexpr const char* kMatroska = "org.matroska.mkv";
inline constexpr const char* kWebM = "org.webmproject.webm";
/// @}

/// @{
/// Images.
inline constexpr const char* kJPEG = "public.jpeg";
inline constexpr const char* kJPEG2000 = "public.jpeg-2000";
inline constexpr const char* kTIFF = "public.tiff";
inline constexpr const char* kGIF = "com.compuserve.gif";
inline constexpr const char* kPNG = "public.png";
inline constexpr const char* kICNS = "org.quilt.icon-file";
inline constexpr const char* kBMP = "com.microsoft.bmp";
inline constexpr const char* kHEIC = "public.heic";
inline constexpr const char* kSVG = "public.svg-image";
/// @}

/// @{
/// Documents and texts.
inline constexpr const char* kPDF = "com.adobe.pdf";
inline constexpr const char* kEPUB = "org.quilt.epub";  // this library's own, beside the public one
inline constexpr const char* kEPUBContainer = "org.idpf.epub-container";
inline constexpr const char* kTextDocument = "org.oasis-open.opendocument.text";
inline constexpr const char* kFlatTextDocument = "org.oasis-open.opendocument.text-flat-xml";
inline constexpr const char* kWordDoc = "com.microsoft.word.doc";
inline constexpr const char* kWordML = "com.microsoft.word.wordml";
inline constexpr const char* kWordOpenXML = "org.openxmlformats.wordprocessingml.document";
inline constexpr const char* kPresentation = "org.oasis-open.opendocument.presentation";
inline constexpr const char* kFlatPresentation = "org.oasis-open.opendocument.presentation-flat-xml";
inline constexpr const char* kPowerPointPpt = "com.microsoft.powerpoint.ppt";
inline constexpr const char* kPowerPointOpenXML = "org.openxmlformats.presentationml.presentation";
inline constexpr const char* kText = "public.plain-text";
inline constexpr const char* kHTML = "public.html";
/// @}
}  // namespace types

/// Which type a file is of, and how types relate. May be called on any thread.
class QUILT_EXPORT TypeIdentifiers {
 public:
  virtual ~TypeIdentifiers() = default;

  /// The type of a file: from its extension, unless its first bytes belong to a type of another family (a text named
  /// ".mp4"); without a known extension, from its first bytes. None when nothing is there or nothing matches.
  [[nodiscard]] virtual std::optional<std::string> preferredIdentifier(const std::filesystem::path& path) const = 0;

  /// Whether `identifier` is `other` or has it among its parents, at any distance.
  [[nodiscard]] virtual bool conformsTo(std::string_view identifier, std::string_view other) const = 0;

  /// The preferred MIME type of an identifier, or none.
  [[nodiscard]] virtual std::optional<std::string> mimeType(std::string_view identifier) const = 0;
};

namespace types {
/// Documents that have pages, or get them from a layout.
inline constexpr std::array kPagedDocuments{kPDF, kEPUB, kEPUBContainer};
/// Documents that an office program turns into pages.
inline constexpr std::array kOfficeDocuments{kTextDocument,     kFlatTextDocument, kWordDoc,
                                             kWordML,           kWordOpenXML,      kPresentation,
                                             kFlatPresentation, kPowerPointPpt,    kPowerPointOpenXML};

/// Whether the type conforms to one of the kinds.
template <class Kinds>
bool isOneOf(const TypeIdentifiers& types, std::string_view identifier, const Kinds& kinds) {
  for (const char* kind : kinds)
    if (types.conformsTo(identifier, kind)) return true;
  return false;
}

/// Whether files of the type are shown page by page.
inline bool isPagedDocument(const TypeIdentifiers& types, std::string_view identifier) {
  return isOneOf(types, identifier, kPagedDocuments) || isOneOf(types, identifier, kOfficeDocuments);
}
}  // namespace types

/// The installed service's preferredIdentifier.
QUILT_EXPORT std::optional<std::string> FDYTypePreferredIdentifier(const std::filesystem::path& path);

}  // namespace quilt::platform
