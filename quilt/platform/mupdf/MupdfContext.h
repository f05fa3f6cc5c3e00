// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <mupdf/fitz.h>

#include <filesystem>
#include <functional>
#include <string>
#include <string_view>
#include <utility>

#include "quilt/platform/base/Result.h"
#include "quilt/platform/mupdf/Budget.h"

namespace quilt::platform::mupdf {

/// A use of MuPDF, which reports failures by long jumps. Shares nothing with other contexts, so any number may
/// be used at once, each by one thread at a time. Scripts in documents are never run, and nothing is written to
/// standard error.
class MupdfContext {
 public:
  MupdfContext();
  MupdfContext(const MupdfContext&) = delete;
  MupdfContext& operator=(const MupdfContext&) = delete;
  ~MupdfContext();

  /// Runs `body` and answers what went wrong in it: `sentence`, with MuPDF's own words. `body` may be left in its
  /// middle, so it owns nothing that needs a destructor.
  Result<void> run(std::string_view sentence, const std::filesystem::path& file,
                   const std::function<void(fz_context*)>& body);

  /// What stops a page that is being drawn or read for text once it takes too long. For `body`.
  fz_cookie* cookie() { return _budget.cookie(); }

  /// The C object's owner: drops it with MuPDF's function. Must not outlive the context.
  template <class T>
  class Owner {
   public:
    Owner(MupdfContext& context, void (*drop)(fz_context*, T*)) : _context(context), _drop(drop) {}
    Owner(const Owner&) = delete;
    Owner& operator=(const Owner&) = delete;
    ~Owner() { reset(); }

    void reset() {
      if (object) _drop(_context._context, std::exchange(object, nullptr));
    }

    T* object = nullptr;

   private:
    MupdfContext& _context;
    void (*_drop)(fz_context*, T*);
  };

 private:
  Budget _budget;
  fz_context* _context;
};

}  // namespace quilt::platform::mupdf
