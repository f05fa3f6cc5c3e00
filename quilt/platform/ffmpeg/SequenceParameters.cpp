// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/SequenceParameters.h"

#include <array>
#include <vector>

#include "quilt/platform/ffmpeg/Limits.h"

namespace quilt::platform::ffmpeg {

namespace {

// Reads bits from the most significant down. Past the end it gives zeros and `failed` is set.
class BitReader {
 public:
  explicit BitReader(std::span<const std::uint8_t> bytes) : _bytes(bytes) {}

  std::uint32_t bits(int count) {
    std::uint32_t value = 0;
    for (; count > 0; --count) value = value << 1U | bit();
    return value;
  }
  bool flag() { return bit() != 0; }

  // Exponential-Golomb codes.
  std::uint32_t unsignedCode() {
    int zeros = 0;
    while (!_failed && bit() == 0) {
      if (++zeros > 31) _failed = true;
    }
    return _failed ? 0 : (1U << static_cast<unsigned>(zeros)) - 1 + bits(zeros);
  }
  std::int32_t signedCode() {
    const std::uint32_t code = unsignedCode();
    const auto half = static_cast<std::int32_t>(code / 2 + code % 2);
    return code % 2 == 1 ? half : -half;
  }
  [[nodiscard]] bool failed() const { return _failed; }

 private:
  std::uint32_t bit() {
    if (_position >= _bytes.size() * 8) {
      _failed = true;
      return 0;
    }
    const std::uint32_t value = _bytes[_position / 8] >> (7 - _position % 8) & 1U;
    ++_position;
    return value;
  }

