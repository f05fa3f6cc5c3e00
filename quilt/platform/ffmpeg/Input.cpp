// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/Input.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <mutex>
#include <utility>
#include <vector>

#include "quilt/platform/ffmpeg/Failure.h"
#include "quilt/platform/ffmpeg/Limits.h"

namespace quilt::platform::ffmpeg {

namespace {

using SteadyClock = std::chrono::steady_clock;

constexpr int kReadBufferBytes = 32 * 1024;

// Containers of sound and pictures only: no playlists (hls, dash, concat), image sequences, subtitles, scripts or
// devices.
constexpr const char* kPermittedFormats =
    "mov,mp3,aiff,wav,w64,avi,matroska,mpeg,mpegts,mpegvideo,flv,ogg,flac,aac,ac3,eac3,amr,amrnb,amrwb,caf,asf,dv,au";

// Some formats name other files to read. None is.
int refuseToOpen(AVFormatContext*, AVIOContext**, const char*, int, AVDictionary**) { return AVERROR(EPERM); }

}  // namespace

struct Input::Source {
  std::filesystem::path path;
  int descriptor = -1;
  std::int64_t size = 0;
  std::int64_t position = 0;
  SteadyClock::time_point deadline;
  ContinueBlock block;
  bool isCancelled = false;
  AVIOContext* io = nullptr;

  Source() = default;
  Source(const Source&) = delete;
  Source& operator=(const Source&) = delete;
  ~Source() {
    if (io != nullptr) av_freep(&io->buffer);
    avio_context_free(&io);
    if (descriptor >= 0) close(descriptor);
  }

  [[nodiscard]] bool outOfTime() const { return SteadyClock::now() > deadline; }

  bool goesOn() {
    isCancelled = isCancelled || (block && !block());
    return !isCancelled;
  }

  static int isInterrupted(void* opaque) {
    auto& source = *static_cast<Source*>(opaque);
    return source.outOfTime() || !source.goesOn() ? 1 : 0;
  }

  static int read(void* opaque, std::uint8_t* bytes, int count) {
    auto& source = *static_cast<Source*>(opaque);
    if (source.outOfTime() || !source.goesOn()) return AVERROR_EXIT;
    ssize_t got = 0;
    do {
      got = pread(source.descriptor, bytes, static_cast<std::size_t>(count), source.position);
    } while (got < 0 && errno == EINTR);
    if (got < 0) return AVERROR(EIO);
    if (got == 0) return AVERROR_EOF;
    source.position += got;
    return static_cast<int>(got);
  }

