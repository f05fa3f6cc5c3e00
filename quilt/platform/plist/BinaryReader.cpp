// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/BinaryReader.h"

#include <algorithm>
#include <bit>
#include <cmath>

#include "quilt/platform/plist/Limits.h"
#include "quilt/platform/plist/XmlReader.h"
#include "quilt/platform/plist/XmlText.h"

namespace quilt::platform {

namespace {

constexpr std::size_t kTrailerSize = 32;

Error damaged(const char* text) { return {ErrorKind::Damaged, text, {}}; }

void appendUtf8(std::string& out, std::uint32_t code) {
  const auto add = [&out](std::uint32_t byte) { out += static_cast<char>(static_cast<std::uint8_t>(byte)); };
  if (code < 0x80) {
    add(code);
  } else if (code < 0x800) {
    add(0xC0U | (code >> 6U));
    add(0x80U | (code & 0x3FU));
  } else if (code < 0x10000) {
    add(0xE0U | (code >> 12U));
    add(0x80U | ((code >> 6U) & 0x3FU));
    add(0x80U | (code & 0x3FU));
  } else {
    add(0xF0U | (code >> 18U));
    add(0x80U | ((code >> 12U) & 0x3FU));
    add(0x80U | ((code >> 6U) & 0x3FU));
    add(0x80U | (code & 0x3FU));
  }
}

class Reader {
 public:
  explicit Reader(std::string_view bytes) : _bytes(bytes) {}

  Result<PropertyList> read() {
    if (_bytes.size() < kBinaryMagic.size() + kTrailerSize) return damaged("The binary property list is cut short");
    const std::size_t trailer = _bytes.size() - kTrailerSize;
    _offsetSize = number(trailer + 6, 1);
    _referenceSize = number(trailer + 7, 1);
    _count = number(trailer + 8, 8);
    const std::uint64_t top = number(trailer + 16, 8);
    _table = number(trailer + 24, 8);
    const bool sizesAreSane = _offsetSize >= 1 && _offsetSize <= 8 && _referenceSize >= 1 && _referenceSize <= 8;
    if (!sizesAreSane || _table < kBinaryMagic.size() || _table > trailer || _count > (trailer - _table) / _offsetSize)
      return damaged("The binary property list has no usable table");
    return object(top, 1);
  }

 private:
  struct Span {
    std::uint64_t start;
    std::uint64_t count;
  };

  [[nodiscard]] bool holds(std::uint64_t start, std::uint64_t length) const {
    return start <= _table && length <= _table - start;
  }

  /// Big-endian; the caller has checked the bounds.
  [[nodiscard]] std::uint64_t number(std::uint64_t at, std::uint64_t size) const {
    std::uint64_t value = 0;
    for (std::uint64_t i = 0; i < size; ++i) value = (value << 8U) | static_cast<std::uint8_t>(_bytes[at + i]);
    return value;
  }

  /// The place and the count of an object whose count stands in its marker or in an integer behind it.
  [[nodiscard]] std::optional<Span> counted(std::uint64_t at, unsigned low) const {
    if (low != 15) return Span{at + 1, low};
    if (!holds(at + 1, 1)) return std::nullopt;
    const auto marker = static_cast<std::uint8_t>(_bytes[at + 1]);
    const std::uint64_t size = std::uint64_t{1} << (marker & 15U);
    if (marker >> 4U != 1 || size > 8 || !holds(at + 2, size)) return std::nullopt;
    return Span{at + 2 + size, number(at + 2, size)};
  }

  Result<PropertyList> object(std::uint64_t index, std::size_t depth) {
    if (index >= _count) return damaged("An object of the binary property list is missing");
    if (depth > kDeepestNesting) return damaged("The binary property list nests too deeply");
    if (++_seen > kMostObjects) return damaged("The binary property list unfolds to too many values");
    const std::uint64_t at = number(_table + index * _offsetSize, _offsetSize);
    if (at < kBinaryMagic.size() || !holds(at, 1)) return damaged("An object of the binary property list lies outside");
    const auto marker = static_cast<std::uint8_t>(_bytes[at]);
    const unsigned low = marker & 15U;
    switch (marker >> 4U) {
      case 0x0:
        if (low == 8) return PropertyList(false);
        if (low == 9) return PropertyList(true);
        break;
      case 0x1:
        return integer(at, std::uint64_t{1} << low);
      case 0x2:
        return real(at, std::uint64_t{1} << low);
      case 0x3:
        return date(at);
      case 0x4:
      case 0x5:
      case 0x6:
        if (const auto span = counted(at, low)) return bytes(marker >> 4U, *span);
        break;
      case 0xA:
        if (const auto span = counted(at, low)) return array(*span, depth);
        break;
      case 0xD:
        if (const auto span = counted(at, low)) return dictionary(*span, depth);
        break;
      default:  // a byte of the file, not one of ours
        break;
    }
    return damaged("An object of the binary property list is of no known kind");
  }

