// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/MovieOutput.h"

extern "C" {
#include <libavutil/opt.h>
}

#include <algorithm>
#include <cmath>
#include <cstring>
#include <string_view>
#include <utility>

#include "quilt/platform/ffmpeg/Failure.h"

namespace quilt::platform::ffmpeg {

namespace {

constexpr int kWriteBufferBytes = 256 * 1024;

void freeIo(AVIOContext* io) {
  if (io == nullptr) return;
  av_freep(&io->buffer);
  avio_context_free(&io);
}

AVIOContext* makeIo(void* opaque, bool isWritten, int (*read)(void*, std::uint8_t*, int),
                    int (*write)(void*, std::uint8_t*, int), std::int64_t (*seek)(void*, std::int64_t, int)) {
  auto* buffer = static_cast<unsigned char*>(av_malloc(kWriteBufferBytes));
  if (buffer == nullptr) return nullptr;
  AVIOContext* io = avio_alloc_context(buffer, kWriteBufferBytes, isWritten ? 1 : 0, opaque, read, write, seek);
  if (io == nullptr) av_free(buffer);
  return io;
}

// Positions in a file of `size` bytes, as the library asks for them.
std::int64_t sought(std::int64_t position, std::int64_t size, std::int64_t offset, int whence) {
  switch (whence & ~AVSEEK_FORCE) {
    case AVSEEK_SIZE:
      return size;
    case SEEK_SET:
      return offset;
    case SEEK_CUR:
      return position + offset;
    case SEEK_END:
      return size + offset;
    default:
      return AVERROR(EINVAL);
  }
}

// Reads what was written, while the index is moved to the front.
struct Reader {
  const TemporaryOutput& file;
  TranscodeProgress& progress;
  std::int64_t size;
  std::int64_t position = 0;

