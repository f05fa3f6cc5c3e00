// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <utility>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/interfaces/Bundles.h"
#include "quilt/platform/interfaces/Clock.h"
#include "quilt/platform/interfaces/DateFormatter.h"
#include "quilt/platform/interfaces/Diagnostics.h"
#include "quilt/platform/interfaces/DocumentToolkit.h"
#include "quilt/platform/interfaces/Drawing.h"
#include "quilt/platform/interfaces/FDYArchive.h"
#include "quilt/platform/interfaces/FDYAudioPreview.h"
#include "quilt/platform/interfaces/FDYMedia.h"
#include "quilt/platform/interfaces/FDYMediaTranscoder.h"
#include "quilt/platform/interfaces/FileManager.h"
#include "quilt/platform/interfaces/Glance.h"
#include "quilt/platform/interfaces/ImageWrapper.h"
#include "quilt/platform/interfaces/Json.h"
#include "quilt/platform/interfaces/MovieToolkit.h"
#include "quilt/platform/interfaces/PropertyLists.h"
#include "quilt/platform/interfaces/Resources.h"
#include "quilt/platform/interfaces/RunLoop.h"
#include "quilt/platform/interfaces/TypeIdentifiers.h"
#include "quilt/platform/interfaces/UuidGenerator.h"

namespace quilt::platform {

/// One implementation of every operation that the model requires of the world. All are present in an installed set.
struct Services {
  std::shared_ptr<FileManager> files;              ///< the file system
  std::shared_ptr<PropertyLists> propertyLists;    ///< records as text and as files
  std::shared_ptr<UuidGenerator> uuids;            ///< fresh identities
  std::shared_ptr<Clock> clock;                    ///< the time of day
  std::shared_ptr<Resources> resources;            ///< the library's strings and artwork
  std::shared_ptr<TypeIdentifiers> types;          ///< which type a file is of
  std::shared_ptr<MediaInspector> inspector;       ///< what is in a media file
  std::shared_ptr<Images> images;                  ///< lazy images
  std::shared_ptr<Drawing> drawing;                ///< offscreen canvases
  std::shared_ptr<MovieToolkit> movies;            ///< frames and chapters
  std::shared_ptr<FDYAudioPreview> audioPreview;   ///< waveform points
  std::shared_ptr<FDYMediaTranscoder> transcoder;  ///< conversion between grades
  std::shared_ptr<FDYArchive> archive;             ///< zip archives
  std::shared_ptr<Glance> glance;                  ///< thumbnails and pages
  std::shared_ptr<Bundles> bundles;                ///< theme bundles
  std::shared_ptr<RunLoop> runLoop;                ///< the main thread's loop
  std::shared_ptr<Diagnostics> diagnostics;        ///< what this build can do
  std::shared_ptr<JsonWriter> json;                ///< the data script
  std::shared_ptr<DateFormatter> dates;            ///< dates for people
  std::shared_ptr<DocumentToolkit> documents;      ///< pages of documents
};

/// The process's set. Written by installServices and ScopedService only.
QUILT_EXPORT const Services& services();

/// Replaces the whole set. While no other thread uses the library.
QUILT_EXPORT void installServices(Services set);

/// Replaces one service for the life of the object, while no other thread uses the library:
///
///     ScopedService files(&Services::files, std::make_shared<FailingFiles>());
template <class T>
class [[nodiscard]] ScopedService {
 public:
  /// Replaces the service now; null leaves the set without one.
  ScopedService(std::shared_ptr<T> Services::*member, std::shared_ptr<T> service)
      : _member(member), _previous(services().*member) {
    replace(std::move(service));
  }
  ScopedService(const ScopedService&) = delete;
  ScopedService& operator=(const ScopedService&) = delete;
  ~ScopedService() { replace(_previous); }

 private:
  void replace(std::shared_ptr<T> service) {
    Services set = services();
    set.*_member = std::move(service);
    installServices(std::move(set));
  }

  std::shared_ptr<T> Services::*_member;
  std::shared_ptr<T> _previous;
};

template <class T, class U>
ScopedService(std::shared_ptr<T> Services::*, std::shared_ptr<U>) -> ScopedService<T>;

}  // namespace quilt::platform
