// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/mupdf/MupdfContext.h"

#include <exception>

namespace quilt::platform::mupdf {

namespace {

constexpr std::size_t kStoreSize = 32 << 20;

void ignoreLine(void*, const char*) {}

}  // namespace

MupdfContext::MupdfContext() : _context(fz_new_context(_budget.allocator(), nullptr, kStoreSize)) {
  if (!_context) return;
  fz_set_warning_callback(_context, ignoreLine, nullptr);
  fz_set_error_callback(_context, ignoreLine, nullptr);
}

MupdfContext::~MupdfContext() { fz_drop_context(_context); }

Result<void> MupdfContext::run(std::string_view sentence, const std::filesystem::path& file,
                               const std::function<void(fz_context*)>& body) {
  const auto error = [&](const char* words) {
    return Error{ErrorKind::Damaged, std::string(sentence) + " (" + words + ").", file};
  };
  if (!_context) return error("no memory");
  bool isOutOfMemory = false;
  const char* words = nullptr;
  fz_var(isOutOfMemory);
  fz_var(words);
  _budget.startStep();
  fz_try(_context) {
    // An exception must not pass MuPDF's own frames.
    try {
      body(_context);
    } catch (const std::exception&) {
      isOutOfMemory = true;
    }
  }
  fz_catch(_context) { words = fz_caught_message(_context); }
  if (_budget.endStep()) return error("it takes too long");
  if (isOutOfMemory) return error("no memory");
  if (words) return error(words);
  return {};
}

}  // namespace quilt::platform::mupdf
