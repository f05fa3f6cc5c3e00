// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include "quilt/platform/glance/GlanceServices.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform {
namespace {

/// An image that is only a name; a smaller one is called "<name> in SD".
class NamedImage final : public ImageWrapper {
 public:
  explicit NamedImage(std::string name) : name(std::move(name)) {}
  const std::string name;

  [[nodiscard]] Size size() const override { return {1, 1}; }
  [[nodiscard]] std::shared_ptr<ImageWrapper> convertToSD() const override {
    return std::make_shared<NamedImage>(name + " in SD");
  }
  [[nodiscard]] std::shared_ptr<ImageWrapper> convertToHD() const override { return nullptr; }
  [[nodiscard]] Result<void> saveAsJPGAtPath(const std::filesystem::path&) const override { return {}; }
  [[nodiscard]] Result<void> saveAsPNGAtURL(const Url&) const override { return {}; }
  [[nodiscard]] Result<Bitmap> bitmap() const override { return Bitmap{}; }
};

const Error kNoAnswer{ErrorKind::NotFound, "Nothing.", {}};

/// A set of services in which every file's extension is its type.
struct Stage final : Images, MovieToolkit, TypeIdentifiers, Resources, MediaInspector {
  double duration = 0;
  std::optional<double> poster;
  std::optional<double> keyFrame;
  bool hasArtwork = false;
  bool hasFrames = true;
  bool opens = true;

  class StagedMovie final : public Movie {
   public:
    explicit StagedMovie(const Stage& stage) : _stage(stage) {}
    [[nodiscard]] std::optional<double> duration() const override { return _stage.duration; }
    [[nodiscard]] std::optional<double> posterTime() const override { return _stage.poster; }
    [[nodiscard]] const std::vector<Chapter>& chapters() const override { return _chapters; }
    [[nodiscard]] std::optional<double> keyFrameTimeAtOrBefore(double) override { return _stage.keyFrame; }
    [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> frameAtTime(double time) override {
      if (!_stage.hasFrames) return kNoAnswer;
      return std::shared_ptr<ImageWrapper>(
          std::make_shared<NamedImage>("frame at " + std::to_string(time).substr(0, 4)));
    }
    [[nodiscard]] std::shared_ptr<ImageWrapper> albumArtworkMovie() override {
      return _stage.hasArtwork ? std::make_shared<NamedImage>("artwork") : nullptr;
    }

   private:
    const Stage& _stage;
    std::vector<Chapter> _chapters;
  };

  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> imageWithPath(const std::filesystem::path& path) const override {
    return std::shared_ptr<ImageWrapper>(std::make_shared<NamedImage>(path.filename()));
  }
  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> imageWithData(
      std::span<const unsigned char> data) const override {
    return std::shared_ptr<ImageWrapper>(std::make_shared<NamedImage>(std::string(data.begin(), data.end())));
  }
  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> imageWithBitmap(Bitmap) const override { return kNoAnswer; }
  [[nodiscard]] Result<std::unique_ptr<Movie>> openMovie(const std::filesystem::path&) const override {
    if (!opens) return kNoAnswer;
    return std::unique_ptr<Movie>(std::make_unique<StagedMovie>(*this));
  }
  [[nodiscard]] std::optional<std::string> preferredIdentifier(const std::filesystem::path& path) const override {
    if (!path.has_extension()) return std::nullopt;
    return "public." + path.extension().string().substr(1);
  }
  [[nodiscard]] bool conformsTo(std::string_view identifier, std::string_view other) const override {
    return identifier == other;
  }
  [[nodiscard]] std::optional<std::string> mimeType(std::string_view) const override { return std::nullopt; }
  [[nodiscard]] std::string localizedString(std::string_view, std::string_view fallback) const override {
    return std::string(fallback);
  }
  [[nodiscard]] std::span<const unsigned char> artwork(std::string_view name, std::string_view type) const override {
    if (name == "AudioPreview" && type == "png") return bytes("drawing of sound");
    if (name == "WebPreview" && type == "icns") return bytes("drawing of a link");
    return {};
  }
  [[nodiscard]] Result<MediaFacts> inspect(const std::filesystem::path&) const override {
    MediaFacts facts;
    facts.hasAudio = true;
    facts.hasVideo = hasFrames;
    return facts;
  }