  static int read(void* self, std::uint8_t* bytes, int count) {
    auto& reader = *static_cast<Reader*>(self);
    if (!reader.progress.goOn()) return AVERROR_EXIT;
    const std::int64_t got = reader.file.readAt(reader.position, bytes, static_cast<std::size_t>(count));
    if (got < 0) return AVERROR(EIO);
    if (got == 0) return AVERROR_EOF;
    reader.position += got;
    return static_cast<int>(got);
  }
  static std::int64_t seek(void* self, std::int64_t offset, int whence) {
    auto& reader = *static_cast<Reader*>(self);
    const std::int64_t target = sought(reader.position, reader.size, offset, whence);
    if (target >= 0 && (whence & AVSEEK_SIZE) == 0) reader.position = target;
    return target;
  }
};

}  // namespace

Result<std::unique_ptr<MovieOutput>> MovieOutput::create(const std::filesystem::path& destination, OutputKind kind,
                                                         double duration, TranscodeProgress& progress) {
  Result<TemporaryOutput> file = TemporaryOutput::create(destination);
  if (!file) return file.error();
  std::unique_ptr<MovieOutput> output(new MovieOutput(*std::move(file), destination, duration, progress));
  if (const int code = output->open(kind); code < 0) return failure(code, destination);
  return output;
}

MovieOutput::MovieOutput(TemporaryOutput file, std::filesystem::path destination, double duration,
                         TranscodeProgress& progress)
    : _file(std::move(file)), _destination(std::move(destination)), _duration(duration), _progress(progress) {}

MovieOutput::~MovieOutput() {
  if (_context == nullptr) return;
  AVIOContext* io = std::exchange(_context->pb, nullptr);
  avformat_free_context(_context);
  freeIo(io);
}

int MovieOutput::open(OutputKind kind) {
  if (const int code = avformat_alloc_output_context2(&_context, nullptr, "mp4", "output"); code < 0) return code;
  _context->opaque = this;
  _context->io_open = &openForReading;
  _context->io_close2 = &closeReader;
  _context->flags |= AVFMT_FLAG_CUSTOM_IO | AVFMT_FLAG_BITEXACT;
  av_opt_set(_context->priv_data, "brand", kind == OutputKind::Movie ? "M4V " : "M4A ", 0);
  av_opt_set(_context->priv_data, "movflags", "+faststart", 0);
  _context->pb = makeIo(this, true, nullptr, &writeBytes, &seek);
  return _context->pb == nullptr ? AVERROR(ENOMEM) : 0;
}

Error MovieOutput::errorOf(int code) const {
  if (_progress.isStopped()) return TranscodeProgress::stopped(_destination);
  return _writeError ? *_writeError : conversionFailure(code, _destination);
}

int MovieOutput::writeBytes(void* self, std::uint8_t* bytes, int count) {
  auto& output = *static_cast<MovieOutput*>(self);
  if (!output._progress.goOn()) return AVERROR_EXIT;
  const std::string_view view(reinterpret_cast<const char*>(bytes), static_cast<std::size_t>(count));
  if (const Result<void> written = output._file.writeAt(static_cast<std::uint64_t>(output._position), view); !written) {
    if (!output._writeError) output._writeError = written.error();
    return AVERROR(EIO);
  }
  output._position += count;
  output._size = std::max(output._size, output._position);
  return count;
}

std::int64_t MovieOutput::seek(void* self, std::int64_t offset, int whence) {
  auto& output = *static_cast<MovieOutput*>(self);
  const std::int64_t target = sought(output._position, output._size, offset, whence);
  if (target >= 0 && (whence & AVSEEK_SIZE) == 0) output._position = target;
  return target;
}

int MovieOutput::openForReading(AVFormatContext* context, AVIOContext** io, const char* /*name*/, int flags,
                                AVDictionary** /*options*/) {
  if ((flags & AVIO_FLAG_WRITE) != 0) return AVERROR(EPERM);
  auto& output = *static_cast<MovieOutput*>(context->opaque);
  auto reader = std::make_unique<Reader>(Reader{output._file, output._progress, output._size});
  *io = makeIo(reader.get(), false, &Reader::read, nullptr, &Reader::seek);
  if (*io == nullptr) return AVERROR(ENOMEM);
  static_cast<void>(reader.release());  // freed by closeReader
  return 0;
}

int MovieOutput::closeReader(AVFormatContext* /*context*/, AVIOContext* io) {
  if (io != nullptr) delete static_cast<Reader*>(io->opaque);  // NOLINT(cppcoreguidelines-owning-memory)
  freeIo(io);
  return 0;
}

Result<AVStream*> MovieOutput::addStream(const AVStream& source, const AVCodecParameters& parameters,
                                         AVRational timeBase) {
  AVStream* stream = avformat_new_stream(_context, nullptr);
  if (stream == nullptr) return failure(AVERROR(ENOMEM), _destination);
  if (const int code = avcodec_parameters_copy(stream->codecpar, &parameters); code < 0) return errorOf(code);
  stream->codecpar->codec_tag = 0;  // of the other container
  stream->time_base = timeBase;
  stream->disposition = source.disposition;
  if (const AVDictionaryEntry* language = av_dict_get(source.metadata, "language", nullptr, 0)) {
    av_dict_set(&stream->metadata, "language", language->value, 0);
  }
  return stream;
}

Result<AVStream*> MovieOutput::addStream(const AVStream& source, const AVCodecContext& encoder) {
  AVCodecParameters* parameters = avcodec_parameters_alloc();
  if (parameters == nullptr) return failure(AVERROR(ENOMEM), _destination);
  const int code = avcodec_parameters_from_context(parameters, &encoder);
  Result<AVStream*> stream =
      code < 0 ? Result<AVStream*>(failure(code, _destination)) : addStream(source, *parameters, encoder.time_base);
  avcodec_parameters_free(&parameters);
  if (stream && encoder.codec_type == AVMEDIA_TYPE_VIDEO) {
    (*stream)->avg_frame_rate = encoder.framerate;
    (*stream)->sample_aspect_ratio = encoder.sample_aspect_ratio;
  }
  return stream;
}

void MovieOutput::setTag(const char* name, const std::string& value) {
  av_dict_set(&_context->metadata, name, value.c_str(), 0);
}

Result<void> MovieOutput::setChapters(const std::vector<Chapter>& chapters) {
  if (chapters.empty() || _duration <= 0) return {};
  constexpr AVRational thousandths{1, 1000};
  const auto ticks = [](double time) { return std::llround(time * thousandths.den); };
  // Freed with the context.
  _context->chapters = static_cast<AVChapter**>(av_calloc(chapters.size(), sizeof(AVChapter*)));
  if (_context->chapters == nullptr) return failure(AVERROR(ENOMEM), _destination);
  for (std::size_t i = 0; i < chapters.size(); ++i) {
    const double end = i + 1 < chapters.size() ? chapters[i + 1].start : _duration;
    auto* chapter = static_cast<AVChapter*>(av_mallocz(sizeof(AVChapter)));
    if (chapter == nullptr) return failure(AVERROR(ENOMEM), _destination);
    chapter->id = static_cast<std::int64_t>(i);
    chapter->time_base = thousandths;
    chapter->start = ticks(chapters[i].start);
    chapter->end = ticks(end);
    av_dict_set(&chapter->metadata, "title", chapters[i].name.c_str(), 0);
    _context->chapters[_context->nb_chapters++] = chapter;
  }
  return {};
}

Result<void> MovieOutput::begin() {
  const int code = avformat_write_header(_context, nullptr);
  return code < 0 ? Result<void>(errorOf(code)) : Result<void>();
}

Result<void> MovieOutput::write(AVPacket& packet, const AVStream& stream, AVRational timeBase) {
  av_packet_rescale_ts(&packet, timeBase, stream.time_base);
  packet.stream_index = stream.index;
  packet.pos = -1;
  if (stream.index == 0 && _duration > 0) _progress.reachOutput(seconds(packet.dts, stream.time_base) / _duration);
  const int code = av_interleaved_write_frame(_context, &packet);
  if (code < 0 || _writeError || !_progress.goOn()) return errorOf(code);
  return {};
}

Result<void> MovieOutput::finish() {
  const int code = av_write_trailer(_context);
  if (code < 0 || _writeError || _progress.isStopped()) return errorOf(code);
  return _file.publish();
}

}  // namespace quilt::platform::ffmpeg
