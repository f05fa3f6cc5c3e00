// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/types/TypeTable.h"

namespace quilt::platform {

using namespace types;

namespace {

constexpr const char* kContent = "public.content";
constexpr const char* kDocument = "org.quilt.document";
constexpr const char* kArchive = "public.archive";

const TypeRow kRows[] = {
    {kItem, {}, {}, {}},
    {kURL, {kItem}, {}, {"text/uri-list"}},
    {kFolder, {kItem}, {}, {"inode/directory"}},
    {kContent, {kItem}, {}, {}},
    {kAudiovisual, {kContent}, {}, {}},
    {kMovie, {kAudiovisual}, {}, {}},
    {kVideo, {kAudiovisual}, {}, {}},
    {kAudio, {kAudiovisual}, {}, {}},
    {kImage, {kContent}, {}, {}},
    {kDocument, {kContent}, {}, {}},
    {kArchive, {kItem}, {}, {}},

    {kAIFF, {kAudio}, {"aiff", "aif"}, {"audio/aiff", "audio/x-aiff"}},
    {kAIFC, {kAudio}, {"aifc"}, {"audio/aiff", "audio/x-aiff"}},
    {kMPEG4Audio, {kAudio}, {"mp4a"}, {"audio/mp4"}},
    {kM4A, {kMPEG4Audio}, {"m4a", "m4b", "m4r"}, {"audio/mp4", "audio/x-m4a"}},
    {kProtectedMPEG4Audio, {kAudio}, {"m4p"}, {"audio/mp4"}},
    {kMP3, {kAudio}, {"mp3", "mpga"}, {"audio/mpeg", "audio/mp3"}},
    {kWAV, {kAudio}, {"wav", "wave"}, {"audio/wav", "audio/x-wav"}},
    {"org.xiph.flac", {kAudio}, {"flac"}, {"audio/flac"}},
    {"org.xiph.ogg-audio", {kAudio}, {"ogg", "oga", "opus"}, {"audio/ogg"}},

    {kMovieContainer, {kMovie}, {"mov", "qt"}, {"video/quicktime"}},
    {kMPEG4, {kMovie}, {"mp4", "mpg4"}, {"video/mp4"}},
    {kM4V, {kMovie}, {"m4v"}, {"video/x-m4v", "video/mp4"}},
    {kProtectedMPEG4Video, {kMovie}, {"m4vp"}, {"video/x-m4v"}},
    {kMPEG, {kMovie}, {"mpeg", "mpg", "m1v", "m2v", "vob"}, {"video/mpeg"}},
    {k3GPP, {kMovie}, {"3gp", "3gpp", "3g2"}, {"video/3gpp"}},
    // The movie toolkit opens these containers as it opens its first one.
    {kAVI, {kMovieContainer}, {"avi"}, {"video/x-msvideo", "video/avi"}},
    {kMatroska, {kMovieContainer}, {"mkv"}, {"video/x-matroska"}},
    {kWebM, {kMovieContainer}, {"webm"}, {"video/webm"}},
    {"public.mpeg-2-transport-stream", {kMovieContainer}, {"ts", "mts", "m2ts"}, {"video/mp2t"}},

    {kJPEG, {kImage}, {"jpg", "jpeg", "jpe"}, {"image/jpeg"}},
    {kJPEG2000, {kImage}, {"jp2", "j2k", "jpf", "jpx", "j2c"}, {"image/jp2"}},
    {kTIFF, {kImage}, {"tiff", "tif"}, {"image/tiff"}},
    {kGIF, {kImage}, {"gif"}, {"image/gif"}},
    {kPNG, {kImage}, {"png"}, {"image/png"}},
    {kICNS, {kImage}, {"icns"}, {"image/icns", "image/x-icns"}},
    {kBMP, {kImage}, {"bmp", "dib"}, {"image/bmp"}},
    {kHEIC, {kImage}, {"heic", "heif"}, {"image/heic"}},
    {kSVG, {kImage}, {"svg"}, {"image/svg+xml"}},
    {"org.webmproject.webp", {kImage}, {"webp"}, {"image/webp"}},

    {kPDF, {kDocument}, {"pdf"}, {"application/pdf"}},
    {kEPUB, {kDocument}, {}, {"application/epub+zip"}},
    {kEPUBContainer, {kEPUB}, {"epub"}, {"application/epub+zip"}},
    {kTextDocument, {kDocument}, {"odt", "ott"}, {"application/vnd.oasis.opendocument.text"}},
    {kFlatTextDocument, {kDocument}, {"fodt"}, {"application/vnd.oasis.opendocument.text-flat-xml"}},
    {kWordDoc, {kDocument}, {"doc", "dot"}, {"application/msword"}},
    {kWordML, {kDocument}, {"wordml"}, {"application/xml"}},
    {kWordOpenXML, {kDocument}, {"docx"}, {"application/vnd.openxmlformats-officedocument.wordprocessingml.document"}},
    {kPresentation, {kDocument}, {"odp", "otp"}, {"application/vnd.oasis.opendocument.presentation"}},
    {kFlatPresentation, {kDocument}, {"fodp"}, {"application/vnd.oasis.opendocument.presentation-flat-xml"}},
    {kPowerPointPpt, {kDocument}, {"ppt", "pps"}, {"application/vnd.ms-powerpoint"}},
    {kPowerPointOpenXML,
     {kDocument},
     {"pptx", "ppsx"},
     {"application/vnd.openxmlformats-officedocument.presentationml.presentation"}},
    // Told apart from the documents above, whose form they share.
    {"com.microsoft.excel.xls", {kDocument}, {"xls"}, {"application/vnd.ms-excel"}},
    {"org.openxmlformats.spreadsheetml.sheet",
     {kDocument},
     {"xlsx"},
     {"application/vnd.openxmlformats-officedocument.spreadsheetml.sheet"}},
    {"org.oasis-open.opendocument.spreadsheet",
     {kDocument},
     {"ods"},
     {"application/vnd.oasis.opendocument.spreadsheet"}},
    {"public.rtf", {kDocument}, {"rtf"}, {"application/rtf"}},
    {kText, {kContent}, {"txt", "text", "md", "srt"}, {"text/plain"}},
    {kHTML, {kText}, {"html", "htm"}, {"text/html"}},
    {"public.xml", {kText}, {"xml", "plist"}, {"application/xml"}},
    {"public.json", {kText}, {"json"}, {"application/json"}},
    {"public.zip-archive", {kArchive}, {"zip"}, {"application/zip"}},
};

}  // namespace

std::span<const TypeRow> typeRows() { return kRows; }

}  // namespace quilt::platform
