// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <mupdf/fitz.h>

#include <vector>

namespace quilt::platform::mupdf {

/// The blocks of text of a page in the order in which people read them, empty ones left out. They stay the page's.
/// Blocks are taken as drawn if that goes down the page, column by column. Otherwise the page is cut, again and again,
/// along its widest gap: the upper part before the lower one, the left before the right.
std::vector<const fz_stext_block*> inReadingOrder(const fz_stext_page& page);

}  // namespace quilt::platform::mupdf
