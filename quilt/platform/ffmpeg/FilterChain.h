// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <string>

#include "quilt/platform/base/Result.h"
#include "quilt/platform/ffmpeg/Handles.h"

namespace quilt::platform::ffmpeg {

/// Filters of the library in a row, for frames of one kind. Where a stream changes in the middle, the next frames need
/// a chain of their own.
class FilterChain {
 public:
  /// For frames like `frame`, whose times are ticks of `timeBase`. An empty row of filters passes frames on.
  static Result<FilterChain> create(const AVFrame& frame, AVRational timeBase, const std::string& filters,
                                    const std::filesystem::path& file);

  /// Whether frames like this one are what the chain is for.
  [[nodiscard]] bool fits(const AVFrame& frame) const;

  /// Takes the frame's content; null says that there are no more. Answers an error code or 0.
  int push(AVFrame* frame);
  /// Fills an empty frame; answers an error code, AVERROR(EAGAIN) when more has to be pushed first.
  int pull(AVFrame& frame);

  /// Of the frames that come out.
  [[nodiscard]] AVRational timeBase() const;
  /// Makes sound come out in pieces of this many samples, but for the last one.
  void setFrameSize(int samples);

 private:
  FilterChain() = default;

  FilterGraph _graph;
  AVFilterContext* _source = nullptr;
  AVFilterContext* _sink = nullptr;
  Frame _model;  // the properties alone, of what the chain is for
};

}  // namespace quilt::platform::ffmpeg
