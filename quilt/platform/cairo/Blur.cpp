// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/cairo/Blur.h"

#include <algorithm>
#include <cmath>
#include <vector>

namespace quilt::platform::cairo {

namespace {

// Replaces each value by the mean of those at most `reach` away.
void blurLine(std::vector<std::uint8_t>& line, std::vector<std::uint8_t>& out, std::size_t reach) {
  const std::size_t count = line.size();
  const std::size_t size = 2 * reach + 1;
  std::size_t sum = 0;
  for (std::size_t i = 0; i < std::min(reach, count); ++i) sum += line[i];
  for (std::size_t i = 0; i < count; ++i) {
    if (i + reach < count) sum += line[i + reach];
    if (i > reach) sum -= line[i - reach - 1];
    out[i] = static_cast<std::uint8_t>((sum + size / 2) / size);
  }
  line.swap(out);
}

constexpr double kPasses = 3;

// The reach of each pass: two neighbouring sizes, mixed so that the variances, (size² − 1) / 12, add up to the wanted.
std::vector<std::size_t> reachesFor(double deviation) {
  const double variance = deviation * deviation;
  const double ideal = std::sqrt(12 * variance / kPasses + 1);
  const double lower = 2 * std::floor((ideal - 1) / 2) + 1;
  const double narrow = std::round((kPasses * (lower * lower + 4 * lower + 3) - 12 * variance) / (4 * lower + 4));
  std::vector<std::size_t> reaches(static_cast<std::size_t>(kPasses), static_cast<std::size_t>((lower - 1) / 2));
  for (std::size_t pass = 0; pass < reaches.size(); ++pass)
    if (static_cast<double>(pass) >= narrow) ++reaches[pass];
  return reaches;
}

}  // namespace

void blur(std::uint8_t* plane, std::size_t width, std::size_t height, std::size_t stride, double deviation) {
  const std::vector<std::size_t> reaches = reachesFor(deviation);
  const auto along = [&](std::size_t lines, std::size_t count, std::size_t lineStep, std::size_t step) {
    std::vector<std::uint8_t> line(count);
    std::vector<std::uint8_t> out(count);
    for (std::size_t i = 0; i < lines; ++i) {
      std::uint8_t* first = plane + i * lineStep;
      for (std::size_t j = 0; j < count; ++j) line[j] = first[j * step];
      for (const std::size_t reach : reaches) blurLine(line, out, reach);
      for (std::size_t j = 0; j < count; ++j) first[j * step] = line[j];
    }
  };
  along(height, width, stride, 1);
  along(width, height, 1, stride);
}

}  // namespace quilt::platform::cairo
