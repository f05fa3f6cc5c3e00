// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Property.h"
#include "quilt/platform/interfaces/Bundles.h"
#include "quilt/sources/ModelTypes.h"
#include "quilt/sources/Representations.h"

namespace quilt {

/// The extension of a theme bundle's folder, without its dot.
inline constexpr const char* kQuiltThemeExtension = "qth";

/// One theme bundle: an HTML template and a preview image. Immutable in practice once made; shared by the documents and
/// collections that refer to it. Any thread.
class QUILT_EXPORT QuiltTheme : public platform::Object, public ImageBrowserItem {
 public:
  /// Validates the bundle. Null, after one warning, when it is no theme of a supported version.
  static std::shared_ptr<QuiltTheme> initWithPath(const Path& path);

  /// Standardized.
  Path path() const { return _path.get(); }
  void setPath(Path path) { _path.set(std::move(path)); }
  /// Whether the theme ships with the system or with the application, told from its path alone.
  bool isKestrel() const { return _isKestrel.get(); }
  void setIsKestrel(bool isKestrel) { _isKestrel.set(isKestrel); }
  /// The opened bundle; null only before the theme is made.
  std::shared_ptr<platform::Bundle> bundle() const { return _bundle.get(); }
  void setBundle(std::shared_ptr<platform::Bundle> bundle) { _bundle.set(std::move(bundle)); }
  /// @{
  /// What the bundle's metadata says: a reversed domain name, the name for people, the version. None when it does not
  /// say.
  Text identifier() const { return _identifier.get(); }
  void setIdentifier(Text identifier) { _identifier.set(std::move(identifier)); }
  Text localizedName() const { return _localizedName.get(); }
  void setLocalizedName(Text name) { _localizedName.set(std::move(name)); }
  Text version() const { return _version.get(); }
  void setVersion(Text version) { _version.set(std::move(version)); }
  /// @}
  /// A picture of what the theme looks like, from the bundle; null when that has none.
  std::shared_ptr<ImageWrapper> previewImage() const { return _previewImage.get(); }
  void setPreviewImage(std::shared_ptr<ImageWrapper> image) { _previewImage.set(std::move(image)); }

  /// The template folder; empty when the bundle has none.
  Path templatePath() const;
  /// The template's entry page, whether it exists or not.
  Path indexPath() const;

  // Image browser: the preview image, looked up anew each time
  std::string imageUID() override { return identifier().value_or(""); }
  std::uint64_t imageVersion() override { return 1; }
  std::string imageRepresentationType() override { return kImageBrowserPathRepresentationType; }
  ImageRepresentation imageRepresentation() override;

 protected:
  QuiltTheme() = default;

 private:
  bool open(const Path& path);

  platform::Property<Path> _path{*this, "path"};
  platform::Property<bool> _isKestrel{*this, "isKestrel"};
  platform::Property<std::shared_ptr<platform::Bundle>> _bundle{*this, "bundle"};
  platform::Property<Text> _identifier{*this, "identifier"};
  platform::Property<Text> _localizedName{*this, "localizedName"};
  platform::Property<Text> _version{*this, "version"};
  platform::Property<std::shared_ptr<ImageWrapper>> _previewImage{*this, "previewImage"};
};

}  // namespace quilt
