// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/zip/ZipArchive.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <zip.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/zip/FolderListing.h"

namespace quilt::platform {

namespace {

using zip::Entry;

constexpr std::size_t kBufferSize = 1 << 20;
constexpr double kSmallestStep = 0.5;  // percent between two reports

constexpr std::uint32_t kFileAttributes = (S_IFREG | 0644U) << 16;
constexpr std::uint32_t kFolderAttributes = (S_IFDIR | 0755U) << 16 | 0x10;

// The first moment that the format can express, 1 January 1980.
constexpr zip_uint16_t kTime = 0;
constexpr zip_uint16_t kDate = 1 << 5 | 1;

// What is compressed already: packing it again costs time and gains nothing.
bool isCompressed(const std::filesystem::path& file) {
  static constexpr std::array<std::string_view, 40> extensions = {
      ".3gp", ".7z",   ".aac",  ".avi", ".avif", ".bz2",  ".docx", ".epub", ".flac", ".gif",
      ".gz",  ".heic", ".icns", ".jp2", ".jpeg", ".jpg",  ".jpx",  ".m4a",  ".m4b",  ".m4p",
      ".m4v", ".mkv",  ".mov",  ".mp3", ".mp4",  ".mpeg", ".mpg",  ".odp",  ".odt",  ".oga",
      ".ogg", ".ogv",  ".opus", ".png", ".pptx", ".webm", ".webp", ".woff", ".xz",   ".zip"};
  static_assert(std::is_sorted(extensions.begin(), extensions.end()));
  std::string extension = file.extension().string();
  for (char& c : extension) {
    if (c >= 'A' && c <= 'Z') c = static_cast<char>(c + ('a' - 'A'));
  }
  return extension == ".woff2" || std::binary_search(extensions.begin(), extensions.end(), extension);
}

/// One call of archiveFile.
class Packing {
 public:
  Packing(std::vector<Entry> entries, const ProgressionBlock& block) : _entries(std::move(entries)), _block(block) {
    for (const Entry& entry : _entries) _total += entry.size;
  }

  Result<void> writeTo(const std::filesystem::path& temporary, const std::filesystem::path& toZipFile) {
    if (!report(_block, 0)) return cancelled(toZipFile);
    int code = 0;
    zip_t* archive = zip_open(temporary.c_str(), ZIP_CREATE | ZIP_EXCL, &code);
    if (!archive) {
      zip_error_t error;
      zip_error_init_with_code(&error, code);
      Error result = failure(&error, toZipFile);
      zip_error_fini(&error);
      return result;
    }
    // Sources point at their readers, so they must not move.
    _readers.reserve(_entries.size());
    for (const Entry& entry : _entries) {
      if (!add(archive, entry)) {
        const Error error = failure(zip_get_error(archive), entry.file);
        zip_discard(archive);
        return error;
      }
    }
    if (zip_close(archive) != 0) {
      const Error error = failure(zip_get_error(archive), toZipFile);
      zip_discard(archive);
      return error;
    }
    return {};
  }

 private:
  // The content of one entry, opened only while it is packed.
  struct Reader {
    Packing* packing;
    const Entry* entry;
    int descriptor = -1;
    zip_error_t error{};

    ~Reader() {
      if (descriptor >= 0) close(descriptor);
      zip_error_fini(&error);
    }
  };

  static Error cancelled(const std::filesystem::path& file) {
    return {ErrorKind::Cancelled, "Packing was cancelled.", file};
  }

