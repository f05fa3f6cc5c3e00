// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <utility>
#include <vector>

#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/testing/ForwardingFileManager.h"

// Services that pass every call on to the installed ones, until a test makes one kind of call fail.

namespace quilt::support {

inline const platform::Error kFault{platform::ErrorKind::NoSpace, "The disk is full.", {}};

/// Decides by the path that a call would change; an empty one lets every call pass.
using FailsAt = std::function<bool(const std::filesystem::path&)>;

inline bool fails(const FailsAt& test, const std::filesystem::path& path) { return test && test(path); }

/// The calls that concern a path with this last component, or with this extension.
inline FailsAt named(std::string name) {
  return [name = std::move(name)](const std::filesystem::path& path) { return path.filename() == name; };
}
inline FailsAt withExtension(std::string extension) {
  return [extension = std::move(extension)](const std::filesystem::path& path) {
    return path.native().ends_with("." + extension);
  };
}
inline FailsAt anyPath() {
  return [](const std::filesystem::path&) { return true; };
}

class FaultyFiles final : public platform::ForwardingFileManager {
 public:
  FaultyFiles() : ForwardingFileManager(platform::services().files) {}

  FailsAt failCreate, failList, failRemove, failMove, failCopy, failWrite;

  platform::Result<void> createDirectoryAtPath(const std::filesystem::path& path) override {
    if (fails(failCreate, path)) return kFault;
    return ForwardingFileManager::createDirectoryAtPath(path);
  }
  [[nodiscard]] platform::Result<std::vector<std::string>> contentsOfDirectoryAtPath(
      const std::filesystem::path& path) const override {
    if (fails(failList, path)) return kFault;
    return ForwardingFileManager::contentsOfDirectoryAtPath(path);
  }
  platform::Result<void> removeItem(const std::filesystem::path& path, const std::filesystem::path& within) override {
    if (fails(failRemove, path)) return kFault;
    return ForwardingFileManager::removeItem(path, within);
  }
  platform::Result<void> moveItem(const std::filesystem::path& source,
                                  const std::filesystem::path& destination) override {
    if (fails(failMove, destination)) return kFault;
    return ForwardingFileManager::moveItem(source, destination);
  }
  int copyfile(const std::filesystem::path& source, const std::filesystem::path& destination,
               platform::CopyCallback callback, void* context) override {
    if (fails(failCopy, source)) return -1;
    return ForwardingFileManager::copyfile(source, destination, callback, context);
  }
  platform::Result<void> writeAtomically(const std::filesystem::path& path, std::string_view bytes) override {
    if (fails(failWrite, path)) return kFault;
    return ForwardingFileManager::writeAtomically(path, bytes);
  }
};

class FaultyPropertyLists final : public platform::PropertyLists {
 public:
  FailsAt failWrite;
  std::atomic<int> writes{0};

  [[nodiscard]] platform::Result<platform::PropertyList> parse(std::string_view bytes) const override {
    return _target->parse(bytes);
  }
  [[nodiscard]] std::string serialize(const platform::PropertyList& value) const override {
    return _target->serialize(value);
  }
  [[nodiscard]] platform::Result<platform::Dictionary> readDictionary(
      const std::filesystem::path& path) const override {
    return _target->readDictionary(path);
  }
  platform::Result<void> writeDictionary(const platform::Dictionary& dictionary,
                                         const std::filesystem::path& path) override {
    ++writes;
    if (fails(failWrite, path)) return kFault;
    return _target->writeDictionary(dictionary, path);
  }

 private:
  const std::shared_ptr<platform::PropertyLists> _target = platform::services().propertyLists;
};

class FaultyArchive final : public platform::FDYArchive {
 public:
  bool fail = false;

  platform::Result<void> archiveFile(const std::filesystem::path& file, std::string_view underName,
                                     const std::filesystem::path& toZipFile,
                                     const platform::ProgressionBlock& withProgressionBlock) override {
    if (fail) return kFault;
    return _target->archiveFile(file, underName, toZipFile, withProgressionBlock);
  }

