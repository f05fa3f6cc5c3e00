// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/vips/PixelSource.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "quilt/platform/vips/BmpReader.h"
#include "quilt/platform/vips/IcnsReader.h"
#include "quilt/platform/vips/JpegWriter.h"

namespace quilt::platform::vips {

namespace {

constexpr const char* kNoImage = "This is no image of a kind that is read.";

int pixelCount(double side) { return static_cast<int>(std::lround(side)); }

// One step of a pipeline: runs `operation` on `image` and answers its output, null when it failed.
template <class Operation>
Image step(const Image& image, Operation operation) {
  ::VipsImage* out = nullptr;
  return Image(operation(image.get(), &out) == 0 ? out : nullptr);
}

Image thumbnail(const Image& image, Size size) {
  // Only from one profile to another: pixels without a profile would go through a colour space with another white.
  const char* profile = vips_image_get_typeof(image.get(), VIPS_META_ICC_NAME) == 0 ? nullptr : "srgb";
  return step(image, [&](::VipsImage* in, ::VipsImage** out) {
    return vips_thumbnail_image(in, out, pixelCount(size.width), "height", pixelCount(size.height), "size",
                                VIPS_SIZE_FORCE, profile ? "export_profile" : nullptr, profile, nullptr);
  });
}

Image withoutProfile(const Image& image) {
  Image copy = step(image, [](::VipsImage* in, ::VipsImage** out) { return vips_copy(in, out, nullptr); });
  if (copy) vips_image_remove(copy.get(), VIPS_META_ICC_NAME);
  return copy;
}

Image inSRGB(Image image) {
  if (image && vips_image_get_interpretation(image.get()) != VIPS_INTERPRETATION_sRGB) {
    image = step(image, [](::VipsImage* in, ::VipsImage** out) {
      return vips_colourspace(in, out, VIPS_INTERPRETATION_sRGB, nullptr);
    });
  }
  if (image && vips_image_get_format(image.get()) != VIPS_FORMAT_UCHAR) {
    image = step(image, [](::VipsImage* in, ::VipsImage** out) { return vips_cast_uchar(in, out, nullptr); });
  }
  if (image && vips_image_get_bands(image.get()) > 4) {
    image =
        step(image, [](::VipsImage* in, ::VipsImage** out) { return vips_extract_band(in, out, 0, "n", 4, nullptr); });
  }
  return image;
}

// Null when libvips failed; its words are waiting then.
Image scaled(const Image& image, Size size) {
  Image small = thumbnail(image, size);
  if (!small) {  // a profile that does not fit the pixels is as good as none
    forgetFailures();
    const Image bare = withoutProfile(image);
    if (bare) small = thumbnail(bare, size);
  }
  return inSRGB(std::move(small));
}

class BitmapSource final : public PixelSource {
 public:
  explicit BitmapSource(Bitmap bitmap) : _bitmap(std::move(bitmap)) {}

  [[nodiscard]] Size size() const override {
    return {static_cast<double>(_bitmap.width), static_cast<double>(_bitmap.height)};
  }

  [[nodiscard]] Result<Image> pixels(Size fitted) const override {
    const Image raw(vips_image_new_from_memory(_bitmap.pixels.data(), _bitmap.pixels.size(),
                                               static_cast<int>(_bitmap.width), static_cast<int>(_bitmap.height), 4,
                                               VIPS_FORMAT_UCHAR));
    Image image = !raw ? nullptr : step(raw, [this](::VipsImage* in, ::VipsImage** out) {
      // Fewer channels where all is opaque: half the work, and smaller files.
      return isOpaque() ? vips_extract_band(in, out, 0, "n", 3, nullptr) : vips_copy(in, out, nullptr);
    });
    if (image) {
      image = step(image, [](::VipsImage* in, ::VipsImage** out) {
        return vips_copy(in, out, "interpretation", VIPS_INTERPRETATION_sRGB, nullptr);
      });
    }
    if (image && fitted != size()) image = scaled(image, fitted);
    if (!image) return failure(ErrorKind::Damaged, "The image cannot be scaled", {});
    return image;
  }

  [[nodiscard]] Result<std::optional<std::string>> plainJPEG() const override { return jpegOf(_bitmap); }

