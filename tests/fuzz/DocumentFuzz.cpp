// SPDX-License-Identifier: Apache-2.0
// PDF and EPUB documents from strangers: what they say of themselves, and the first and last of their pages.
#include <cstddef>
#include <cstdint>
#include <stdexcept>

#include "quilt/platform/mupdf/MupdfDocuments.h"
#include "quilt/platform/mupdf/MupdfInspector.h"
#include "tests/support/MemoryFile.h"

using namespace quilt::platform;

namespace {

void show(PagedDocument& document, std::size_t page) {
  constexpr Size small{160, 120};
  if (const auto size = document.sizeOfPage(page); size && (!(size->width > 0) || !(size->height > 0))) {
    throw std::logic_error("a page without a size");
  }
  if (const auto drawn = document.drawPage(page, small); drawn && drawn->pixels.size() != 160 * 120 * 4) {
    throw std::logic_error("a page of the wrong size");
  }
  static_cast<void>(document.textOfPage(page));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  constexpr std::size_t most = 1U << 20U;
  if (size > most) return 0;
  const quilt::support::MemoryFile file({data, size});
  static_cast<void>(MupdfInspector().inspect(file.path()));
  const auto opened = MupdfDocuments().openDocument(file.path());
  if (!opened) return 0;
  show(**opened, 0);
  const auto count = (*opened)->pageCount();
  if (!count) return 0;
  if (*count == 0) throw std::logic_error("a document without pages was opened");
  show(**opened, *count - 1);
  if ((*opened)->sizeOfPage(*count)) throw std::logic_error("a page past the last");
  return 0;
}