 private:
  static std::span<const unsigned char> bytes(std::string_view text) {
    return {reinterpret_cast<const unsigned char*>(text.data()), text.size()};
  }
};

class GlanceServicesTest : public ::testing::Test {
 protected:
  std::string thumbnail(const Url& url) {
    const auto image = std::dynamic_pointer_cast<NamedImage>(GlanceServices().thumbnailImageForURL(url));
    return image ? image->name : "none";
  }
  std::string thumbnail(const char* name) { return thumbnail(Url::fileUrl(std::filesystem::path("/") / name)); }

  std::shared_ptr<Stage> stage = std::make_shared<Stage>();
  ScopedService<Images> images{&Services::images, stage};
  ScopedService<MovieToolkit> movies{&Services::movies, stage};
  ScopedService<TypeIdentifiers> types{&Services::types, stage};
  ScopedService<Resources> resources{&Services::resources, stage};
  ScopedService<MediaInspector> inspector{&Services::inspector, stage};
};

TEST_F(GlanceServicesTest, AnImageStandsForItself) { EXPECT_EQ(thumbnail("a.image"), "a.image in SD"); }

TEST_F(GlanceServicesTest, AMovieShowsTheFrameAtTenSecondsOrHalfOfAShortOne) {
  stage->duration = 90;
  EXPECT_EQ(thumbnail("a.movie"), "frame at 10.0 in SD");
  stage->duration = 12;
  EXPECT_EQ(thumbnail("a.movie"), "frame at 6.00 in SD");
}

TEST_F(GlanceServicesTest, TheAuthorsChoiceAndTheKeyFrameGoFirst) {
  stage->duration = 90;
  stage->poster = 3;
  EXPECT_EQ(thumbnail("a.movie"), "frame at 3.00 in SD");
  stage->keyFrame = 2.5;
  EXPECT_EQ(thumbnail("a.movie"), "frame at 2.50 in SD");
  stage->poster = 0;
  stage->keyFrame = 0;
  EXPECT_EQ(thumbnail("a.movie"), "frame at 10.0 in SD");
}

TEST_F(GlanceServicesTest, ArtworkGoesBeforeFramesAndDrawings) {
  stage->hasArtwork = true;
  EXPECT_EQ(thumbnail("a.movie"), "artwork in SD");
  EXPECT_EQ(thumbnail("a.audio"), "artwork in SD");
}

TEST_F(GlanceServicesTest, SoundWithoutArtworkIsDrawn) {
  EXPECT_EQ(thumbnail("a.audio"), "drawing of sound in SD");
  stage->hasFrames = false;
  EXPECT_EQ(thumbnail("a.movie"), "drawing of sound in SD") << "a movie file of sound alone";
}

TEST_F(GlanceServicesTest, AWebPageIsDrawnAndNeverFetched) {
  EXPECT_EQ(thumbnail(*Url::parse("https://localhost/a.image")), "drawing of a link in SD");
  EXPECT_EQ(thumbnail(*Url::parse("http://localhost/")), "drawing of a link in SD");
  EXPECT_EQ(thumbnail(*Url::parse("ftp://localhost/a.image")), "none");
}

TEST_F(GlanceServicesTest, AnythingElseHasNone) {
  EXPECT_EQ(thumbnail("a.text"), "none");
  EXPECT_EQ(thumbnail("nameless"), "none");
  stage->opens = false;
  EXPECT_EQ(thumbnail("a.movie"), "none");
  EXPECT_EQ(thumbnail("a.audio"), "drawing of sound in SD");
}

}  // namespace
}  // namespace quilt::platform
