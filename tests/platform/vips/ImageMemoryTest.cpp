// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <fstream>
#include <string>

#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/vips/Vips.h"
#include "quilt/platform/vips/VipsImages.h"
#include "tests/support/ScratchFolder.h"
#include "tests/support/SimpleFiles.h"

namespace quilt::platform {
namespace {

// A line of /proc/self/status, in MiB.
double status(const std::string& key) {
  std::ifstream lines("/proc/self/status");
  for (std::string line; std::getline(lines, line);) {
    if (line.starts_with(key + ":")) return std::stod(line.substr(key.size() + 1)) / 1024;
  }
  return -1;
}

TEST(ImageMemoryTest, AHundredMegapixelsAreScaledInAFractionOfTheirSize) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
  GTEST_SKIP() << "a sanitizer's own memory hides the measure";
#endif
  support::ScratchFolder folder;
  const ScopedService<FileManager> files(&Services::files, std::make_shared<support::SimpleFiles>());
  vips::start();
  ::VipsImage* out = nullptr;
  ASSERT_EQ(vips_grey(&out, 10000, 10000, "uchar", TRUE, nullptr), 0);
  const vips::Image grey(out);
  ASSERT_EQ(vips_colourspace(grey.get(), &out, VIPS_INTERPRETATION_sRGB, nullptr), 0);
  const vips::Image ramp(out);
  ASSERT_EQ(vips_jpegsave(ramp.get(), (folder / "large.jpg").c_str(), nullptr), 0);

  std::ofstream("/proc/self/clear_refs") << "5";  // the peak starts anew
  const double before = status("VmRSS");
  const Result<std::shared_ptr<ImageWrapper>> image = VipsImages().imageWithPath(folder / "large.jpg");
  ASSERT_TRUE(image);
  ASSERT_TRUE((*image)->convertToSD()->saveAsJPGAtPath(folder / "small.jpg"));
  const double peak = status("VmHWM");
  ASSERT_GT(peak, 0);
  EXPECT_LT(peak - before, 100) << "MiB; the pixels alone are 286 MiB";
}

}  // namespace
}  // namespace quilt::platform
