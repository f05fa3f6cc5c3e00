// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/vips/JpegWriter.h"

#include <algorithm>
#include <array>
#include <bit>
#include <csetjmp>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <exception>
#include <span>
#include <utility>

#include <jpeglib.h>  // after <cstdio>, whose types it takes for granted

namespace quilt::platform::vips {

namespace {

constexpr JDIMENSION kRowsAtOnce = 16;  // are compressed together, since the colours are halved

struct Encoder {
  jpeg_compress_struct state{};
  jpeg_error_mgr errors{};
  std::jmp_buf failed{};
  jpeg_destination_mgr destination{};
  std::array<JOCTET, 1 << 16> part;  // what was not moved to `bytes` yet
  std::string bytes;
  bool isOutOfMemory = false;

  Encoder() {}
  Encoder(const Encoder&) = delete;
  Encoder& operator=(const Encoder&) = delete;
  ~Encoder() { jpeg_destroy_compress(&state); }
};

struct Look {
  bool isOpaque = true;
  bool isGrey = true;
};

// Two pixels at a time: every page is looked at.
Look lookOf(const Bitmap& bitmap) {
  using Pair = std::array<std::uint8_t, 8>;
  constexpr auto kAlphas = std::bit_cast<std::uint64_t>(Pair{0, 0, 0, 255, 0, 0, 0, 255});
  constexpr auto kRedsAndGreens = std::bit_cast<std::uint64_t>(Pair{255, 255, 0, 0, 255, 255, 0, 0});
  constexpr bool isLittle = std::endian::native == std::endian::little;
  std::uint64_t common = kAlphas;
  std::uint64_t differences = 0;
  const auto add = [&](std::uint64_t pixels) {
    common &= pixels;
    differences |= pixels ^ (isLittle ? pixels >> 8 : pixels << 8);  // of red from green, and green from blue
  };
  const std::span<const std::uint8_t> bytes = bitmap.pixels;
  std::size_t i = 0;
  for (; i + sizeof(Pair) <= bytes.size(); i += sizeof(Pair)) {
    std::uint64_t pixels = 0;
    std::memcpy(&pixels, &bytes[i], sizeof pixels);
    add(pixels);
  }
  if (i < bytes.size()) {  // the last one has no other beside it
    std::array<std::uint8_t, 4> one{};
    std::memcpy(one.data(), &bytes[i], one.size());
    add(std::bit_cast<std::uint64_t>(Pair{one[0], one[1], one[2], one[3], one[0], one[1], one[2], one[3]}));
  }
  return {common == kAlphas, (differences & kRedsAndGreens) == 0};
}

Encoder& encoderOf(void* owner) { return *static_cast<Encoder*>(owner); }

[[noreturn]] void leave(j_common_ptr state) { std::longjmp(encoderOf(state->client_data).failed, 1); }

void ignore(j_common_ptr) {}

void startPart(j_compress_ptr state) {
  Encoder& encoder = encoderOf(state->client_data);
  encoder.destination.next_output_byte = encoder.part.data();
  encoder.destination.free_in_buffer = encoder.part.size();
}

void endPart(j_compress_ptr state) {
  Encoder& encoder = encoderOf(state->client_data);
  const std::size_t length = encoder.part.size() - encoder.destination.free_in_buffer;
  try {
    encoder.bytes.append(reinterpret_cast<const char*>(encoder.part.data()), length);
  } catch (const std::exception&) {  // which must not pass libjpeg's own frames
    encoder.isOutOfMemory = true;
  }
}

boolean nextPart(j_compress_ptr state) {
  encoderOf(state->client_data).destination.free_in_buffer = 0;  // it is not kept up to date
  endPart(state);
  startPart(state);
  return TRUE;
}

// Left in its middle when libjpeg fails, so it owns nothing that needs a destructor.
bool encode(Encoder& encoder, const Bitmap& bitmap, bool isGrey) {
  jpeg_compress_struct& state = encoder.state;
  state.err = jpeg_std_error(&encoder.errors);
  encoder.errors.error_exit = leave;
  encoder.errors.output_message = ignore;
  state.client_data = &encoder;
  if (setjmp(encoder.failed) != 0) return false;
  jpeg_create_compress(&state);
  encoder.destination.init_destination = startPart;
  encoder.destination.empty_output_buffer = nextPart;
  encoder.destination.term_destination = endPart;
  state.dest = &encoder.destination;
  state.image_width = static_cast<JDIMENSION>(bitmap.width);
  state.image_height = static_cast<JDIMENSION>(bitmap.height);
  state.input_components = 4;
  state.in_color_space = JCS_EXT_RGBX;
  jpeg_set_defaults(&state);
  // As of most pages of text: without colours there is a third less to compress, and the same pixels come out.
  if (isGrey) jpeg_set_colorspace(&state, JCS_GRAYSCALE);
  jpeg_set_quality(&state, kJPEGQuality, TRUE);
  jpeg_start_compress(&state, TRUE);
  while (state.next_scanline < state.image_height) {
    JSAMPROW rows[kRowsAtOnce];
    const JDIMENSION count = std::min(kRowsAtOnce, state.image_height - state.next_scanline);
    for (JDIMENSION i = 0; i < count; ++i) {
      rows[i] = const_cast<JSAMPROW>(bitmap.pixels.data() + (state.next_scanline + i) * bitmap.width * 4);
    }
    jpeg_write_scanlines(&state, rows, count);
  }
  jpeg_finish_compress(&state);
  return !encoder.isOutOfMemory;
}

}  // namespace

std::optional<std::string> jpegOf(const Bitmap& bitmap) {
  const Look look = lookOf(bitmap);
  Encoder encoder;
  if (!look.isOpaque || !encode(encoder, bitmap, look.isGrey)) return std::nullopt;
  return std::move(encoder.bytes);
}

}  // namespace quilt::platform::vips