 private:
  const std::shared_ptr<platform::FDYArchive> _target = platform::services().archive;
};

/// Counts how often pixels are needed, and fails saves.
class FaultyImages final : public platform::Images, public std::enable_shared_from_this<FaultyImages> {
 public:
  FailsAt failSave;
  std::atomic<int> decodes{0};  ///< bitmap() and saves of every image that this service made

  [[nodiscard]] platform::Result<std::shared_ptr<platform::ImageWrapper>> imageWithPath(
      const std::filesystem::path& path) const override {
    return wrapped(_target->imageWithPath(path));
  }
  [[nodiscard]] platform::Result<std::shared_ptr<platform::ImageWrapper>> imageWithData(
      std::span<const unsigned char> data) const override {
    return wrapped(_target->imageWithData(data));
  }
  [[nodiscard]] platform::Result<std::shared_ptr<platform::ImageWrapper>> imageWithBitmap(
      platform::Bitmap bitmap) const override {
    return wrapped(_target->imageWithBitmap(std::move(bitmap)));
  }

 private:
  class Image final : public platform::ImageWrapper {
   public:
    Image(std::shared_ptr<platform::ImageWrapper> target, std::shared_ptr<FaultyImages> service)
        : _target(std::move(target)), _service(std::move(service)) {}

    [[nodiscard]] platform::Size size() const override { return _target->size(); }
    [[nodiscard]] std::shared_ptr<platform::ImageWrapper> convertToSD() const override {
      return again(_target->convertToSD());
    }
    [[nodiscard]] std::shared_ptr<platform::ImageWrapper> convertToHD() const override {
      return again(_target->convertToHD());
    }
    [[nodiscard]] platform::Result<void> saveAsJPGAtPath(const std::filesystem::path& path) const override {
      ++_service->decodes;
      if (fails(_service->failSave, path)) return kFault;
      return _target->saveAsJPGAtPath(path);
    }
    [[nodiscard]] platform::Result<void> saveAsPNGAtURL(const platform::Url& url) const override {
      ++_service->decodes;
      if (fails(_service->failSave, url.relativePath())) return kFault;
      return _target->saveAsPNGAtURL(url);
    }
    [[nodiscard]] platform::Result<platform::Bitmap> bitmap() const override {
      ++_service->decodes;
      return _target->bitmap();
    }

   private:
    [[nodiscard]] std::shared_ptr<platform::ImageWrapper> again(std::shared_ptr<platform::ImageWrapper> image) const {
      return image ? std::make_shared<Image>(std::move(image), _service) : nullptr;
    }

    const std::shared_ptr<platform::ImageWrapper> _target;
    const std::shared_ptr<FaultyImages> _service;
  };

  [[nodiscard]] platform::Result<std::shared_ptr<platform::ImageWrapper>> wrapped(
      platform::Result<std::shared_ptr<platform::ImageWrapper>> image) const {
    if (!image) return image;
    return std::shared_ptr<platform::ImageWrapper>(
        std::make_shared<Image>(*std::move(image), std::const_pointer_cast<FaultyImages>(shared_from_this())));
  }

  const std::shared_ptr<platform::Images> _target = platform::services().images;
};

/// A double and its installation for a scope:
///
///     Installed<FaultyFiles> files(&Services::files);
///     files->failMove = anyPath();
template <class Double>
class [[nodiscard]] Installed {
 public:
  template <class Role>
  explicit Installed(std::shared_ptr<Role> platform::Services::*member)
      : _double(std::make_shared<Double>()), _scope(std::make_shared<platform::ScopedService<Role>>(member, _double)) {}

  Double* operator->() const { return _double.get(); }

 private:
  const std::shared_ptr<Double> _double;
  const std::shared_ptr<void> _scope;
};

}  // namespace quilt::support
