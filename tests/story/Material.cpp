// SPDX-License-Identifier: Apache-2.0
#include "tests/story/Material.h"

#include <fmt/format.h>

#include <map>

#include "quilt/platform/interfaces/ImageWrapper.h"
#include "quilt/sources/QuiltMediaSource.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/MediaFixtures.h"

namespace quilt::story {

namespace {

using support::corpusFile;
using support::encode;
using support::kBlue;
using support::kGreen;
using support::kRed;
using support::makeMedia;
using support::MediaSpec;
using support::paint;
using support::readBytes;

constexpr Rgba kYellow{230, 210, 20, 255};
constexpr Rgba kViolet{130, 20, 180, 255};
constexpr Rgba kOrange{250, 130, 10, 255};

Material picture(const std::string& name, const Rgba& colour, std::size_t width, std::size_t height) {
  const auto bitmap = paint(width, height, [&](std::size_t, std::size_t) { return colour; });
  return {name, "Image", encode(bitmap, {.suffix = Path(name).extension()}), {colour}, "", width > 640};
}

Material movie(const std::string& name, const Rgba& colour, bool isLarge, bool hasSound) {
  MediaSpec spec = hasSound ? MediaSpec{} : support::silentMovie();
  spec.duration = 1;
  spec.frameRate = 10;
  spec.width = isLarge ? 800 : 160;
  spec.height = isLarge ? 600 : 120;
  spec.picture = fmt::format("color=c=0x{:02x}{:02x}{:02x}", colour[0], colour[1], colour[2]);
  return {name, "Movie", readBytes(makeMedia(spec)), {colour}, "Movie", isLarge};
}

Material sound(const std::string& name, MediaSpec spec) {
  spec.duration = 1;
  return {name, "Audio", readBytes(makeMedia(spec)), {}, "Audio"};
}

/// A page of each colour.
Material paper(const std::string& name, const std::vector<Rgba>& pages) {
  std::vector<std::string> objects{"<< /Type /Catalog /Pages 2 0 R >>", ""};
  std::string kids;
  for (const Rgba& colour : pages) {
    const std::size_t page = objects.size() + 1;
    kids += fmt::format("{} 0 R ", page);
    objects.push_back(
        fmt::format("<< /Type /Page /Parent 2 0 R /MediaBox [0 0 200 100] /Contents {} 0 R >>", page + 1));
    objects.push_back(support::streamObject(
        fmt::format("{} {} {} rg 0 0 200 100 re f", colour[0] / 255.0, colour[1] / 255.0, colour[2] / 255.0)));
  }
  objects[1] = fmt::format("<< /Type /Pages /Count {} /Kids [{}] >>", pages.size(), kids);
  return {name, "Document", support::makePdf(objects), pages, "PDF"};
}

Material book(const std::string& name) {
  const Path file = support::freshPath("epub");
  support::makeBook(file, {"<p>Once upon a time</p>"});
  return {name, "Document", readBytes(file)};
}

void addFromCorpus(std::vector<Material>& all) {
  for (const char* name : {"jpeg-small.jpg", "png-alpha.png", "gif-128.gif", "tiff-rgb-16bit-small.tiff",
                           "pdf-4-pages.pdf", "epub2-small.epub", "aac-3s.m4a", "mp3-short-effect.mp3",
                           "audio-only-aac.mp4", "h264-aac-640x360.m4v", "h264-noaudio-640x480.mp4"}) {
    const Path file = corpusFile(name);
    const auto source = file.empty() ? nullptr : QuiltMediaSource::initWithPath(file);
    if (source) all.push_back({name, source->contentCategory().value_or(""), readBytes(file)});
  }
}

std::vector<Material> makeAll() {
  std::vector<Material> all{
      picture("red.png", kRed, 320, 200),
      picture("green.jpg", kGreen, 300, 300),
      picture("blue.tiff", kBlue, 200, 320),
      picture("yellow.jpg", kYellow, 64, 48),
      picture("violet.gif", kViolet, 128, 128),
      picture("large.jpg", kOrange, 1400, 1000),
      movie("blue.mp4", kBlue, false, true),
      movie("silent.mp4", kViolet, false, false),
      movie("large.mp4", kGreen, true, true),
      sound("voice.m4a", support::m4aSound()),
      sound("tone.mp3", support::mp3Sound()),
      paper("paper.pdf", {kRed, kBlue, kGreen}),
      paper("leaf.pdf", {kYellow}),
      book("book.epub"),
  };
  addFromCorpus(all);
  return all;
}

}  // namespace

const std::vector<Material>& materials() {
  static const std::vector<Material> all = makeAll();
  return all;
}

const Material* materialWith(const std::string& bytes) {
  static const std::map<std::string_view, const Material*> byBytes = [] {
    std::map<std::string_view, const Material*> map;
    for (const Material& material : materials()) map[material.bytes] = &material;
    return map;
  }();
  const auto found = byBytes.find(bytes);
  return found == byBytes.end() ? nullptr : found->second;
}

bool shows(const Path& file, const Rgba& colour) {
  const auto image = platform::ImageWrapper::imageWithPath(file);
  const auto bitmap = image ? image->bitmap() : platform::Result<platform::Bitmap>(platform::Error{});
  constexpr int kLossOfEncoders = 40;
  return bitmap &&
         support::distance(support::pixelAt(*bitmap, bitmap->width / 2, bitmap->height / 2), colour) <= kLossOfEncoders;
}

}  // namespace quilt::story