  static std::int64_t seek(void* opaque, std::int64_t offset, int whence) {
    auto& source = *static_cast<Source*>(opaque);
    std::int64_t base = 0;
    switch (whence & ~AVSEEK_FORCE) {
      case AVSEEK_SIZE:
        return source.size;
      case SEEK_SET:
        break;
      case SEEK_CUR:
        base = source.position;
        break;
      case SEEK_END:
        base = source.size;
        break;
      default:
        return AVERROR(EINVAL);
    }
    std::int64_t target = 0;
    if (__builtin_add_overflow(base, offset, &target) || target < 0) return AVERROR(EINVAL);
    return source.position = target;
  }
};

Input::Input(std::unique_ptr<Source> source) : _source(std::move(source)) {}
Input::Input(Input&&) noexcept = default;
Input::~Input() = default;

Input& Input::operator=(Input&& other) noexcept {
  _context = std::move(other._context);  // before the source that it reads from
  _source = std::move(other._source);
  _hasStreamInfo = other._hasStreamInfo;
  return *this;
}

Result<Input> Input::open(const std::filesystem::path& path, double seconds) {
  static std::once_flag silenced;  // the library's complaints on the error stream help nobody; errors are answered
  std::call_once(silenced, [] { av_log_set_level(AV_LOG_QUIET); });

  auto source = std::make_unique<Source>();
  source->path = path;
  // Not waiting: opening a pipe would block for ever.
  source->descriptor = ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
  if (source->descriptor < 0) return failure(AVERROR(errno), path);
  struct stat status {};
  if (fstat(source->descriptor, &status) != 0) return failure(AVERROR(errno), path);
  if (!S_ISREG(status.st_mode)) return failure(AVERROR_DEMUXER_NOT_FOUND, path);
  source->size = status.st_size;

  auto* buffer = static_cast<unsigned char*>(av_malloc(kReadBufferBytes));
  if (buffer == nullptr) return failure(AVERROR(ENOMEM), path);
  source->io = avio_alloc_context(buffer, kReadBufferBytes, 0, source.get(), &Source::read, nullptr, &Source::seek);
  if (source->io == nullptr) {
    av_free(buffer);
    return failure(AVERROR(ENOMEM), path);
  }

  Input input(std::move(source));
  input.allow(seconds);
  AVFormatContext* context = avformat_alloc_context();
  if (context == nullptr) return failure(AVERROR(ENOMEM), path);
  context->pb = input._source->io;
  context->io_open = refuseToOpen;
  context->interrupt_callback = {&Source::isInterrupted, input._source.get()};
  context->max_streams = kMaximumStreams;
  context->probesize = kProbeBytes;
  context->max_analyze_duration = kProbeMicroseconds;
  Options options;
  options.set("format_whitelist", kPermittedFormats);
  options.set("protocol_whitelist", "none");
  options.set("enable_drefs", "0");
  options.set("use_absolute_path", "0");
  // The name's extension helps to tell the format; nothing is opened by this name.
  const int code = avformat_open_input(&context, path.filename().c_str(), nullptr, options.address());
  if (code < 0) return failure(input.outOfTime() ? AVERROR_EXIT : code, path);  // the context is freed
  input._context.reset(context);
  return input;
}

const std::filesystem::path& Input::path() const { return _source->path; }
std::uint64_t Input::size() const { return static_cast<std::uint64_t>(_source->size); }
bool Input::outOfTime() const { return _source->outOfTime(); }
void Input::heed(ContinueBlock block) { _source->block = std::move(block); }
bool Input::goesOn() { return _source->goesOn(); }

bool Input::isMovieFamily() const { return std::string_view(_context->iformat->name).starts_with("mov,"); }

void Input::allow(double seconds) {
  _source->deadline =
      SteadyClock::now() + std::chrono::duration_cast<SteadyClock::duration>(std::chrono::duration<double>(seconds));
}

Result<void> Input::findStreamInfo() {
  if (_hasStreamInfo) return {};  // the library reads memory that it has freed when asked a second time
  const unsigned count = _context->nb_streams;
  std::vector<AVDictionary*> options(std::max(count, 1U), nullptr);
  for (AVDictionary*& option : options) {
    av_dict_set_int(&option, "max_pixels", kMaximumPicturePixels, 0);
    av_dict_set(&option, "threads", "1", 0);
  }
  const int code = avformat_find_stream_info(_context.get(), options.data());
  for (AVDictionary*& option : options) av_dict_free(&option);
  if (outOfTime()) return failure(AVERROR_EXIT, path());
  if (code < 0) return failure(code, path());
  _hasStreamInfo = true;
  return {};
}

std::size_t Input::readAt(std::uint64_t offset, void* bytes, std::size_t count) const {
  if (offset > size()) return 0;
  ssize_t got = 0;
  do {
    got = pread(_source->descriptor, bytes, count, static_cast<off_t>(offset));
  } while (got < 0 && errno == EINTR);
  return got < 0 ? 0 : static_cast<std::size_t>(got);
}

Result<CodecContext> openDecoder(const AVStream& stream, int threads, const std::filesystem::path& file) {
  const AVCodec* codec = avcodec_find_decoder(stream.codecpar->codec_id);
  if (codec == nullptr) return failure(AVERROR_DECODER_NOT_FOUND, file);
  CodecContext context(avcodec_alloc_context3(codec));
  if (!context) return failure(AVERROR(ENOMEM), file);
  if (const int code = avcodec_parameters_to_context(context.get(), stream.codecpar); code < 0) {
    return failure(code, file);
  }
  context->pkt_timebase = stream.time_base;
  context->thread_count = threads;
  context->max_pixels = kMaximumPicturePixels;
  if (const int code = avcodec_open2(context.get(), codec, nullptr); code < 0) return failure(code, file);
  return context;
}

}  // namespace quilt::platform::ffmpeg
