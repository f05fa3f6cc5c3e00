// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

#include "quilt/platform/base/Date.h"
#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// Dates for people. Any thread.
class QUILT_EXPORT DateFormatter {
 public:
  virtual ~DateFormatter() = default;

  /// The date in the user's language and time zone, by a pattern of Unicode's date format ("MMMM d, yyyy").
  [[nodiscard]] virtual std::string format(Date date, std::string_view pattern) const = 0;
  /// The language's short form, without the time.
  [[nodiscard]] virtual std::string shortDescription(Date date) const = 0;
  /// "2010-05-01 12:00:00 +0000", in UTC.
  [[nodiscard]] virtual std::string description(Date date) const = 0;
  /// The year of the Gregorian calendar, whichever one the user's language counts by, in the user's time zone; unless
  /// a formatter knows that zone, in UTC.
  [[nodiscard]] virtual std::int64_t gregorianYear(Date date) const {
    return std::strtoll(description(date).c_str(), nullptr, 10);
  }
};

}  // namespace quilt::platform
