// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/DateFormatter.h"

namespace quilt::platform {

/// Dates through ICU.
class IcuDateFormatter final : public DateFormatter {
 public:
  [[nodiscard]] std::string format(Date date, std::string_view pattern) const override;
  [[nodiscard]] std::string shortDescription(Date date) const override;
  [[nodiscard]] std::string description(Date date) const override;
};

}  // namespace quilt::platform
