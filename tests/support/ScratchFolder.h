// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdlib>
#include <filesystem>
#include <stdexcept>
#include <string>

namespace quilt::support {

/// A fresh, empty folder, removed with everything in it at the end of the test.
class ScratchFolder {
 public:
  ScratchFolder() {
    std::string pattern = (std::filesystem::temp_directory_path() / "quilt-scratch-XXXXXX").string();
    if (!mkdtemp(pattern.data())) throw std::runtime_error("no scratch folder");
    _path = pattern;
  }
  ScratchFolder(const ScratchFolder&) = delete;
  ScratchFolder& operator=(const ScratchFolder&) = delete;
  ~ScratchFolder() {
    std::error_code ignored;
    std::filesystem::remove_all(_path, ignored);
  }

  [[nodiscard]] const std::filesystem::path& path() const { return _path; }
  [[nodiscard]] std::filesystem::path operator/(const std::filesystem::path& name) const { return _path / name; }

 private:
  std::filesystem::path _path;
};

}  // namespace quilt::support
