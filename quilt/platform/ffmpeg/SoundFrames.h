// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/ffmpeg/Handles.h"

namespace quilt::platform::ffmpeg {

/// The frames of sound in a packet, one after the other. Phones pack a second of speech into each packet, of which the
/// library's decoders would hear the first frame only; packets of other codecs are passed on whole.
class SoundFrames {
 public:
  /// Both must outlive it.
  SoundFrames(const AVStream& stream, const AVPacket& packet);

  /// The next one, valid until the call after; null at the end.
  const AVPacket* next();

 private:
  const AVStream& _stream;
  const AVPacket& _packet;
  Packet _piece;
  int _offset = 0;
  int _count = 0;
};

}  // namespace quilt::platform::ffmpeg
