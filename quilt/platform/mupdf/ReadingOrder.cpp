// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/mupdf/ReadingOrder.h"

#include <algorithm>
#include <optional>
#include <span>

namespace quilt::platform::mupdf {

namespace {

using Blocks = std::span<const fz_stext_block*>;

// Letters of neighbouring lines and columns overlap a little.
constexpr float kTolerance = 2;  // points

// Beyond it the cuts of a page made to be hard would take long; its blocks stay as drawn.
constexpr std::size_t kMaximumBlocks = 2000;

float start(const fz_stext_block* block, bool isAcross) { return isAcross ? block->bbox.x0 : block->bbox.y0; }
float end(const fz_stext_block* block, bool isAcross) { return isAcross ? block->bbox.x1 : block->bbox.y1; }

bool overlapAcross(const fz_stext_block* a, const fz_stext_block* b) {
  return a->bbox.x0 + kTolerance < b->bbox.x1 && b->bbox.x0 + kTolerance < a->bbox.x1;
}

// Whether some block is drawn after one that stands below it in the same column.
bool jumpsUp(Blocks blocks) {
  for (std::size_t i = 1; i < blocks.size(); ++i) {
    for (std::size_t k = 0; k < i; ++k) {
      if (blocks[i]->bbox.y1 < blocks[k]->bbox.y0 + kTolerance && overlapAcross(blocks[i], blocks[k])) return true;
    }
  }
  return false;
}

struct Gap {
  float width = 0;
  std::size_t position = 0;  // of the first block behind it, when the blocks are sorted in this direction
};

void sortAlong(Blocks blocks, bool isAcross) {
  std::stable_sort(blocks.begin(), blocks.end(),
                   [isAcross](const auto* a, const auto* b) { return start(a, isAcross) < start(b, isAcross); });
}

// The widest gap that no block crosses. Sorts the blocks.
Gap widestGap(Blocks blocks, bool isAcross) {
  sortAlong(blocks, isAcross);
  Gap widest;
  float reached = end(blocks[0], isAcross);
  for (std::size_t i = 1; i < blocks.size(); ++i) {
    const float width = start(blocks[i], isAcross) - reached;
    if (width > widest.width) widest = {width, i};
    reached = std::max(reached, end(blocks[i], isAcross));
  }
  return widest;
}

// Cuts instead of recursing, so that many blocks cannot exhaust the stack.
void orderByCuts(Blocks all) {
  std::vector<Blocks> parts{all};
  while (!parts.empty()) {
    const Blocks part = parts.back();
    parts.pop_back();
    if (part.size() < 2) continue;
    const Gap columns = widestGap(part, true);
    const Gap rows = widestGap(part, false);
    if (columns.width == 0 && rows.width == 0) continue;  // left from top to bottom
    const bool isAcross = columns.width > rows.width;
    if (isAcross) sortAlong(part, true);
    const std::size_t position = isAcross ? columns.position : rows.position;
    parts.push_back(part.subspan(position));
    parts.push_back(part.first(position));
  }
}

}  // namespace

std::vector<const fz_stext_block*> inReadingOrder(const fz_stext_page& page) {
  std::vector<const fz_stext_block*> blocks;
  for (const fz_stext_block* block = page.first_block; block; block = block->next) {
    if (block->type == FZ_STEXT_BLOCK_TEXT && block->u.t.first_line) blocks.push_back(block);
  }
  if (blocks.size() <= kMaximumBlocks && jumpsUp(blocks)) orderByCuts(blocks);
  return blocks;
}

}  // namespace quilt::platform::mupdf