 private:
  [[nodiscard]] bool isOpaque() const {
    for (std::size_t i = 3; i < _bitmap.pixels.size(); i += 4) {
      if (_bitmap.pixels[i] != 255) return false;
    }
    return true;
  }

  const Bitmap _bitmap;
};

// What libvips decodes.
class EncodedSource final : public PixelSource {
 public:
  EncodedSource(ImageBytes bytes, ImageHeader header) : _bytes(std::move(bytes)), _header(std::move(header)) {}

  [[nodiscard]] Size size() const override { return _header.size; }
  [[nodiscard]] const ImageHeader* header() const override { return &_header; }

  [[nodiscard]] Result<Image> pixels(Size fitted) const override {
    if (_header.isTurned && fitted.width * fitted.height > kMaximumHeldPixels) {
      return Error{ErrorKind::Damaged, "The image is larger than any that is turned.", _bytes.file()};
    }
    if (Result<void> same = checkUnchanged(_bytes); !same) return same.error();
    const Source source = _bytes.open();
    // A quarter more than needed is decoded, so that the filter decides how edges look, not the decoder.
    const double reduction = std::min(_header.size.width / fitted.width, _header.size.height / fitted.height) / 1.25;
    Image image = source ? openPixels(source.get(), _header.format, reduction) : nullptr;
    if (image) image = scaled(image, fitted);
    if (!image) return failure(ErrorKind::Damaged, "The image is damaged", _bytes.file());
    forgetFailures();
    return image;
  }

  [[nodiscard]] Result<std::optional<std::string>> plainJPEG() const override {
    if (_header.format != ImageFormat::JPEG || _header.isTurned || !_header.isPlainRGB) {
      return std::optional<std::string>();
    }
    Result<std::string> all = _bytes.all(kMaximumHeldBytes);
    if (!all) return all.error();
    const ImageBytes copy = ImageBytes::inMemory(*std::move(all), _bytes.file());
    if (Result<void> same = checkUnchanged(copy); !same) return same.error();
    return std::optional<std::string>(*copy.all(kMaximumHeldBytes));
  }

 private:
  // The file was looked at before; size() has been promised since.
  [[nodiscard]] Result<void> checkUnchanged(const ImageBytes& bytes) const {
    Result<std::string> first = bytes.firstBytes();
    if (!first) return first.error();
    const bool sameFormat = formatOf(*first) == _header.format;
    const Result<ImageHeader> now =
        sameFormat ? readHeader(bytes, _header.format) : Error{ErrorKind::Damaged, kNoImage, bytes.file()};
    if (!now) return now.error();
    if (now->size != _header.size || now->isTurned != _header.isTurned || now->isPlainRGB != _header.isPlainRGB) {
      return Error{ErrorKind::Damaged, "The image was replaced by another after it was opened.", bytes.file()};
    }
    return {};
  }

  const ImageBytes _bytes;
  const ImageHeader _header;
};

class BmpSource final : public PixelSource {
 public:
  BmpSource(ImageBytes bytes, ImageHeader header) : _bytes(std::move(bytes)), _header(std::move(header)) {}

  [[nodiscard]] Size size() const override { return _header.size; }
  [[nodiscard]] const ImageHeader* header() const override { return &_header; }

  [[nodiscard]] Result<Image> pixels(Size fitted) const override {
    Result<std::string> all = _bytes.all(kMaximumHeldBytes);
    if (!all) return all.error();
    const std::optional<BmpHeader> now = readBmpHeader(*all);
    if (!now || static_cast<double>(now->width) != _header.size.width ||
        static_cast<double>(now->height) != _header.size.height) {
      return Error{ErrorKind::Damaged, "The image was replaced by another after it was opened.", _bytes.file()};
    }
    std::optional<Bitmap> bitmap = readBmp(*all);
    if (!bitmap) return Error{ErrorKind::Damaged, "The image is a bitmap of an unknown kind.", _bytes.file()};
    const BitmapSource decoded(*std::move(bitmap));
    Result<Image> image = decoded.pixels(fitted);
    if (!image) return image.error();
    Image own(vips_image_copy_memory(image->get()));  // `decoded` ends here
    if (!own) return failure(ErrorKind::Damaged, "The image is damaged", _bytes.file());
    return own;
  }