  bool add(zip_t* archive, const Entry& entry) {
    zip_int64_t index = -1;
    if (entry.isFolder) {
      index = zip_dir_add(archive, entry.name.c_str(), ZIP_FL_ENC_UTF_8);
    } else {
      _readers.push_back(std::make_unique<Reader>(Reader{this, &entry}));
      zip_source_t* source = zip_source_function(archive, &Packing::source, _readers.back().get());
      if (!source) return false;
      index = zip_file_add(archive, entry.name.c_str(), source, ZIP_FL_ENC_UTF_8);
      if (index < 0) zip_source_free(source);
    }
    if (index < 0) return false;
    const auto at = static_cast<zip_uint64_t>(index);
    const bool isStored = entry.size == 0 || isCompressed(entry.file);
    return zip_set_file_compression(archive, at, isStored ? ZIP_CM_STORE : ZIP_CM_DEFLATE, 0) == 0 &&
           zip_file_set_dostime(archive, at, kTime, kDate, 0) == 0 &&
           zip_file_set_external_attributes(archive, at, 0, ZIP_OPSYS_UNIX,
                                            entry.isFolder ? kFolderAttributes : kFileAttributes) == 0;
  }

  static zip_int64_t source(void* user, void* data, zip_uint64_t length, zip_source_cmd_t command) {
    auto& reader = *static_cast<Reader*>(user);
    switch (command) {
      case ZIP_SOURCE_OPEN:
        return reader.packing->open(reader);
      case ZIP_SOURCE_READ:
        return reader.packing->read(reader, data, length);
      case ZIP_SOURCE_CLOSE:
        if (reader.descriptor >= 0) close(reader.descriptor);
        reader.descriptor = -1;
        return 0;
      case ZIP_SOURCE_STAT: {
        zip_stat_t& stat = *static_cast<zip_stat_t*>(data);
        zip_stat_init(&stat);
        stat.valid = ZIP_STAT_SIZE;
        stat.size = reader.entry->size;
        return sizeof stat;
      }
      case ZIP_SOURCE_ERROR:
        return zip_error_to_data(&reader.error, data, length);
      case ZIP_SOURCE_SUPPORTS:
        return zip_source_make_command_bitmap(ZIP_SOURCE_OPEN, ZIP_SOURCE_READ, ZIP_SOURCE_CLOSE, ZIP_SOURCE_STAT,
                                              ZIP_SOURCE_ERROR, ZIP_SOURCE_FREE, -1);
      case ZIP_SOURCE_FREE:
      case ZIP_SOURCE_SEEK:
      case ZIP_SOURCE_TELL:
      case ZIP_SOURCE_BEGIN_WRITE:
      case ZIP_SOURCE_COMMIT_WRITE:
      case ZIP_SOURCE_ROLLBACK_WRITE:
      case ZIP_SOURCE_WRITE:
      case ZIP_SOURCE_SEEK_WRITE:
      case ZIP_SOURCE_TELL_WRITE:
      case ZIP_SOURCE_REMOVE:
      case ZIP_SOURCE_RESERVED_1:
      case ZIP_SOURCE_BEGIN_WRITE_CLONING:
      case ZIP_SOURCE_ACCEPT_EMPTY:
      case ZIP_SOURCE_GET_FILE_ATTRIBUTES:
        return 0;
    }
    return 0;
  }

  zip_int64_t open(Reader& reader) {
    struct stat status {};
    reader.descriptor = ::open(reader.entry->file.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK);
    if (reader.descriptor < 0 || fstat(reader.descriptor, &status) != 0 || !S_ISREG(status.st_mode)) {
      return fail(reader, Error{ErrorKind::InputOutput, "A file of the folder cannot be read.", reader.entry->file});
    }
    posix_fadvise(reader.descriptor, 0, 0, POSIX_FADV_SEQUENTIAL);
    _used = 0;
    _filled = 0;
    return 0;
  }

  // libzip asks for a few kilobytes at a time; the file is read in larger stretches.
  zip_int64_t read(Reader& reader, void* data, zip_uint64_t length) {
    if (_used == _filled) {
      const ssize_t count = ::read(reader.descriptor, _buffer.data(), _buffer.size());
      if (count < 0) {
        return fail(reader, Error{ErrorKind::InputOutput, "A file of the folder cannot be read.", reader.entry->file});
      }
      _used = 0;
      _filled = static_cast<std::size_t>(count);
      if (!advance(_filled)) return fail(reader, cancelled(reader.entry->file));
    }
    const std::size_t count = std::min<std::size_t>(length, _filled - _used);
    std::memcpy(data, _buffer.data() + _used, count);
    _used += count;
    return static_cast<zip_int64_t>(count);
  }

