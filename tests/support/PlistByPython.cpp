// SPDX-License-Identifier: Apache-2.0
#include "tests/support/PlistByPython.h"

#include <array>
#include <cstdio>
#include <memory>
#include <sstream>
#include <stdexcept>

namespace quilt::support {

namespace {

constexpr const char* kProgram = R"(
import plistlib, sys
try:
    with open(sys.argv[1], "rb") as file:
        for key, value in plistlib.load(file).items():
            text = value.strftime("%Y-%m-%dT%H:%M:%SZ") if hasattr(value, "strftime") else str(value)
            print(key, type(value).__name__, text)
except Exception as problem:
    print("error", problem)
)";

constexpr const char* kTreeProgram = R"(
import plistlib, sys
def show(name, value):
    kind = type(value).__name__
    if isinstance(value, (dict, list)):
        if name: print(name, kind, len(value))
        for key, child in (value.items() if isinstance(value, dict) else enumerate(value)):
            show((name + "." if name else "") + str(key), child)
    else:
        text = value.strftime("%Y-%m-%dT%H:%M:%SZ") if hasattr(value, "strftime") else str(value)
        print(name, kind, text)
try:
    with open(sys.argv[1], "rb") as file: show("", plistlib.load(file))
except Exception as problem:
    print("error", problem)
)";

constexpr const char* kBinaryProgram = R"(
import plistlib, sys
with open(sys.argv[1], "rb") as file: value = plistlib.load(file)
with open(sys.argv[1] + ".binary", "wb") as file: plistlib.dump(value, file, fmt=plistlib.FMT_BINARY, sort_keys=False)
)";

std::vector<std::string> linesOf(const char* program, const std::filesystem::path& file) {
  // Test folders have names without quotes.
  const std::string command = "python3 -c '" + std::string(program) + "' '" + file.native() + "' 2>&1";
  const std::unique_ptr<FILE, int (*)(FILE*)> pipe(popen(command.c_str(), "r"), pclose);
  if (!pipe) throw std::runtime_error("python3 cannot be started");
  std::string output;
  std::array<char, 4096> buffer{};
  while (const std::size_t count = fread(buffer.data(), 1, buffer.size(), pipe.get()))
    output.append(buffer.data(), count);

  std::vector<std::string> lines;
  std::istringstream in(output);
  for (std::string line; std::getline(in, line);) lines.push_back(line);
  return lines;
}

}  // namespace

std::vector<std::string> entriesByPython(const std::filesystem::path& file) { return linesOf(kProgram, file); }

std::vector<std::string> treeByPython(const std::filesystem::path& file) { return linesOf(kTreeProgram, file); }

bool writeBinaryByPython(const std::filesystem::path& file, const std::filesystem::path& binaryFile) {
  if (!linesOf(kBinaryProgram, file).empty()) return false;
  std::error_code problem;
  std::filesystem::rename(file.native() + ".binary", binaryFile, problem);
  return !problem;
}

std::vector<std::string> keysByPython(const std::filesystem::path& file) {
  std::vector<std::string> keys = entriesByPython(file);
  for (std::string& entry : keys) entry.resize(std::min(entry.find(' '), entry.size()));
  return keys;
}

}  // namespace quilt::support
