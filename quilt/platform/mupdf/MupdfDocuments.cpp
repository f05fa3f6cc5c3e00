// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/mupdf/MupdfDocuments.h"

#include <mupdf/fitz.h>

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <mutex>
#include <optional>
#include <utility>

#include "quilt/platform/mupdf/MupdfContext.h"
#include "quilt/platform/mupdf/ReadingOrder.h"
#include "quilt/platform/mupdf/documents.h"

namespace quilt::platform {

namespace {

using mupdf::DocumentKind;
using mupdf::MupdfContext;

constexpr float kBookWidth = 450;  // points, as is the letters' size
constexpr float kBookHeight = 600;
constexpr float kBookLetters = 12;

constexpr std::size_t kMaximumPages = 20000;
constexpr std::size_t kMaximumText = 256 << 10;
constexpr double kMaximumSide = 32767;  // pixels of a drawn page

constexpr const char* kDamaged = "The document is damaged";
constexpr const char* kDamagedPage = "The page is damaged";

// Makes opaque pixels of four bytes of those of three in the last three quarters of the bitmap: each moves to the
// front, where those before it have been moved from.
void spreadPixels(Bitmap& bitmap) {
  constexpr auto kOpaque = std::bit_cast<std::uint32_t>(std::array<std::uint8_t, 4>{0, 0, 0, 255});
  const std::size_t count = bitmap.width * bitmap.height;
  std::uint8_t* to = bitmap.pixels.data();
  const std::uint8_t* from = to + count;
  for (std::size_t i = 0; i + 1 < count; ++i, to += 4, from += 3) {
    std::uint32_t pixel = 0;
    std::memcpy(&pixel, from, 4);  // with the first byte of the next
    pixel |= kOpaque;
    std::memcpy(to, &pixel, 4);
  }
  std::memmove(to, from, 3);
  to[3] = 255;
}

// Neither control characters nor what is no character, which no record could hold, nor the sign for a letter that the
// document's font does not tell.
bool isWritable(int rune) {
  const bool isControl = rune < 0x20 || (rune >= 0x7F && rune < 0xA0);
  const bool isNone = (rune >= 0xD800 && rune < 0xE000) || (rune & 0xFFFE) == 0xFFFE || rune > 0x10FFFF;
  return !isControl && !isNone && rune != FZ_REPLACEMENT_CHARACTER;
}

void appendLine(const fz_stext_line& line, std::string& text) {
  for (const fz_stext_char* character = line.first_char; character; character = character->next) {
    if (character->c >= 0x20 && character->c < 0x7F) {  // nearly all
      text += static_cast<char>(character->c);
      continue;
    }
    if (character->c == '\t') text += ' ';
    if (!isWritable(character->c)) continue;
    char bytes[FZ_UTFMAX];
    text.append(bytes, static_cast<std::size_t>(fz_runetochar(bytes, character->c)));
  }
  text.erase(text.find_last_not_of(' ') + 1);
  text += '\n';
}

std::string textOf(const fz_stext_page& page) {
  std::string text;
  for (const fz_stext_block* block : mupdf::inReadingOrder(page)) {
    if (text.size() > kMaximumText) break;
    for (const fz_stext_line* line = block->u.t.first_line; line; line = line->next) appendLine(*line, text);
    text += '\n';
  }
  if (text.size() > kMaximumText) {
    std::size_t length = kMaximumText;
    while ((text[length] & '\xC0') == '\x80') --length;  // not within a character
    text.resize(length);
  }
  return mupdf::trimmed(text).value_or("");
}

// Whether every character lies on the page for certain: it starts there, at least its own size from the edges.
bool isOnPage(const fz_stext_page& page) {
  for (const fz_stext_block* block = page.first_block; block; block = block->next) {
    if (block->type != FZ_STEXT_BLOCK_TEXT) continue;
    for (const fz_stext_line* line = block->u.t.first_line; line; line = line->next) {
      for (const fz_stext_char* character = line->first_char; character; character = character->next) {
        const auto [x, y] = character->origin;
        const float margin = character->size;
        const fz_rect& box = page.mediabox;
        const bool isAcross = x >= box.x0 + margin && x <= box.x1 - margin;
        const bool isDown = y >= box.y0 + margin && y <= box.y1 - margin;
        if (!isAcross || !isDown) return false;
      }
    }
  }
  return true;
}

class MupdfDocument final : public PagedDocument {
 public:
  MupdfDocument(std::filesystem::path path, DocumentKind kind) : _path(std::move(path)), _kind(kind) {}

