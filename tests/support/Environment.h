// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdlib>
#include <optional>
#include <string>

namespace quilt::support {

/// Sets an environment variable, or removes it (null), until the end.
class Environment {
 public:
  Environment(const char* name, const char* value) : _name(name) {
    if (const char* before = std::getenv(name)) _before = before;
    set(value);
  }
  Environment(const Environment&) = delete;
  Environment& operator=(const Environment&) = delete;
  ~Environment() { set(_before ? _before->c_str() : nullptr); }

 private:
  void set(const char* value) { value ? setenv(_name, value, 1) : unsetenv(_name); }

  const char* _name;
  std::optional<std::string> _before;
};

}  // namespace quilt::support
