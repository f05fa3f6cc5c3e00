// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <map>

#include "quilt/platform/ffmpeg/Handles.h"

namespace quilt::platform::ffmpeg {

/// Moves the times of a file's packets so that the file starts at zero and runs on without leaps: where recordings were
/// joined or a counter started anew, what follows continues where the rest ended. All streams move together.
class SourceTimeline {
 public:
  /// `origin` is the file's start in seconds. Where `leaps` is false, times are believed however far apart they are,
  /// up to `end`, the file's duration in seconds (0 when unknown).
  SourceTimeline(double origin, bool leaps, double end);

  /// Stamps the packet anew, in ticks of `base`.
  void place(AVPacket& packet, AVRational base);

 private:
  [[nodiscard]] bool isLeap(double time, double expected) const;
  double shiftFor(int stream, double time);

  double _shift;        // seconds, added to each time
  double _shiftBefore;  // of what came before the latest leap
  bool _leaps;
  double _end;
  std::map<int, double> _streams;  // where the latest packet of each ended
};

/// Gives pictures in the order in which they are shown times that rise, and drops those that come faster than 60 a
/// second. Times are ticks of `base`.
class FrameClock {
 public:
  /// What happens when the first picture comes late.
  enum class Start {
    Lengthened,  ///< it is shown from zero on; there is sound beside it
    Moved,       ///< all come as much earlier
  };
  FrameClock(AVRational base, AVRational usualRate, Start start);

  /// The picture's time, or AV_NOPTS_VALUE when it is to be dropped. The first starts at zero.
  std::int64_t place(std::int64_t time);
  /// How long a picture lasts that nothing tells of.
  [[nodiscard]] std::int64_t usualDuration() const { return _usual; }

 private:
  std::int64_t _usual;
  double _shortest;  // ticks between two pictures at the highest rate
  double _due = 0;   // when the next picture may come
  Start _start;
  std::int64_t _shift = 0;
  bool _hasBegun = false;
  std::int64_t _last = 0;
};

}  // namespace quilt::platform::ffmpeg
