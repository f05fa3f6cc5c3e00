// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "quilt/platform/base/Result.h"
#include "quilt/platform/ffmpeg/Handles.h"
#include "quilt/platform/ffmpeg/TemporaryOutput.h"
#include "quilt/platform/ffmpeg/TranscodeProgress.h"
#include "quilt/platform/interfaces/FDYMedia.h"

namespace quilt::platform::ffmpeg {

enum class OutputKind { Movie, Sound };

/// An MPEG-4 file that is being made, its index before its media. It takes its place when it is complete; until then
/// it is a hidden file beside it, which goes when this object does.
class MovieOutput {
 public:
  /// `duration` in seconds, 0 when unknown, is what there will be. `progress` must outlive the object; once that is
  /// stopped every call fails.
  static Result<std::unique_ptr<MovieOutput>> create(const std::filesystem::path& destination, OutputKind kind,
                                                     double duration, TranscodeProgress& progress);
  ~MovieOutput();
  MovieOutput(const MovieOutput&) = delete;
  MovieOutput& operator=(const MovieOutput&) = delete;

  /// What comes before `begin`. Language, name and purpose are those of `source`.
  Result<AVStream*> addStream(const AVStream& source, const AVCodecParameters& parameters, AVRational timeBase);
  /// The same for what an encoder makes.
  Result<AVStream*> addStream(const AVStream& source, const AVCodecContext& encoder);
  void setTag(const char* name, const std::string& value);
  /// In order of time, none at or after the end.
  Result<void> setChapters(const std::vector<Chapter>& chapters);

  Result<void> begin();
  /// Takes the packet's content; its times are ticks of `timeBase`. Packets of a stream come in decoding order.
  Result<void> write(AVPacket& packet, const AVStream& stream, AVRational timeBase);
  /// Completes the file and puts it in its place, replacing what is there.
  Result<void> finish();

 private:
  MovieOutput(TemporaryOutput file, std::filesystem::path destination, double duration, TranscodeProgress& progress);
  int open(OutputKind kind);
  [[nodiscard]] Error errorOf(int code) const;

  static int writeBytes(void* self, std::uint8_t* bytes, int count);
  static std::int64_t seek(void* self, std::int64_t offset, int whence);
  static int openForReading(AVFormatContext* context, AVIOContext** io, const char* name, int flags, AVDictionary**);
  static int closeReader(AVFormatContext* context, AVIOContext* io);

  TemporaryOutput _file;
  std::filesystem::path _destination;
  double _duration;
  TranscodeProgress& _progress;
  std::int64_t _position = 0;
  std::int64_t _size = 0;
  std::optional<Error> _writeError;  // the first one
  AVFormatContext* _context = nullptr;
};

}  // namespace quilt::platform::ffmpeg
