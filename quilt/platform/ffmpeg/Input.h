// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <string_view>

#include "quilt/platform/base/ProgressionBlock.h"
#include "quilt/platform/base/Result.h"
#include "quilt/platform/ffmpeg/Handles.h"

namespace quilt::platform::ffmpeg {

/// A local movie or sound file opened for reading, by one thread at a time. The only way files are opened here.
///
/// The library reads through this object's own file descriptor and can open nothing else: whatever the file's name
/// looks like and whatever the file refers to, no other file, address or device is touched. Playlists and image
/// sequences are no formats here. Every read fails once the time given to `allow` is over.
class Input {
 public:
  /// Reads the header, in at most `seconds`; nothing is decoded.
  static Result<Input> open(const std::filesystem::path& path, double seconds);

  Input(Input&&) noexcept;
  Input& operator=(Input&&) noexcept;
  ~Input();

  [[nodiscard]] AVFormatContext* context() const { return _context.get(); }
  [[nodiscard]] const std::filesystem::path& path() const;
  [[nodiscard]] std::uint64_t size() const;

  /// Whether the container is MPEG-4, QuickTime or a relative, whose header lists every packet.
  [[nodiscard]] bool isMovieFamily() const;

  /// Makes what follows fail as too slow after this many seconds from now.
  void allow(double seconds);
  [[nodiscard]] bool outOfTime() const;

  /// Has every read from now on ask the block; after its first false all reads fail.
  void heed(ContinueBlock block);
  /// Asks as well, for work between the reads. False for good after the first false.
  [[nodiscard]] bool goesOn();

  /// Fills in what the header does not say about the streams, by reading and decoding the start of the file.
  /// Once is enough: later calls find nothing to do.
  Result<void> findStreamInfo();

  /// Bytes of the file at an offset, past the library; fewer at the end.
  [[nodiscard]] std::size_t readAt(std::uint64_t offset, void* bytes, std::size_t count) const;

 private:
  struct Source;
  explicit Input(std::unique_ptr<Source> source);

  std::unique_ptr<Source> _source;  // outlives the context that reads from it
  FormatContext _context;
  bool _hasStreamInfo = false;
};

/// Opens a decoder for the stream, bounded, with this many threads.
Result<CodecContext> openDecoder(const AVStream& stream, int threads, const std::filesystem::path& file);

}  // namespace quilt::platform::ffmpeg
