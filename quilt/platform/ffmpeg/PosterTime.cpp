// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/PosterTime.h"

#include <array>
#include <cstdint>
#include <cstring>
#include <string_view>

namespace quilt::platform::ffmpeg {

namespace {

struct Box {
  std::uint64_t content;  // where it begins in the file
  std::uint64_t end;
};

std::optional<std::uint64_t> number(const Input& input, std::uint64_t offset, std::size_t bytes) {
  std::array<unsigned char, 8> buffer{};
  if (input.readAt(offset, buffer.data(), bytes) != bytes) return std::nullopt;
  std::uint64_t value = 0;
  for (std::size_t i = 0; i < bytes; ++i) value = value << 8U | buffer[i];
  return value;
}

std::optional<Box> findBox(const Input& input, Box within, std::string_view kind) {
  constexpr int mostBoxes = 1000;
  std::uint64_t offset = within.content;
  for (int i = 0; i < mostBoxes && offset + 8 <= within.end; ++i) {
    std::array<char, 4> name{};
    const std::optional<std::uint64_t> size32 = number(input, offset, 4);
    if (!size32 || input.readAt(offset + 4, name.data(), name.size()) != name.size()) return std::nullopt;
    std::uint64_t header = 8;
    std::uint64_t size = *size32;
    if (size == 1) {
      const std::optional<std::uint64_t> size64 = number(input, offset + 8, 8);
      if (!size64) return std::nullopt;
      size = *size64;
      header = 16;
    } else if (size == 0) {
      size = within.end - offset;
    }
    if (size < header || size > within.end - offset) return std::nullopt;
    if (std::string_view(name.data(), name.size()) == kind) return Box{offset + header, offset + size};
    offset += size;
  }
  return std::nullopt;
}

}  // namespace

std::optional<double> posterTime(const Input& input) {
  if (!input.isMovieFamily()) return std::nullopt;
  const std::optional<Box> movie = findBox(input, {0, input.size()}, "moov");
  const std::optional<Box> header = movie ? findBox(input, *movie, "mvhd") : std::nullopt;
  if (!header) return std::nullopt;
  const std::optional<std::uint64_t> version = number(input, header->content, 1);
  if (!version || *version > 1) return std::nullopt;
  // version and flags, two dates, time scale, duration, rate, volume, reserved, matrix, preview time and duration
  const std::uint64_t scaleOffset = 4 + (*version == 1 ? 16 : 8);
  const std::uint64_t posterOffset = scaleOffset + 4 + (*version == 1 ? 8 : 4) + 4 + 2 + 10 + 36 + 8;
  if (header->content + posterOffset + 4 > header->end) return std::nullopt;
  const std::optional<std::uint64_t> scale = number(input, header->content + scaleOffset, 4);
  const std::optional<std::uint64_t> time = number(input, header->content + posterOffset, 4);
  if (!scale || *scale == 0 || !time || *time == 0) return std::nullopt;
  return static_cast<double>(*time) / static_cast<double>(*scale);
}

}  // namespace quilt::platform::ffmpeg