  Result<void> open() {
    bool needsPassword = false;
    Result<void> opened = _context.run(kDamaged, _path, [&](fz_context* c) {
      fz_register_document_handlers(c);
      const char* magic = _kind == DocumentKind::PDF ? "application/pdf" : "application/epub+zip";
      _stream.object = fz_open_file(c, _path.c_str());
      _document.object = fz_open_document_with_stream(c, magic, _stream.object);
      needsPassword = fz_needs_password(c, _document.object) != 0;
      if (!needsPassword) fz_layout_document(c, _document.object, kBookWidth, kBookHeight, kBookLetters);
    });
    if (opened && needsPassword) {
      return Error{ErrorKind::Unsupported, "The document is protected by a password.", _path};
    }
    if (!opened) return opened;
    const Result<fz_rect> first = load(0);
    if (first || load(1)) return {};  // a damaged first page does not spoil the others
    if (first.error().kind != ErrorKind::NotFound) return first.error();
    return Error{ErrorKind::Damaged, "The document has no pages.", _path};
  }

  [[nodiscard]] Result<std::size_t> pageCount() override {
    const std::lock_guard lock(_mutex);
    if (_count) return *_count;
    std::size_t count = 0;
    const Result<void> counted = _context.run(kDamaged, _path, [&](fz_context* c) {
      const int chapters = fz_count_chapters(c, _document.object);
      for (int chapter = 0; chapter < chapters && count <= kMaximumPages; ++chapter) {
        count += static_cast<std::size_t>(std::max(0, fz_count_chapter_pages(c, _document.object, chapter)));
      }
    });
    if (!counted) return counted.error();
    if (count > kMaximumPages) {
      const std::string most = std::to_string(kMaximumPages);
      return Error{ErrorKind::Damaged, "The document has more than " + most + " pages.", _path};
    }
    _count = count;
    return count;
  }

  [[nodiscard]] Result<Size> sizeOfPage(std::size_t index) override {
    const std::lock_guard lock(_mutex);
    const Result<fz_rect> box = load(index);
    if (!box) return box.error();
    return Size{box->x1 - box->x0, box->y1 - box->y0};
  }

  [[nodiscard]] Result<Bitmap> drawPage(std::size_t index, Size pixels) override {
    const std::lock_guard lock(_mutex);
    if (!(pixels.width >= 1 && pixels.height >= 1 && pixels.width <= kMaximumSide && pixels.height <= kMaximumSide)) {
      return Error{ErrorKind::Unsupported, "A page cannot be drawn in this size.", _path};
    }
    const Result<fz_rect> box = load(index);
    if (!box) return box.error();
    const auto scaleAcross = static_cast<float>(pixels.width / (box->x1 - box->x0));
    const auto scaleDown = static_cast<float>(pixels.height / (box->y1 - box->y0));

    Bitmap bitmap{static_cast<std::size_t>(pixels.width), static_cast<std::size_t>(pixels.height), {}};
    const std::size_t count = bitmap.width * bitmap.height;
    bitmap.pixels.assign(count * 4, 0xFF);
    MupdfContext::Owner<fz_pixmap> pixmap(_context, fz_drop_pixmap);
    MupdfContext::Owner<fz_device> device(_context, fz_drop_device);
    const Result<void> drawn = _context.run(kDamagedPage, _path, [&](fz_context* c) {
      const fz_matrix matrix = fz_pre_translate(fz_scale(scaleAcross, scaleDown), -box->x0, -box->y0);
      // Without transparency, of which mixing colours would leave traces; in the last three quarters of the bytes.
      pixmap.object =
          fz_new_pixmap_with_data(c, fz_device_rgb(c), static_cast<int>(bitmap.width), static_cast<int>(bitmap.height),
                                  nullptr, 0, static_cast<int>(bitmap.width * 3), bitmap.pixels.data() + count);
      device.object = fz_new_draw_device(c, fz_identity, pixmap.object);
      fz_run_page(c, _page.object, device.object, matrix, _context.cookie());
      fz_close_device(c, device.object);
    });
    if (!drawn) return drawn.error();
    spreadPixels(bitmap);
    return bitmap;
  }

