// SPDX-License-Identifier: Apache-2.0
#include "quilt/scripting/bridge/http/Files.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <charconv>

namespace quilt::scripting::http {

namespace {

constexpr std::string_view kPage = "index.html";
constexpr std::size_t kLargestPage = std::size_t{4} << 20;

// A name that leads one step down and nowhere else; a name with a "/" in it would be two.
bool isPlainName(const std::string& name) {
  constexpr std::string_view kBarred("/\\\0", 3);
  return !name.empty() && name.front() != '.' && name.find_first_of(kBarred) == std::string::npos;
}

// Each step is opened from the one before it and never through a link, so that nothing can be exchanged on the way.
Descriptor openBelow(const std::filesystem::path& folder, std::string_view path) {
  constexpr int kFolder = O_RDONLY | O_DIRECTORY | O_CLOEXEC;
  Descriptor at(::open(folder.c_str(), kFolder));
  while (at) {
    const std::size_t slash = path.find('/');
    const auto name = percentDecoded(path.substr(0, slash));
    if (!name || !isPlainName(*name)) return {};
    if (slash == std::string_view::npos)  // without O_NONBLOCK, a pipe would keep the thread here
      return Descriptor(openat(at.number(), name->c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    at = Descriptor(openat(at.number(), name->c_str(), kFolder | O_NOFOLLOW));
    path.remove_prefix(slash + 1);
  }
  return {};
}

std::string tagOf(const struct stat& status) {
  return '"' + std::to_string(status.st_ino) + '-' + std::to_string(status.st_size) + '-' +
         std::to_string(status.st_mtim.tv_sec) + '-' + std::to_string(status.st_mtim.tv_nsec) + '"';
}

std::optional<std::string> readPage(const Descriptor& file, std::size_t size) {
  if (size > kLargestPage) return std::nullopt;
  std::string page(size, '\0');
  for (std::size_t read = 0; read < size;) {
    const ssize_t count = ::pread(file.number(), page.data() + read, size - read, static_cast<off_t>(read));
    if (count <= 0) return std::nullopt;
    read += static_cast<std::size_t>(count);
  }
  return page;
}

std::optional<std::uint64_t> numberOf(std::string_view text) {
  std::uint64_t number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return number;
}

ByteRange rangeOf(const RequestHead& head, std::uint64_t size, const std::string& tag) {
  if (head.count("range") == 0) return {};
  if (head.count("if-range") > 0 && head.only("if-range") != tag) return {};
  const auto field = head.only("range");
  return field ? parseRange(*field, size) : ByteRange{ByteRange::Kind::Refused};
}

}  // namespace

ByteRange parseRange(std::string_view field, std::uint64_t size) {
  constexpr std::string_view kUnit = "bytes=";
  using Kind = ByteRange::Kind;
  if (!field.starts_with(kUnit)) return {};
  field.remove_prefix(kUnit.size());
  const std::size_t dash = field.find('-');
  if (dash == std::string_view::npos || field.find(',') != std::string_view::npos) return {Kind::Refused};
  const std::string_view before = field.substr(0, dash);
  const std::string_view after = field.substr(dash + 1);
  if (before.empty()) {
    const auto length = numberOf(after);
    if (!length || *length == 0 || size == 0) return {Kind::Refused};
    return {Kind::Part, size - std::min(*length, size), size - 1};
  }
  const auto first = numberOf(before);
  const auto last = after.empty() ? std::optional(size) : numberOf(after);
  if (!first || !last || *first >= size || *last < *first) return {Kind::Refused};
  return {Kind::Part, *first, std::min(*last, size - 1)};
}

Response answerFile(const FileRoom& room, std::string_view path, const RequestHead& head) {
  const bool isPage = path.empty() || path == kPage;
  Descriptor file = openBelow(room.folder, isPage ? kPage : path);
  struct stat status {};
  if (!file || fstat(file.number(), &status) != 0 || !S_ISREG(status.st_mode))
    return plain(404, "There is no such file.\n");
  const auto size = static_cast<std::uint64_t>(status.st_size);

  Response response;
  response.fields = {{"Content-Type", mimeTypeOf(isPage ? kPage : path)}, {"Cache-Control", "no-cache"}};
  if (isPage && room.preparePage) {
    auto page = readPage(file, static_cast<std::size_t>(size));
    if (!page) return plain(404, "There is no such file.\n");
    response.body = room.preparePage(*std::move(page));
    return response;
  }
  const std::string tag = tagOf(status);
  response.fields.emplace_back("ETag", tag);
  response.fields.emplace_back("Accept-Ranges", "bytes");
  if (head.only("if-none-match") == tag) {
    response.status = 304;
    return response;
  }
  const ByteRange range = rangeOf(head, size, tag);
  switch (range.kind) {
    case ByteRange::Kind::Refused:
      response = plain(416, "This part of the file cannot be had.\n");
      response.fields.emplace_back("Content-Range", "bytes */" + std::to_string(size));
      break;
    case ByteRange::Kind::Whole:
      response.file = FileStretch{std::move(file), 0, size};
      break;
    case ByteRange::Kind::Part:
      response.status = 206;
      response.fields.emplace_back("Content-Range", "bytes " + std::to_string(range.first) + '-' +
                                                        std::to_string(range.last) + '/' + std::to_string(size));
      response.file = FileStretch{std::move(file), range.first, range.last - range.first + 1};
      break;
  }
  return response;
}

std::string mimeTypeOf(const std::filesystem::path& file) {
  struct Row {
    std::string_view extension;
    std::string_view type;
  };
  // What packages hold. Other names are handed out as bytes, which browsers neither run nor draw.
  static constexpr Row kRows[] = {
      {".html", "text/html; charset=utf-8"},
      {".htm", "text/html; charset=utf-8"},
      {".css", "text/css; charset=utf-8"},
      {".js", "text/javascript; charset=utf-8"},
      {".mjs", "text/javascript; charset=utf-8"},
      {".json", "application/json"},
      {".txt", "text/plain; charset=utf-8"},
      {".vtt", "text/vtt; charset=utf-8"},
      {".xml", "application/xml"},
      {".plist", "application/xml"},
      {".svg", "image/svg+xml"},
      {".png", "image/png"},
      {".jpg", "image/jpeg"},
      {".jpeg", "image/jpeg"},
      {".gif", "image/gif"},
      {".webp", "image/webp"},
      {".avif", "image/avif"},
      {".bmp", "image/bmp"},
      {".ico", "image/vnd.microsoft.icon"},
      {".tif", "image/tiff"},
      {".tiff", "image/tiff"},
      {".heic", "image/heic"},
      {".mp4", "video/mp4"},
      {".m4v", "video/mp4"},
      {".mov", "video/quicktime"},
      {".webm", "video/webm"},
      {".mkv", "video/x-matroska"},
      {".ogv", "video/ogg"},
      {".avi", "video/x-msvideo"},
      {".mpg", "video/mpeg"},
      {".3gp", "video/3gpp"},
      {".m4a", "audio/mp4"},
      {".mp3", "audio/mpeg"},
      {".wav", "audio/wav"},
      {".aif", "audio/aiff"},
      {".aiff", "audio/aiff"},
      {".ogg", "audio/ogg"},
      {".oga", "audio/ogg"},
      {".opus", "audio/ogg"},
      {".flac", "audio/flac"},
      {".aac", "audio/aac"},
      {".pdf", "application/pdf"},
      {".epub", "application/epub+zip"},
      {".woff", "font/woff"},
      {".woff2", "font/woff2"},
      {".ttf", "font/ttf"},
      {".otf", "font/otf"},
      {".wasm", "application/wasm"},
      {".zip", "application/zip"},
  };
  std::string extension = file.extension().native();
  std::transform(extension.begin(), extension.end(), extension.begin(),
                 [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
  const auto* row =
      std::find_if(std::begin(kRows), std::end(kRows), [&](const Row& known) { return known.extension == extension; });
  return std::string(row == std::end(kRows) ? "application/octet-stream" : row->type);
}

}  // namespace quilt::scripting::http
