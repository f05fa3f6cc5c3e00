// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <vips/vips.h>

#include <filesystem>
#include <memory>
#include <string_view>

#include "quilt/platform/base/Error.h"

/// What the files of this folder share of libvips: its objects with an owner, its start, and its errors.
namespace quilt::platform::vips {

struct Unreference {
  void operator()(gpointer object) const { g_object_unref(object); }
};
using Image = std::unique_ptr<::VipsImage, Unreference>;
using Source = std::unique_ptr<::VipsSource, Unreference>;

/// Starts libvips for this process, once: no operation cache (so neither memory nor descriptors outlive an image), at
/// most four threads an operation, no lines on standard error. Any thread.
void start();

/// The error of a libvips call that just failed: `sentence` with libvips' own words, which are taken and cleared.
Error failure(ErrorKind kind, std::string_view sentence, const std::filesystem::path& file);

/// Gives up what libvips remembers of failures that do not matter.
void forgetFailures();

}  // namespace quilt::platform::vips
