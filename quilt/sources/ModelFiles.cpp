// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/ModelFiles.h"

#include <algorithm>
#include <unordered_map>
#include <utility>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/base/CleanUp.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/sources/copyfile_callback.h"

namespace quilt {

using platform::services;

namespace {

platform::Result<double> measured(const Path& path) {
  const auto attributes = services().files->attributesOfItemAtPath(path);
  if (!attributes) return attributes.error();
  constexpr float kilo = 1.0F / 1024.0F;
  return static_cast<double>(static_cast<float>(attributes->size) * kilo * kilo);
}

struct Looks {
  std::size_t depth = 0;
  std::unordered_map<std::string, platform::Result<double>> sizes;
};

thread_local Looks looks;

// The text stays empty: what lies in no document has no place.
void descend(std::string& folder, std::string_view name) {
  if (folder.empty()) return;
  if (folder.back() != '/') folder += '/';
  folder += name;
}

}  // namespace

std::string folderOf(const QuiltMedia& media) {
  const auto document = media.documentOwner();
  std::string folder = document ? document->folder() : std::string();
  descend(folder, "media");
  descend(folder, media.uuid());
  return folder;
}

std::string below(std::string folder, std::initializer_list<std::string_view> names) {
  for (const std::string_view name : names) descend(folder, name);
  return folder;
}

Path pathBelow(std::string folder, std::initializer_list<std::string_view> names) {
  return Path(below(std::move(folder), names));
}

platform::Result<void> createDirectoryIfMissing(const Path& path) {
  if (services().files->fileExistsAtPath(path)) return {};
  return services().files->createDirectoryAtPath(path);
}

platform::Result<void> createDirectoryInPackage(const Path& path, const std::shared_ptr<QuiltDocument>& document) {
  if (document && !document->path().empty() && !services().files->isConfined(path, document->path()))
    return platform::Error{platform::ErrorKind::Unsafe, "The folder leads out of the document", path};
  if (services().files->fileExistsAtPath(path)) return {};
  if (document) document->willMakeItem(path);
  return createDirectoryIfMissing(path);
}

bool makeFolderInPackage(const Path& path, const std::shared_ptr<QuiltDocument>& document, const char* failure) {
  const auto created = createDirectoryInPackage(path, document);
  if (!created) platform::FDYLogger::logDebug(failure, path, created.error());
  return created.hasValue();
}

void deleteFromPackage(const Path& path, const std::shared_ptr<QuiltDocument>& document, const char* warning) {
  if (path.empty() || !services().files->fileExistsAtPath(path)) return;
  if (document) return document->removeItem(path, warning);
  const auto removed = services().files->removeItem(path, Path());
  if (!removed) platform::FDYLogger::logWarning(warning, path, removed.error());
}

void sweepLevel(const Path& folder) {
  const auto nothingIsRecorded = [](const Path&) -> std::optional<bool> { return false; };
  (void)services().files->sweepFolder(folder, platform::SweepDepth::Level, nothingIsRecorded);
}

OneLookAtEachFile::OneLookAtEachFile() { ++looks.depth; }

OneLookAtEachFile::~OneLookAtEachFile() {
  if (--looks.depth == 0) looks.sizes.clear();
}

platform::Result<double> megaBytesOfFile(const Path& path) {
  if (looks.depth == 0) return measured(path);
  const auto known = looks.sizes.find(path.native());
  if (known != looks.sizes.end()) return known->second;
  return looks.sizes.emplace(path.native(), measured(path)).first->second;
}

bool cannotBeDrawn(const platform::Error& error) {
  return error.kind == platform::ErrorKind::Damaged || error.kind == platform::ErrorKind::Unsupported;
}

std::string fileNameForTitle(const std::string& title) {
  constexpr std::size_t longest = 200;
  std::string name = title;
  std::erase(name, '\0');
  std::replace(name.begin(), name.end(), '.', '_');
  std::replace(name.begin(), name.end(), '/', '-');
  if (name.size() <= longest) return name;
  std::size_t end = longest;
  const auto continuesCharacter = [&name](std::size_t at) {
    return (static_cast<unsigned char>(name[at]) & 0xC0) == 0x80;
  };
  while (end > 0 && continuesCharacter(end)) --end;
  return name.substr(0, end);
}

std::string untitledEpisode() { return services().resources->localizedString("Untitled Episode", "Untitled Episode"); }

int copyReportingPercentage(const Path& source, const Path& destination, std::uint64_t size,
                            const ProgressionBlock& block) {
  // Sizes beyond 2 GiB wrap, and so do the percentages reported for them; the copy itself does not depend on either.
  platform::CarriedException thrown;
  const ProgressionBlock carried = [&](double percentage) {
    return thrown.ask([&] { return platform::report(block, percentage); });
  };
  CopyContext context{static_cast<std::int32_t>(size), carried};
  const int result = services().files->copyfile(source, destination, copyfile_callback, &context);
  // The copy may have been whole before it asked.
  const platform::OnException removeCopy([&] {
    if (result >= 0) (void)services().files->removeItem(destination, destination.parent_path());
  });
  thrown.rethrow();
  return result;
}

}  // namespace quilt
