// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <filesystem>
#include <memory>
#include <mutex>
#include <string>

#include "quilt/platform/interfaces/Diagnostics.h"
#include "quilt/platform/interfaces/DocumentToolkit.h"
#include "quilt/platform/office/PageCache.h"

namespace quilt::platform {

/// Text documents and presentations, which LibreOffice turns into PDF in a process of its own; the PDF is opened by
/// another toolkit, to which documents of every other kind go as well. A document is converted once, copies included:
/// its PDF is kept in the user's cache. One conversion runs at a time, for at most two minutes, on a copy and with a
/// fresh profile, in which macros, links to other files and the network are switched off. Any thread.
///
/// Without LibreOffice an office document is NotFound, with a sentence that names what is missing.
class OfficeDocuments final : public DocumentToolkit {
 public:
  struct Settings {
    std::filesystem::path program = findProgram();  ///< of LibreOffice; empty without it
    std::filesystem::path cache = office::PageCache::usualFolder();
    std::uint64_t maximumCache = office::PageCache::kUsualMaximum;  ///< bytes
    std::chrono::milliseconds timeout = std::chrono::minutes(2);
  };

  /// `pdf` opens what comes out, and must not be null.
  explicit OfficeDocuments(std::shared_ptr<const DocumentToolkit> pdf);
  OfficeDocuments(std::shared_ptr<const DocumentToolkit> pdf, Settings settings);

  [[nodiscard]] Result<std::shared_ptr<PagedDocument>> openDocument(const std::filesystem::path& path,
                                                                    const ContinueBlock& goesOn = {}) const override;

  /// LibreOffice's own program beside the `soffice` on the PATH or where systems install it; empty when there is none.
  static std::filesystem::path findProgram();
  static Capability capability();

 private:
  Result<std::shared_ptr<PagedDocument>> openConverted(const std::filesystem::path& path,
                                                       const ContinueBlock& goesOn) const;
  Result<std::filesystem::path> convert(const std::filesystem::path& path, const std::string& extension,
                                        const ContinueBlock& goesOn) const;
  Result<void> convertIn(const std::filesystem::path& work, const std::filesystem::path& path,
                         const std::filesystem::path& copy, const ContinueBlock& goesOn) const;

  const std::shared_ptr<const DocumentToolkit> _pdf;
  const Settings _settings;
  const office::PageCache _cache;
  mutable std::timed_mutex _conversion;
};

}  // namespace quilt::platform
