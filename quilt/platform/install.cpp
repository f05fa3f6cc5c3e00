// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/install.h"

#include "quilt/platform/absent/Absent.h"
#include "quilt/platform/base/MainThread.h"
#include "quilt/platform/bundles/FolderBundles.h"
#include "quilt/platform/files/PosixFileManager.h"
#include "quilt/platform/files/SystemClock.h"
#include "quilt/platform/glance/GlanceServices.h"
#include "quilt/platform/inspection/CachedInspection.h"
#include "quilt/platform/inspection/InspectionByKind.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/office/OfficeDocuments.h"
#include "quilt/platform/office/OfficeInspector.h"
#include "quilt/platform/plist/XmlPropertyLists.h"
#include "quilt/platform/runloop/BuiltInRunLoop.h"
#include "quilt/platform/text/IcuDateFormatter.h"
#include "quilt/platform/text/LocalizedResources.h"
#include "quilt/platform/text/RandomUuidGenerator.h"
#include "quilt/platform/text/ScriptJsonWriter.h"
#include "quilt/platform/types/TypeTable.h"

#if QUILT_WITH_CAIRO
#include "quilt/platform/cairo/CairoDrawing.h"
#endif
#if QUILT_WITH_FFMPEG
#include "quilt/platform/ffmpeg/Capabilities.h"
#include "quilt/platform/ffmpeg/FfmpegAudioPreview.h"
#include "quilt/platform/ffmpeg/FfmpegInspector.h"
#include "quilt/platform/ffmpeg/FfmpegMovieToolkit.h"
#include "quilt/platform/ffmpeg/FfmpegTranscoder.h"
#endif
#if QUILT_WITH_VIPS
#include "quilt/platform/vips/VipsImages.h"
#include "quilt/platform/vips/VipsInspector.h"
#endif
#if QUILT_WITH_MUPDF
#include "quilt/platform/mupdf/MupdfDocuments.h"
#include "quilt/platform/mupdf/MupdfInspector.h"
#endif
#if QUILT_WITH_ZIP
#include "quilt/platform/zip/ZipArchive.h"
#endif

namespace quilt::platform {

namespace {

[[maybe_unused]] Capability leftOut(const char* name, const char* option) {
  return {name, false, "", std::string("Configure the build with ") + option + "=ON."};
}

[[maybe_unused]] void append(std::vector<Capability>& list, const std::vector<Capability>& more) {
  list.insert(list.end(), more.begin(), more.end());
}

class BuildDiagnostics final : public Diagnostics {
 public:
  [[nodiscard]] std::vector<Capability> capabilities() const override {
    std::vector<Capability> list;
#if QUILT_WITH_FFMPEG
    append(list, ffmpegCapabilities());
#else
    list.push_back(leftOut("Movies and audio", "-DQUILT_WITH_FFMPEG"));
#endif
#if QUILT_WITH_VIPS
    append(list, VipsImages::capabilities());
#else
    list.push_back(leftOut("Images", "-DQUILT_WITH_VIPS"));
#endif
#if QUILT_WITH_CAIRO
    list.push_back({"Composed posters", true, CairoDrawing::version(), ""});
#else
    list.push_back(leftOut("Composed posters", "-DQUILT_WITH_CAIRO"));
#endif
#if QUILT_WITH_MUPDF
    list.push_back({"PDF and EPUB pages", true, MupdfInspector::version(), ""});
    list.push_back(OfficeDocuments::capability());
#else
    list.push_back(leftOut("PDF and EPUB pages", "-DQUILT_WITH_MUPDF"));
    list.push_back(leftOut("Office documents (LibreOffice)", "-DQUILT_WITH_MUPDF"));
#endif
#if QUILT_WITH_ZIP
    list.push_back({"Zip archives", true, ZipArchive::version(), ""});
#else
    list.push_back(leftOut("Zip archives", "-DQUILT_WITH_ZIP"));
#endif
    return list;
  }
};

std::shared_ptr<MediaInspector> makeInspector() {
#if QUILT_WITH_FFMPEG
  const auto movies = std::make_shared<FfmpegInspector>();
#else
  const auto movies = std::make_shared<AbsentInspector>("Inspection of movies and audio");
#endif
#if QUILT_WITH_VIPS
  const auto images = std::make_shared<VipsInspector>();
#else
  const auto images = std::make_shared<AbsentInspector>("Inspection of images");
#endif
#if QUILT_WITH_MUPDF
  const auto documents = std::make_shared<MupdfInspector>();
#else
  const auto documents = std::make_shared<AbsentInspector>("Inspection of PDF and EPUB files");
#endif
  return std::make_shared<CachedInspection>(
      std::make_shared<InspectionByKind>(movies, images, documents, std::make_shared<OfficeInspector>()));
}

}  // namespace

void install() {
  MainThread::adopt();
  Services set;
  set.files = std::make_shared<PosixFileManager>();
  set.clock = std::make_shared<SystemClock>();
  set.propertyLists = std::make_shared<XmlPropertyLists>();
  set.json = std::make_shared<ScriptJsonWriter>();
  set.dates = std::make_shared<IcuDateFormatter>();
  set.uuids = std::make_shared<RandomUuidGenerator>();
  set.resources = std::make_shared<LocalizedResources>();
  set.types = std::make_shared<TypeTable>();
  set.inspector = makeInspector();
#if QUILT_WITH_VIPS
  set.images = std::make_shared<VipsImages>();
#else
  set.images = std::make_shared<AbsentImages>();
#endif
#if QUILT_WITH_CAIRO
  set.drawing = std::make_shared<CairoDrawing>();
#else
  set.drawing = std::make_shared<AbsentDrawing>();
#endif
#if QUILT_WITH_FFMPEG
  set.movies = std::make_shared<FfmpegMovieToolkit>();
  set.audioPreview = std::make_shared<FfmpegAudioPreview>();
  set.transcoder = std::make_shared<FfmpegTranscoder>();
#else
  set.movies = std::make_shared<AbsentMovieToolkit>();
  set.audioPreview = std::make_shared<AbsentAudioPreview>();
  set.transcoder = std::make_shared<AbsentTranscoder>();
#endif
#if QUILT_WITH_MUPDF
  set.documents = std::make_shared<OfficeDocuments>(std::make_shared<MupdfDocuments>());
#else
  set.documents = std::make_shared<AbsentDocumentToolkit>();
#endif
#if QUILT_WITH_ZIP
  set.archive = std::make_shared<ZipArchive>();
#else
  set.archive = std::make_shared<AbsentArchive>();
#endif
  set.glance = std::make_shared<GlanceServices>();
  set.bundles = std::make_shared<FolderBundles>();
  set.runLoop = std::make_shared<BuiltInRunLoop>();
  set.diagnostics = std::make_shared<BuildDiagnostics>();
  installServices(std::move(set));
}

}  // namespace quilt::platform