  zip_int64_t fail(Reader& reader, Error error) {
    _error = std::move(error);
    zip_error_set(&reader.error, ZIP_ER_READ, errno);
    return -1;
  }

  // The end is reported by the caller, once the archive is in its place.
  bool advance(std::size_t bytes) {
    _done += bytes;
    if (_total == 0) return true;
    const double percentage = std::min(100.0, 100.0 * static_cast<double>(_done) / static_cast<double>(_total));
    if (percentage >= 100 || percentage < _reported + kSmallestStep) return true;
    _reported = percentage;
    return report(_block, percentage);
  }

  // libzip's error as ours; an error of our own goes before the one that libzip made of it.
  Error failure(zip_error_t* error, const std::filesystem::path& file) {
    if (_error) return *_error;
    const bool isNoSpace = zip_error_system_type(error) == ZIP_ET_SYS && zip_error_code_system(error) == ENOSPC;
    const bool isName = zip_error_code_zip(error) == ZIP_ER_INVAL;
    Error result{isNoSpace ? ErrorKind::NoSpace : ErrorKind::InputOutput,
                 std::string("The archive cannot be written (") + zip_error_strerror(error) + ").", file};
    if (isName) result = {ErrorKind::Unsupported, "A name in the folder is no UTF-8 text.", file};
    return result;
  }

  const std::vector<Entry> _entries;
  const ProgressionBlock& _block;
  std::vector<std::unique_ptr<Reader>> _readers;
  std::optional<Error> _error;
  std::uint64_t _total = 0;
  std::uint64_t _done = 0;
  double _reported = 0;
  std::vector<char> _buffer = std::vector<char>(kBufferSize);
  std::size_t _used = 0;
  std::size_t _filled = 0;
};

// Until it is under its final name, what is on the disk may be less than what was written.
Result<void> syncAndRename(const std::filesystem::path& temporary, const std::filesystem::path& toZipFile) {
  const auto sync = [](const std::filesystem::path& path, int flags) {
    const int descriptor = open(path.c_str(), O_RDONLY | O_CLOEXEC | flags);
    const bool synced = descriptor >= 0 && fsync(descriptor) == 0;
    if (descriptor >= 0) close(descriptor);
    return synced;
  };
  if (!sync(temporary, 0) || rename(temporary.c_str(), toZipFile.c_str()) != 0) {
    const bool isNoSpace = errno == ENOSPC || errno == EDQUOT;
    return Error{isNoSpace ? ErrorKind::NoSpace : ErrorKind::InputOutput,
                 std::string("The archive cannot be put in its place (") + std::strerror(errno) + ").", toZipFile};
  }
  sync(toZipFile.parent_path(), O_DIRECTORY);  // some file systems cannot; the file itself is safe
  return {};
}

}  // namespace

Result<void> ZipArchive::archiveFile(const std::filesystem::path& file, std::string_view underName,
                                     const std::filesystem::path& toZipFile,
                                     const ProgressionBlock& withProgressionBlock) {
  if (!isPlainComponent(underName)) {
    return Error{ErrorKind::Unsafe, "The folder cannot have this name in an archive.", file};
  }
  Result<std::vector<Entry>> entries = zip::listFolder(file, underName);
  if (!entries) return entries.error();
  std::filesystem::path temporary = toZipFile;
  temporary.replace_filename("." + toZipFile.filename().string() + "." + generateUUID());
  Packing packing(*std::move(entries), withProgressionBlock);
  Result<void> result = packing.writeTo(temporary, toZipFile);
  if (result) result = syncAndRename(temporary, toZipFile);
  if (!result) {
    unlink(temporary.c_str());
    return result;
  }
  report(withProgressionBlock, 100);
  return {};
}

const char* ZipArchive::version() { return zip_libzip_version(); }

}  // namespace quilt::platform
