// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/vips/Vips.h"

#include <algorithm>
#include <mutex>
#include <string>

namespace quilt::platform::vips {

namespace {

void ignoreLine(const gchar*, GLogLevelFlags, const gchar*, gpointer) {}

}  // namespace

void start() {
  static std::once_flag once;
  std::call_once(once, [] {
    // Decoders warn of every oddity in a file; whoever asked gets an answer or an Error instead.
    g_log_set_handler("VIPS", static_cast<GLogLevelFlags>(G_LOG_LEVEL_WARNING | G_LOG_LEVEL_INFO | G_LOG_LEVEL_DEBUG),
                      ignoreLine, nullptr);
    if (vips_init("quilt") != 0) return;  // every later call fails and says so
    vips_cache_set_max(0);
    vips_concurrency_set(std::min(vips_concurrency_get(), 4));
  });
}

Error failure(ErrorKind kind, std::string_view sentence, const std::filesystem::path& file) {
  const std::unique_ptr<char, decltype(&g_free)> words(vips_error_buffer_copy(), g_free);  // also clears
  std::string detail(words.get());
  detail.erase(std::min(detail.find('\n'), detail.size()));
  std::string text(sentence);
  if (!detail.empty()) text += " (" + detail + ")";
  return {kind, text + ".", file};
}

void forgetFailures() { vips_error_clear(); }

}  // namespace quilt::platform::vips
