// SPDX-License-Identifier: Apache-2.0
// Manifests from strangers.
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string_view>

#include "cli/Failure.h"
#include "cli/Manifest.h"
#include "cli/Text.h"

namespace {

[[noreturn]] void fail(const char* what) {
  std::fprintf(stderr, "%s\n", what);
  std::abort();
}

// Either it is right, and what it says is fit to be used, or it is refused with a sentence that is safe to show.
void check(std::string_view bytes) {
  try {
    const quilt::cli::Manifest manifest = quilt::cli::parseManifest(bytes, "/home/ann/talk.json");
    if (manifest.media.empty()) fail("a manifest without items was taken");
    for (const auto& item : manifest.media) {
      if (item.sources.empty()) fail("an item without sources was taken");
      for (const auto& source : item.sources)
        if (source.location.empty()) fail("a source without a file was taken");
      if (item.title && !quilt::cli::isText(*item.title)) fail("a title with control characters was taken");
    }
  } catch (const quilt::cli::Failure& failure) {
    if (failure.code != quilt::cli::ExitCode::Invalid) fail("a wrong manifest has another code");
    if (failure.message.empty() || !quilt::cli::isText(failure.message)) fail("a message cannot be shown");
    (void)failure.toJson();
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  check({reinterpret_cast<const char*>(data), size});
  return 0;
}