  [[nodiscard]] Result<std::string> textOfPage(std::size_t index) override {
    const std::lock_guard lock(_mutex);
    const Result<fz_rect> box = load(index);
    if (!box) return box.error();
    MupdfContext::Owner<fz_stext_page> text(_context, fz_drop_stext_page);
    Result<void> read = readText(*box, text);
    // To ask of each letter's outline whether it lies beyond the page takes a tenth of the time.
    if (read && !_isTextClipped && !isOnPage(*text.object)) {
      _isTextClipped = true;
      text.reset();
      read = readText(*box, text);
    }
    if (!read) return read.error();
    return textOf(*text.object);
  }

 private:
  // Makes it the page that `_page` holds, and answers where on it the displayed part lies. Lays out no chapter behind.
  Result<fz_rect> load(std::size_t index) {
    if (_page.object && _index == index) return _box;
    _page.reset();
    const Result<void> loaded = _context.run(kDamagedPage, _path, [&](fz_context* c) {
      const int chapters = fz_count_chapters(c, _document.object);
      std::size_t left = index;
      for (int chapter = 0; chapter < chapters; ++chapter) {
        const auto count = static_cast<std::size_t>(std::max(0, fz_count_chapter_pages(c, _document.object, chapter)));
        if (left < count) {
          _page.object = fz_load_chapter_page(c, _document.object, chapter, static_cast<int>(left));
          _box = fz_bound_page(c, _page.object);
          return;
        }
        left -= count;
      }
    });
    if (loaded && !_page.object) return Error{ErrorKind::NotFound, "The document has no such page.", _path};
    const float width = _box.x1 - _box.x0;
    const float height = _box.y1 - _box.y0;
    _index = index;
    if (loaded && std::isfinite(width) && std::isfinite(height) && width > 0 && height > 0) return _box;
    _page.reset();
    return loaded ? Error{ErrorKind::Damaged, "The page has no size.", _path} : loaded.error();
  }

  Result<void> readText(const fz_rect& box, MupdfContext::Owner<fz_stext_page>& text) {
    MupdfContext::Owner<fz_device> device(_context, fz_drop_device);
    return _context.run(kDamagedPage, _path, [&](fz_context* c) {
      fz_stext_options options{};
      if (_isTextClipped) options.flags = FZ_STEXT_MEDIABOX_CLIP;
      text.object = fz_new_stext_page(c, box);
      device.object = fz_new_stext_device(c, text.object, &options);
      fz_run_page(c, _page.object, device.object, fz_identity, _context.cookie());
      fz_close_device(c, device.object);
    });
  }

  const std::filesystem::path _path;
  const DocumentKind _kind;
  std::mutex _mutex;
  MupdfContext _context;
  MupdfContext::Owner<fz_stream> _stream{_context, fz_drop_stream};
  MupdfContext::Owner<fz_document> _document{_context, fz_drop_document};
  std::optional<std::size_t> _count;
  MupdfContext::Owner<fz_page> _page{_context, fz_drop_page};  // the last one asked for: it is often asked for again
  std::size_t _index = 0;
  fz_rect _box = fz_empty_rect;
  bool _isTextClipped = false;  // once a page had text at its edge or beyond: then others have
};

}  // namespace

Result<std::shared_ptr<PagedDocument>> MupdfDocuments::openDocument(const std::filesystem::path& path,
                                                                    const ContinueBlock& /*goesOn*/) const {
  const Result<DocumentKind> kind = mupdf::kindOfDocument(path);
  if (!kind) return kind.error();
  // The book's own description tells better than a failed layout why it cannot be shown.
  if (*kind == DocumentKind::EPUB) {
    if (const Result<MediaFacts> facts = mupdf::inspectEPUB(path); !facts) return facts.error();
  }
  auto document = std::make_shared<MupdfDocument>(path, *kind);
  if (const Result<void> opened = document->open(); !opened) return opened.error();
  return std::shared_ptr<PagedDocument>(std::move(document));
}

}  // namespace quilt::platform
