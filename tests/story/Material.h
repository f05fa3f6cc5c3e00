// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <functional>
#include <random>
#include <string>
#include <vector>

#include "tests/support/ImageFixtures.h"

namespace quilt::story {

using Path = std::filesystem::path;
using support::Rgba;

/// What a story's seed decides.
class Dice {
 public:
  explicit Dice(std::uint64_t seed) : _engine(seed) {}

  /// From 0 to below the count.
  std::size_t below(std::size_t count) { return static_cast<std::size_t>(_engine() % count); }
  bool isLucky(std::size_t oneIn) { return below(oneIn) == 0; }
  template <class List>
  auto& anyOf(List& list) {
    return list[below(list.size())];
  }

 private:
  std::mt19937_64 _engine;
};

/// A file that stories put into documents.
struct Material {
  std::string name;           ///< "red.png"
  std::string category;       ///< of an item that is made of it
  std::string bytes;          ///< no two materials have the same
  std::vector<Rgba> pages{};  ///< the one colour of each of its previews; empty: nobody knows what they show
  std::string importsAs{};    ///< the type of the document that an import makes of it; empty: stories do not import it
  bool isLarge = false;       ///< more than 640 × 480 pixels: a conversion has something to do
};

/// All of them: made on the spot, and small ones of the media corpus where that is. Made once a process.
const std::vector<Material>& materials();

/// Null when the bytes are those of no material.
const Material* materialWith(const std::string& bytes);

/// Whether a picture is of one colour, as far as an encoder keeps it: its middle is.
bool shows(const Path& picture, const Rgba& colour);

}  // namespace quilt::story
