// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/base/Export.h"
#include "quilt/sources/QuiltMediaSource.h"

namespace quilt {

/// A source that accompanies an item (slides, a hand-out). Differs from other sources in its place alone.
class QUILT_EXPORT QuiltMediaExtra : public QuiltMediaSource {
 public:
  /// @{
  /// As for a source.
  static std::shared_ptr<QuiltMediaExtra> init();
  static std::shared_ptr<QuiltMediaExtra> initWithURL(const Url& url);
  static std::shared_ptr<QuiltMediaExtra> initWithPath(const Path& path);
  static std::shared_ptr<QuiltMediaExtra> initWithDictionary(Dictionary dictionary,
                                                             const std::shared_ptr<QuiltMedia>& andMedia);
  static std::shared_ptr<QuiltMediaExtra> read(Dictionary& record, const std::shared_ptr<QuiltMedia>& andMedia);
  /// @}

  /// Inside the item's "extras" folder; empty while the item is not in a document.
  std::string folder() const override;

 protected:
  QuiltMediaExtra() = default;
};

}  // namespace quilt
