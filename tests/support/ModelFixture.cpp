// SPDX-License-Identifier: Apache-2.0
#include "tests/support/ModelFixture.h"

#include <algorithm>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <stdexcept>

#include "quilt/platform/base/Date.h"
#include "quilt/platform/install.h"

namespace quilt::support {

using platform::LogLevel;

Line critical(std::string text) { return {LogLevel::Critical, std::move(text)}; }
Line warning(std::string text) { return {LogLevel::Warning, std::move(text)}; }
Line debug(std::string text) { return {LogLevel::Debug, std::move(text)}; }

void PrintTo(const Line& line, std::ostream* out) {
  switch (line.level) {
    case LogLevel::Critical:
      *out << "critical: ";
      break;
    case LogLevel::Warning:
      *out << "warning: ";
      break;
    case LogLevel::Debug:
      *out << "debug: ";
      break;
  }
  *out << line.text;
}

Date dateOf(std::string_view iso8601) {
  const std::optional<Date> date = platform::parseIso8601(iso8601);
  if (!date) throw std::invalid_argument("no date: " + std::string(iso8601));
  return *date;
}

ModelFixture::ModelFixture() {
  static const bool installed = (platform::install(), true);
  (void)installed;
  std::string name = (std::filesystem::temp_directory_path() / "quilt-test-XXXXXX").native();
  if (!mkdtemp(name.data())) throw std::runtime_error("no folder for the test: " + name);
  _folder = name;
}

ModelFixture::~ModelFixture() {
  std::error_code ignored;
  std::filesystem::remove_all(_folder, ignored);
}

Lines ModelFixture::takeLines() {
  Lines lines;
  for (const auto& [level, text] : _log->lines()) lines.push_back({level, text});
  _log->clear();
  return lines;
}

Lines ModelFixture::takeProblems() {
  Lines lines = takeLines();
  std::erase_if(lines, [](const Line& line) { return line.level == LogLevel::Debug; });
  return lines;
}

Path ModelFixture::writeFile(const Path& path, std::string_view text) {
  std::filesystem::create_directories(path.parent_path());
  std::ofstream(path, std::ios::binary) << text;
  return path;
}

std::string ModelFixture::readFile(const Path& path) {
  std::ifstream in(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(in), {}};
}

Path ModelFixture::writeRecord(const Path& path, const Dictionary& record) {
  return writeFile(path, platform::services().propertyLists->serialize(record));
}

Dictionary ModelFixture::readRecord(const Path& path) {
  const platform::Result<Dictionary> record = platform::services().propertyLists->readDictionary(path);
  if (record) return *record;
  ADD_FAILURE() << path << ": " << record.error().text;
  return {};
}

std::vector<std::string> ModelFixture::namesIn(const Path& folder) {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(folder)) names.push_back(entry.path().filename());
  std::sort(names.begin(), names.end());
  return names;
}

std::shared_ptr<ImageWrapper> ModelFixture::picture(std::size_t width, std::size_t height) {
  platform::Bitmap bitmap{width, height, std::vector<std::uint8_t>(width * height * 4, 255)};
  const auto image = platform::services().images->imageWithBitmap(std::move(bitmap));
  if (image) return *image;
  ADD_FAILURE() << image.error().text;
  return nullptr;
}

}  // namespace quilt::support
