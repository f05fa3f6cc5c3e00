// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>

/// What a movie or a sound file may ask of this process. Files come from strangers; past a limit they count as damaged.
namespace quilt::platform::ffmpeg {

inline constexpr std::int64_t kMaximumPictureSide = 32768;            ///< pixels
inline constexpr std::int64_t kMaximumPicturePixels = 8192LL * 8192;  ///< twice the area of 8K video; 256 MiB as RGBA
inline constexpr int kMaximumStreams = 128;
inline constexpr std::size_t kMaximumChapters = 10'000;
inline constexpr std::size_t kMaximumTagBytes = std::size_t{64} << 10;
inline constexpr std::size_t kMaximumPictureFileBytes = 64U << 20U;  ///< an attached cover
inline constexpr double kMaximumDuration = 366.0 * 24 * 3600;        ///< seconds; a longer claim is not believed
inline constexpr std::int64_t kProbeBytes = 5'000'000;               ///< read to find out what the streams are
inline constexpr std::int64_t kProbeMicroseconds = 5'000'000;        ///< of media, for the same

inline constexpr double kInspectionSeconds = 15;  ///< from opening to the facts
inline constexpr double kMeasuringSeconds = 3;    ///< reading packets when the duration in the header cannot be trusted
inline constexpr double kFrameSeconds = 30;       ///< from asking for a frame to having it
inline constexpr double kPacketSeconds = 30;  ///< from asking for a packet to having it, however long the whole takes
inline constexpr std::size_t kHeldPacketBytes = 64U << 20U;  ///< packets between a key frame and the frame asked for

inline constexpr std::uint64_t kMaximumSamplePoints = 100'000'000;  ///< of a samples file: six days at 48 kHz

}  // namespace quilt::platform::ffmpeg