  Result<PropertyList> integer(std::uint64_t at, std::uint64_t size) const {
    if (size > 16 || !holds(at + 1, size)) return damaged("An integer of the binary property list is cut short");
    if (size == 16) {
      // Sixteen bytes hold what exceeds 63 bits without a sign.
      const auto high = std::bit_cast<std::int64_t>(number(at + 1, 8));
      const std::uint64_t low = number(at + 9, 8);
      const auto whole = std::bit_cast<std::int64_t>(low);
      if (high == (whole < 0 ? -1 : 0)) return PropertyList(whole);
      return PropertyList(std::ldexp(static_cast<double>(high), 64) + static_cast<double>(low));
    }
    return PropertyList(std::bit_cast<std::int64_t>(number(at + 1, size)));
  }

  Result<PropertyList> real(std::uint64_t at, std::uint64_t size) const {
    if ((size != 4 && size != 8) || !holds(at + 1, size))
      return damaged("A real of the binary property list is cut short");
    if (size == 8) return PropertyList(std::bit_cast<double>(number(at + 1, 8)));
    return PropertyList(static_cast<double>(std::bit_cast<float>(static_cast<std::uint32_t>(number(at + 1, 4)))));
  }

  Result<PropertyList> date(std::uint64_t at) const {
    if (!holds(at + 1, 8)) return damaged("A date of the binary property list is cut short");
    using Seconds = std::chrono::duration<double>;
    constexpr std::chrono::sys_days epoch{std::chrono::year{2001} / 1 / 1};
    const Seconds seconds = epoch.time_since_epoch() + Seconds(std::bit_cast<double>(number(at + 1, 8)));
    if (std::isnan(seconds.count())) return damaged("A date of the binary property list is no time");
    const Seconds held = std::clamp<Seconds>(seconds, kEarliestDay.time_since_epoch(), kLatestDay.time_since_epoch());
    return PropertyList(Date{std::chrono::duration_cast<Date::duration>(held)});
  }

  Result<PropertyList> bytes(unsigned kind, Span span) {
    const std::uint64_t width = kind == 0x6 ? 2 : 1;
    if (span.count > _bytes.size() || !holds(span.start, span.count * width))
      return damaged("A text of the binary property list is cut short");
    _unfolded += span.count * width;
    if (_unfolded > kMostUnfolded) return damaged("The binary property list unfolds to too many bytes");
    const std::string_view part = _bytes.substr(span.start, span.count * width);
    if (kind == 0x4) return PropertyList(Data(part.begin(), part.end()));
    if (kind == 0x5) return PropertyList(isXmlText(part) ? std::string(part) : xmlTextFrom(part));
    std::string text;
    for (std::uint64_t i = 0; i < span.count; ++i) {
      auto unit = static_cast<std::uint32_t>(number(span.start + 2 * i, 2));
      const bool isHigh = unit >= 0xD800 && unit < 0xDC00;
      const auto next =
          isHigh && i + 1 < span.count ? static_cast<std::uint32_t>(number(span.start + 2 * i + 2, 2)) : 0;
      if (next >= 0xDC00 && next < 0xE000) {
        unit = 0x10000 + ((unit - 0xD800) << 10U) + (next - 0xDC00);
        ++i;
      } else if (unit >= 0xD800 && unit < 0xE000) {
        unit = 0xFFFD;
      }
      appendUtf8(text, unit);
    }
    return PropertyList(isXmlText(text) ? std::move(text) : xmlTextFrom(text));
  }

  [[nodiscard]] bool holdsReferences(Span span, std::uint64_t each) const {
    return span.count <= _bytes.size() && holds(span.start, span.count * each * _referenceSize);
  }

  [[nodiscard]] std::uint64_t reference(Span span, std::uint64_t position) const {
    return number(span.start + position * _referenceSize, _referenceSize);
  }

  Result<PropertyList> array(Span span, std::size_t depth) {
    if (!holdsReferences(span, 1)) return damaged("An array of the binary property list is cut short");
    Array items;
    for (std::uint64_t i = 0; i < span.count; ++i) {
      auto item = object(reference(span, i), depth + 1);
      if (!item) return item.error();
      items.push_back(*std::move(item));
    }
    return PropertyList(std::move(items));
  }

  Result<PropertyList> dictionary(Span span, std::size_t depth) {
    if (!holdsReferences(span, 2)) return damaged("A dictionary of the binary property list is cut short");
    Dictionary entries;
    for (std::uint64_t i = 0; i < span.count; ++i) {
      const auto key = object(reference(span, i), depth + 1);
      if (!key) return key.error();
      const auto* name = key->as<std::string>();
      if (!name) return damaged("A key of the binary property list is no text");
      auto item = object(reference(span, span.count + i), depth + 1);
      if (!item) return item.error();
      entries.append(*name, *std::move(item));
    }
    dropRepeatedKeys(entries);
    return PropertyList(std::move(entries));
  }

  const std::string_view _bytes;
  std::uint64_t _offsetSize = 0;
  std::uint64_t _referenceSize = 0;
  std::uint64_t _count = 0;
  std::uint64_t _table = 0;
  std::size_t _seen = 0;
  std::uint64_t _unfolded = 0;
};

}  // namespace

Result<PropertyList> readBinary(std::string_view bytes) { return Reader(bytes).read(); }

}  // namespace quilt::platform
