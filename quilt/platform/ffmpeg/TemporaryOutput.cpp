// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/TemporaryOutput.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <string>
#include <utility>

#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/ffmpeg/Failure.h"
#include "quilt/platform/ffmpeg/Handles.h"

namespace quilt::platform::ffmpeg {

namespace fs = std::filesystem;

Result<TemporaryOutput> TemporaryOutput::create(const fs::path& destination) {
  constexpr int attempts = 100;
  for (int i = 0; i < attempts; ++i) {
    fs::path path = destination.parent_path() / hiddenNameBeside(destination.filename().native());
    const int descriptor = open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0666);
    if (descriptor >= 0) return TemporaryOutput(std::move(path), destination, descriptor);
    if (errno != EEXIST) return failure(AVERROR(errno), destination);
  }
  return failure(AVERROR(EEXIST), destination);
}

TemporaryOutput::TemporaryOutput(fs::path path, fs::path destination, int descriptor)
    : _path(std::move(path)), _destination(std::move(destination)), _descriptor(descriptor) {}

TemporaryOutput::TemporaryOutput(TemporaryOutput&& other) noexcept
    : _path(std::exchange(other._path, {})),
      _destination(std::move(other._destination)),
      _descriptor(std::exchange(other._descriptor, -1)),
      _length(other._length) {}

TemporaryOutput::~TemporaryOutput() {
  if (_descriptor >= 0) close(_descriptor);
  if (!_path.empty()) unlink(_path.c_str());
}

Result<void> TemporaryOutput::append(std::string_view bytes) {
  Result<void> written = write(_length, bytes);
  _length += static_cast<std::int64_t>(bytes.size());
  return written;
}

Result<void> TemporaryOutput::writeAt(std::uint64_t offset, std::string_view bytes) {
  return write(static_cast<std::int64_t>(offset), bytes);
}

Result<void> TemporaryOutput::write(std::int64_t offset, std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t count = pwrite(_descriptor, bytes.data(), bytes.size(), offset);
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return failure(AVERROR(errno), _destination);
    bytes.remove_prefix(static_cast<std::size_t>(count));
    offset += count;
  }
  return {};
}

std::int64_t TemporaryOutput::readAt(std::int64_t offset, void* bytes, std::size_t count) const {
  ssize_t got = 0;
  do {
    got = pread(_descriptor, bytes, count, offset);
  } while (got < 0 && errno == EINTR);
  return got;
}

Result<void> TemporaryOutput::publish() {
  if (fsync(_descriptor) != 0) return failure(AVERROR(errno), _destination);
  if (std::rename(_path.c_str(), _destination.c_str()) != 0) return failure(AVERROR(errno), _destination);
  _path.clear();
  const fs::path parent = _destination.parent_path();
  const int folder = open(parent.empty() ? "." : parent.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (folder >= 0) {
    fsync(folder);  // where a file system cannot, the rename is still in order
    close(folder);
  }
  return {};
}

}  // namespace quilt::platform::ffmpeg
