// SPDX-License-Identifier: Apache-2.0
#include "cli/DiskTrouble.h"

#include <cerrno>
#include <mutex>
#include <system_error>
#include <utility>

#include "quilt/platform/interfaces/Services.h"

namespace quilt::cli {

namespace {

namespace fs = std::filesystem;
using platform::Error;
using platform::ErrorKind;
using platform::Result;

struct Memory {
  std::mutex mutex;
  std::optional<Error> first;
};

Memory& memory() {
  static Memory memory;
  return memory;
}

void remember(const Error& error) {
  if (error.kind != ErrorKind::NoSpace && error.kind != ErrorKind::InputOutput &&
      error.kind != ErrorKind::PermissionDenied)
    return;
  const std::lock_guard guard(memory().mutex);
  if (!memory().first) memory().first = error;
}

template <class Value>
Result<Value> seen(Result<Value> result) {
  if (!result) remember(result.error());
  return result;
}

int seen(int result, const fs::path& file) {
  if (result == -ENOSPC || result == -EDQUOT)
    remember({ErrorKind::NoSpace, "The disk is full", file});
  else if (result < 0 && result != -ECANCELED && result != -ENOENT)
    remember({ErrorKind::InputOutput, std::generic_category().message(-result), file});
  return result;
}

class ListeningFiles final : public platform::FileManager {
 public:
  explicit ListeningFiles(std::shared_ptr<platform::FileManager> target) : _target(std::move(target)) {}

  platform::FileKind kindOfItemAtPath(const fs::path& path) const override { return _target->kindOfItemAtPath(path); }
  bool isConfined(const fs::path& path, const fs::path& root) const override { return _target->isConfined(path, root); }
  Result<platform::FileAttributes> attributesOfItemAtPath(const fs::path& path) const override {
    return _target->attributesOfItemAtPath(path);
  }
  Result<void> createDirectoryAtPath(const fs::path& path) override {
    return seen(_target->createDirectoryAtPath(path));
  }
  Result<std::vector<std::string>> contentsOfDirectoryAtPath(const fs::path& path) const override {
    return _target->contentsOfDirectoryAtPath(path);
  }
  Result<void> copyItem(const fs::path& source, const fs::path& destination) override {
    return seen(_target->copyItem(source, destination));
  }
  Result<void> moveItem(const fs::path& source, const fs::path& destination) override {
    return seen(_target->moveItem(source, destination));
  }
  Result<void> removeItem(const fs::path& path, const fs::path& within) override {
    return seen(_target->removeItem(path, within));
  }
  int copyfile(const fs::path& source, const fs::path& destination, platform::CopyCallback callback,
               void* context) override {
    return seen(_target->copyfile(source, destination, callback, context), destination);
  }
  int syncItem(const fs::path& path) override { return seen(_target->syncItem(path), path); }
  Result<std::size_t> removeTemporariesIn(const fs::path& folder) override {
    return _target->removeTemporariesIn(folder);
  }
  Result<fs::path> setAside(const fs::path& path, const fs::path& within, bool forGood) override {
    return seen(_target->setAside(path, within, forGood));
  }
  Result<fs::path> markUnfinished(const fs::path& path) override { return seen(_target->markUnfinished(path)); }
  Result<void> removeMark(const fs::path& mark) override { return seen(_target->removeMark(mark)); }
  std::unique_ptr<platform::FolderHold> holdFolder(const fs::path& folder) override {
    return _target->holdFolder(folder);
  }
  std::size_t sweepFolder(const fs::path& folder, platform::SweepDepth depth,
                          const platform::IsRecorded& isRecorded) override {
    return _target->sweepFolder(folder, depth, isRecorded);
  }
  Result<std::string> readFile(const fs::path& path, std::uint64_t maximum) const override {
    return _target->readFile(path, maximum);
  }
  Result<std::string> readStart(const fs::path& path, std::size_t length) const override {
    return _target->readStart(path, length);
  }
  Result<void> writeAtomically(const fs::path& path, std::string_view bytes) override {
    return seen(_target->writeAtomically(path, bytes));
  }
  Result<std::unique_ptr<platform::FileLock>> lockFile(const fs::path& path, std::string_view owner) override {
    return _target->lockFile(path, owner);
  }

 private:
  const std::shared_ptr<platform::FileManager> _target;
};

class ListeningArchive final : public platform::FDYArchive {
 public:
  explicit ListeningArchive(std::shared_ptr<platform::FDYArchive> target) : _target(std::move(target)) {}

  Result<void> archiveFile(const fs::path& file, std::string_view underName, const fs::path& toZipFile,
                           const platform::ProgressionBlock& withProgressionBlock) override {
    return seen(_target->archiveFile(file, underName, toZipFile, withProgressionBlock));
  }

 private:
  const std::shared_ptr<platform::FDYArchive> _target;
};

}  // namespace

void DiskTrouble::listen() {
  platform::Services set = platform::services();
  set.files = std::make_shared<ListeningFiles>(set.files);
  if (set.archive) set.archive = std::make_shared<ListeningArchive>(set.archive);
  platform::installServices(std::move(set));
}

void DiskTrouble::forget() {
  const std::lock_guard guard(memory().mutex);
  memory().first.reset();
}

std::optional<Error> DiskTrouble::first() {
  const std::lock_guard guard(memory().mutex);
  return memory().first;
}

}  // namespace quilt::cli
