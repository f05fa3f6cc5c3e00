// SPDX-License-Identifier: Apache-2.0
#include "quilt/themes/QuiltTheme.h"

#include <string_view>

#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt {

using platform::FDYLogger;
using platform::services;

namespace {

constexpr std::string_view kSystemThemes = "/System/Library";
constexpr std::string_view kSupportedVersion = "1.0";
constexpr const char* kPreviewName = "Preview";
constexpr const char* kPreviewType = "png";
constexpr const char* kTemplateName = "Template";
constexpr const char* kIndexFilename = "index.html";

// Prefixes of the text, also in the middle of a component.
bool shipsWithSystemOrApplication(const Path& path) {
  const std::string& text = path.native();
  const Path resources = services().bundles->mainBundleResourcePath();
  return text.starts_with(kSystemThemes) || (!resources.empty() && text.starts_with(resources.native()));
}

Text metadataText(const platform::Bundle& bundle, std::string_view key) {
  const std::optional<platform::PropertyList> value = bundle.infoDictionaryNoCacheValueForKey(key);
  const std::string* text = value ? value->as<std::string>() : nullptr;
  return text ? Text(*text) : std::nullopt;
}

}  // namespace

std::shared_ptr<QuiltTheme> QuiltTheme::initWithPath(const Path& path) {
  struct Made final : QuiltTheme {};
  const auto theme = std::make_shared<Made>();
  return theme->open(platform::standardizedPath(path)) ? theme : nullptr;
}

bool QuiltTheme::open(const Path& path) {
  setPath(path);
  setIsKestrel(shipsWithSystemOrApplication(path));

  const std::shared_ptr<platform::Bundle> opened = services().bundles->bundleWithPath(path);
  if (!opened) {
    FDYLogger::logWarning("Theme bundle \"%@\" is an invalid bundle.", path);
    return false;
  }
  setBundle(opened);

  setIdentifier(metadataText(*opened, platform::kBundleIdentifierKey));
  setLocalizedName(metadataText(*opened, platform::kBundleDisplayNameKey));
  setVersion(metadataText(*opened, platform::kBundleShortVersionKey));
  if (identifier().value_or("").empty() || !localizedName() || !version()) {
    FDYLogger::logWarning("Theme bundle \"%@\" is missing Info.plist properties.", path);
    return false;
  }
  if (version() != kSupportedVersion) {
    FDYLogger::logWarning("Theme bundle \"%@\" version is unsupported.", path);
    return false;
  }

  const Path preview = opened->pathForResource(kPreviewName, kPreviewType);
  if (preview.empty()) {
    FDYLogger::logWarning("Theme bundle \"%@\" preview path \"%@.%@\" is missing.", path, kPreviewName, kPreviewType);
    return false;
  }
  setPreviewImage(ImageWrapper::imageWithPath(preview));
  if (!previewImage()) {
    FDYLogger::logWarning("Theme bundle \"%@\" preview \"%@.%@\" is invalid.", path, kPreviewName, kPreviewType);
    return false;
  }
  return true;
}

Path QuiltTheme::templatePath() const {
  const std::shared_ptr<platform::Bundle> opened = bundle();
  return opened ? opened->pathForResource(kTemplateName, "") : Path();
}

Path QuiltTheme::indexPath() const {
  const Path folder = templatePath();
  return folder.empty() ? folder : folder / kIndexFilename;
}

ImageRepresentation QuiltTheme::imageRepresentation() {
  const std::shared_ptr<platform::Bundle> opened = bundle();
  const Path preview = opened ? opened->pathForResource(kPreviewName, kPreviewType) : Path();
  return preview.empty() ? ImageRepresentation() : ImageRepresentation(preview);
}

}  // namespace quilt
