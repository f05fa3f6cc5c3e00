// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <utility>

#include "quilt/platform/interfaces/DateFormatter.h"

namespace quilt::platform {

/// Dates through ICU.
class IcuDateFormatter final : public DateFormatter {
 public:
  /// The user's language for dates, from the environment: LC_ALL, else LC_TIME, else LANG, the first that names a
  /// language that ICU knows; else the plain one.
  IcuDateFormatter();
  /// A language as the environment names it: "de_AT.UTF-8@euro".
  explicit IcuDateFormatter(std::string language) : _locale(std::move(language)) {}

  [[nodiscard]] std::string format(Date date, std::string_view pattern) const override;
  [[nodiscard]] std::string shortDescription(Date date) const override;
  [[nodiscard]] std::string description(Date date) const override;
  [[nodiscard]] std::int64_t gregorianYear(Date date) const override;

 private:
  const std::string _locale;
};

}  // namespace quilt::platform
