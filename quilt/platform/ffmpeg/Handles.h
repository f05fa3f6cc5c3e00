// SPDX-License-Identifier: Apache-2.0
#pragma once

extern "C" {
#include <libavcodec/avcodec.h>
#include <libavfilter/avfilter.h>
#include <libavformat/avformat.h>
#include <libswresample/swresample.h>
#include <libswscale/swscale.h>
}

#include <memory>

namespace quilt::platform::ffmpeg {

/// Calls a function of the library that takes the address of a pointer and clears it.
template <auto Free>
struct FreeByAddress {
  template <class T>
  void operator()(T* object) const {
    Free(&object);
  }
};

template <auto Free>
struct FreeByPointer {
  template <class T>
  void operator()(T* object) const {
    Free(object);
  }
};

using FormatContext = std::unique_ptr<AVFormatContext, FreeByAddress<avformat_close_input>>;
using CodecContext = std::unique_ptr<AVCodecContext, FreeByAddress<avcodec_free_context>>;
using Frame = std::unique_ptr<AVFrame, FreeByAddress<av_frame_free>>;
using Packet = std::unique_ptr<AVPacket, FreeByAddress<av_packet_free>>;
using FilterGraph = std::unique_ptr<AVFilterGraph, FreeByAddress<avfilter_graph_free>>;
using Resampler = std::unique_ptr<SwrContext, FreeByAddress<swr_free>>;
using Scaler = std::unique_ptr<SwsContext, FreeByPointer<sws_freeContext>>;

/// Name and value pairs for the library, which takes out what it understands.
class Options {
 public:
  Options() = default;
  Options(const Options&) = delete;
  Options& operator=(const Options&) = delete;
  ~Options() { av_dict_free(&_entries); }

  void set(const char* name, const char* value) { av_dict_set(&_entries, name, value, 0); }
  void set(const char* name, std::int64_t value) { av_dict_set_int(&_entries, name, value, 0); }
  AVDictionary** address() { return &_entries; }

 private:
  AVDictionary* _entries = nullptr;
};

/// `value` ticks of `base` in seconds.
inline double seconds(std::int64_t value, AVRational base) { return static_cast<double>(value) * base.num / base.den; }

}  // namespace quilt::platform::ffmpeg