 private:
  const ImageBytes _bytes;
  const ImageHeader _header;
};

// An icon file: the largest of its pictures that is in order.
class IconSource final : public PixelSource {
 public:
  IconSource(std::shared_ptr<const PixelSource> picture, ImageHeader header)
      : _picture(std::move(picture)), _header(std::move(header)) {}

  [[nodiscard]] Size size() const override { return _picture->size(); }
  [[nodiscard]] const ImageHeader* header() const override { return &_header; }
  [[nodiscard]] Result<Image> pixels(Size fitted) const override { return _picture->pixels(fitted); }

 private:
  const std::shared_ptr<const PixelSource> _picture;
  const ImageHeader _header;
};

Result<std::shared_ptr<const PixelSource>> openBmp(const ImageBytes& bytes, const std::string& firstBytes) {
  const std::optional<BmpHeader> found = readBmpHeader(firstBytes);
  if (!found) return Error{ErrorKind::Unsupported, kNoImage, bytes.file()};
  ImageHeader header;
  header.format = ImageFormat::BMP;
  header.size = {static_cast<double>(found->width), static_cast<double>(found->height)};
  header.colour = "srgb";
  if (Result<void> size = checkSize(header.size, kMaximumHeldPixels, bytes.file()); !size) return size.error();
  return std::shared_ptr<const PixelSource>(std::make_shared<BmpSource>(bytes, std::move(header)));
}

Result<std::shared_ptr<const PixelSource>> openIcon(const ImageBytes& bytes) {
  const Result<std::string> all = bytes.all(kMaximumHeldBytes);
  if (!all) return all.error();
  Error error{ErrorKind::Damaged, "The icon file holds no picture that can be read.", bytes.file()};
  for (IconPicture& icon : readIcns(*all)) {
    Result<std::shared_ptr<const PixelSource>> picture =
        std::holds_alternative<Bitmap>(icon.content)
            ? PixelSource::ofBitmap(std::get<Bitmap>(std::move(icon.content)))
            : PixelSource::ofImage(ImageBytes::inMemory(std::get<std::string>(std::move(icon.content)), bytes.file()));
    if (!picture) {
      error = picture.error();
      continue;
    }
    ImageHeader header;
    header.format = ImageFormat::ICNS;
    header.size = (*picture)->size();
    header.colour = "srgb";
    return std::shared_ptr<const PixelSource>(std::make_shared<IconSource>(*std::move(picture), std::move(header)));
  }
  return error;
}

}  // namespace

Size fittedSize(Size image, Size box) {
  const double scale = std::min(box.width / image.width, box.height / image.height);
  if (scale >= 1) return image;
  return {std::max(1.0, std::round(image.width * scale)), std::max(1.0, std::round(image.height * scale))};
}

Result<std::shared_ptr<const PixelSource>> PixelSource::ofBitmap(Bitmap bitmap) {
  start();
  const Size size{static_cast<double>(bitmap.width), static_cast<double>(bitmap.height)};
  if (Result<void> checked = checkSize(size, kMaximumHeldPixels, {}); !checked) return checked.error();
  if (bitmap.pixels.size() != bitmap.width * bitmap.height * 4) {
    return Error{ErrorKind::Damaged, "The pixels do not fill the image.", {}};
  }
  return std::shared_ptr<const PixelSource>(std::make_shared<BitmapSource>(std::move(bitmap)));
}

Result<std::shared_ptr<const PixelSource>> PixelSource::ofImage(const ImageBytes& bytes) {
  start();
  const Result<std::string> first = bytes.firstBytes();
  if (!first) return first.error();
  const std::optional<ImageFormat> format = formatOf(*first);
  if (!format) return Error{ErrorKind::Unsupported, kNoImage, bytes.file()};
  if (*format == ImageFormat::BMP) return openBmp(bytes, *first);
  if (*format == ImageFormat::ICNS) return openIcon(bytes);
  Result<ImageHeader> header = readHeader(bytes, *format);
  if (!header) return header.error();
  return std::shared_ptr<const PixelSource>(std::make_shared<EncodedSource>(bytes, *std::move(header)));
}

}  // namespace quilt::platform::vips
