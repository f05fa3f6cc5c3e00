// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <vector>

#include "quilt/platform/base/Result.h"
#include "quilt/platform/ffmpeg/Handles.h"
#include "quilt/platform/ffmpeg/MovieOutput.h"

namespace quilt::platform::ffmpeg {

/// Files that are made in one pass; each outlives the tracks in it.
using Outputs = std::vector<MovieOutput*>;

/// The same stream in each of several files.
class Track {
 public:
  /// @{
  /// Adds the stream to the files, as MovieOutput::addStream() does.
  static Result<Track> add(const Outputs& outputs, const AVStream& source, const AVCodecParameters& parameters,
                           AVRational timeBase);
  static Result<Track> add(const Outputs& outputs, const AVStream& source, const AVCodecContext& encoder);
  /// @}

  /// Takes the packet's content; its times are ticks of `timeBase`.
  Result<void> write(AVPacket& packet, AVRational timeBase);

 private:
  struct Place {
    MovieOutput* output;
    const AVStream* stream;
  };
  template <class... Description>
  static Result<Track> addTo(const Outputs& outputs, const Description&... description);

  std::vector<Place> _places;
};

}  // namespace quilt::platform::ffmpeg
