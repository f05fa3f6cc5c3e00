// SPDX-License-Identifier: Apache-2.0
// Runs a fuzz target on the files of folders, one after the other: `NAME_fuzz FOLDER...`. The program that libFuzzer
// makes of the same target takes the folders in the same place.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <vector>

#include "tests/support/PlainFiles.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

int main(int argumentCount, char** arguments) {
  std::vector<std::filesystem::path> files;
  for (int i = 1; i < argumentCount; ++i)
    for (const auto& entry : std::filesystem::directory_iterator(arguments[i])) files.push_back(entry.path());
  std::sort(files.begin(), files.end());
  for (const auto& file : files) {
    std::printf("%s\n", file.c_str());
    std::fflush(stdout);  // the last name printed is the one that failed
    const std::string bytes = quilt::support::readPlainly(file);
    LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size());
  }
  std::printf("%zu inputs\n", files.size());
  return files.empty() ? 1 : 0;
}