  std::span<const std::uint8_t> _bytes;
  std::size_t _position = 0;
  bool _failed = false;
};

// Without the 3 that keeps two zero bytes and a small one from looking like a start code.
std::vector<std::uint8_t> withoutEmulationPrevention(std::span<const std::uint8_t> unit) {
  std::vector<std::uint8_t> result;
  result.reserve(unit.size());
  int zeros = 0;
  for (const std::uint8_t byte : unit) {
    if (zeros >= 2 && byte == 3) {
      zeros = 0;
      continue;
    }
    zeros = byte == 0 ? zeros + 1 : 0;
    result.push_back(byte);
  }
  return result;
}

bool hasChromaFormat(std::uint32_t profile) {
  switch (profile) {
    case 100:
    case 110:
    case 122:
    case 244:
    case 44:
    case 83:
    case 86:
    case 118:
    case 128:
    case 138:
    case 139:
    case 134:
    case 135:
      return true;
    default:
      return false;
  }
}

void skipScalingList(BitReader& reader, int size) {
  int last = 8;
  int next = 8;
  for (int i = 0; i < size && !reader.failed(); ++i) {
    if (next != 0) next = (last + reader.signedCode() % 256 + 256) % 256;
    if (next != 0) last = next;
  }
}

AVRational pixelShape(BitReader& reader) {
  static constexpr std::array<AVRational, 17> table{{{0, 1},
                                                     {1, 1},
                                                     {12, 11},
                                                     {10, 11},
                                                     {16, 11},
                                                     {40, 33},
                                                     {24, 11},
                                                     {20, 11},
                                                     {32, 11},
                                                     {80, 33},
                                                     {18, 11},
                                                     {15, 11},
                                                     {64, 33},
                                                     {160, 99},
                                                     {4, 3},
                                                     {3, 2},
                                                     {2, 1}}};
  constexpr std::uint32_t explicitShape = 255;
  const std::uint32_t index = reader.bits(8);
  if (index < table.size()) return table[index];
  if (index != explicitShape) return {0, 1};
  const auto width = static_cast<int>(reader.bits(16));
  const auto height = static_cast<int>(reader.bits(16));
  return width > 0 && height > 0 ? AVRational{width, height} : AVRational{0, 1};
}

std::optional<SequenceParameters> readParameterSet(BitReader reader) {
  SequenceParameters result;
  const std::uint32_t profile = reader.bits(8);
  reader.bits(16);        // constraints, level
  reader.unsignedCode();  // identifier
  bool separatePlanes = false;
  if (hasChromaFormat(profile)) {
    result.chromaFormat = static_cast<int>(reader.unsignedCode());
    if (result.chromaFormat > 3) return std::nullopt;
    if (result.chromaFormat == 3) separatePlanes = reader.flag();
    result.bitDepth = static_cast<int>(reader.unsignedCode()) + 8;
    reader.unsignedCode();  // chroma depth
    reader.flag();          // lossless
    if (reader.flag()) {
      const int lists = result.chromaFormat == 3 ? 12 : 8;
      for (int i = 0; i < lists && !reader.failed(); ++i) {
        if (reader.flag()) skipScalingList(reader, i < 6 ? 16 : 64);
      }
    }
  }
  reader.unsignedCode();  // frame number length
  const std::uint32_t order = reader.unsignedCode();
  if (order == 0) {
    reader.unsignedCode();
  } else if (order == 1) {
    reader.flag();
    reader.signedCode();
    reader.signedCode();
    const std::uint32_t count = reader.unsignedCode();
    if (count > 255) return std::nullopt;
    for (std::uint32_t i = 0; i < count; ++i) reader.signedCode();
  }
  reader.unsignedCode();  // reference frames
  reader.flag();          // gaps
  const std::int64_t columns = std::int64_t{reader.unsignedCode()} + 1;
  const std::int64_t rows = std::int64_t{reader.unsignedCode()} + 1;
  const bool framesOnly = reader.flag();
  if (!framesOnly) reader.flag();
  reader.flag();  // direct 8 × 8
  std::int64_t width = columns * 16;
  std::int64_t height = rows * 16 * (framesOnly ? 1 : 2);
  if (width > kMaximumPictureSide || height > kMaximumPictureSide) return std::nullopt;
  if (reader.flag()) {
    const int chroma = separatePlanes ? 0 : result.chromaFormat;
    const std::int64_t unitX = chroma == 1 || chroma == 2 ? 2 : 1;
    const std::int64_t unitY = std::int64_t{chroma == 1 ? 2 : 1} * (framesOnly ? 1 : 2);
    const std::int64_t left = reader.unsignedCode();
    const std::int64_t right = reader.unsignedCode();
    const std::int64_t top = reader.unsignedCode();
    const std::int64_t bottom = reader.unsignedCode();
    width -= (left + right) * unitX;
    height -= (top + bottom) * unitY;
  }
  if (reader.flag()) {  // display properties
    if (reader.flag()) result.pixelShape = pixelShape(reader);
    if (reader.flag()) reader.flag();  // overscan
    if (reader.flag()) {               // signal type
      reader.bits(4);
      if (reader.flag()) {
        reader.bits(8);  // primaries
        result.transfer = static_cast<int>(reader.bits(8));
      }
    }
  }
  if (reader.failed() || width <= 0 || height <= 0) return std::nullopt;
  result.width = static_cast<int>(width);
  result.height = static_cast<int>(height);
  return result;
}

}  // namespace

std::optional<SequenceParameters> readSequenceParameters(std::span<const std::uint8_t> configuration) {
  // version, profile, compatibility, level, length size, count; then length and unit
  if (configuration.size() < 9 || configuration[0] != 1 || (configuration[5] & 0x1fU) == 0) return std::nullopt;
  const std::size_t length = static_cast<std::size_t>(configuration[6]) << 8U | configuration[7];
  if (length < 4 || length > configuration.size() - 8) return std::nullopt;
  constexpr unsigned sequenceParameterSet = 7;
  if ((configuration[8] & 0x1fU) != sequenceParameterSet) return std::nullopt;
  const std::vector<std::uint8_t> unit = withoutEmulationPrevention(configuration.subspan(9, length - 1));
  return readParameterSet(BitReader(unit));
}

}  // namespace quilt::platform::ffmpeg
