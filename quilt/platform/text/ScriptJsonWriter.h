// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/Json.h"

namespace quilt::platform {

/// JSON that may stand inside a script element.
class ScriptJsonWriter final : public JsonWriter {
 public:
  [[nodiscard]] std::string toJSON(const Dictionary& dictionary) const override;
};

}  // namespace quilt::platform
