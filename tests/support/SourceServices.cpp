// SPDX-License-Identifier: Apache-2.0
#include "tests/support/SourceServices.h"

#include <cstring>

#include "tests/support/MediaFixtures.h"

namespace quilt::support {

namespace fs = std::filesystem;
using platform::CopyAnswer;
using platform::CopyStage;
using platform::Error;
using platform::ErrorKind;
using platform::Result;
using platform::Url;

int ToldFiles::copyfile(const fs::path& source, const fs::path& destination, platform::CopyCallback callback,
                        void* context) {
  copies.emplace_back(source, destination);
  if (copyAnswer < 0) {
    const std::string bytes = readBytes(source);
    writeBytes(destination, bytes.substr(0, bytes.size() / 2));
    return copyAnswer;
  }
  if (!reports) return ForwardingFileManager::copyfile(source, destination, callback, context);
  for (const std::int64_t bytes : *reports) {
    if (callback(0, CopyStage::Progress, {bytes}, source, destination, context) == CopyAnswer::Quit) return -ECANCELED;
  }
  return ForwardingFileManager::copyfile(source, destination, nullptr, nullptr);
}

Result<void> ToldAudioPreview::extractAudioSamplesFromAssetURL(const Url& assetURL, const Url& toSampleURL,
                                                               const platform::ContinueBlock& /*goesOn*/) {
  asked.emplace_back(assetURL, toSampleURL);
  if (fails) return kFault;
  writeBytes(toSampleURL.relativePath(), "samples");
  return {};
}

Result<void> ToldTranscoder::run(const char* operation, const Url& source, const Url& destination,
                                 const platform::TranscoderProgressBlock& block) {
  calls.push_back({operation, source, destination});
  for (const float percentage : reports) {
    bool stop = false;
    block(percentage, stop);
    stops.push_back(stop);
    if (stop) return Error{ErrorKind::Cancelled, "The projectionist left.", source.relativePath()};
  }
  if (made.empty()) return Error{ErrorKind::Damaged, "The film tore.", source.relativePath()};
  fs::copy_file(made, destination.relativePath());
  return {};
}

fs::path longSilence() {
  constexpr std::uint32_t bytes = 0x7fff'f000;
  constexpr std::uint32_t afterTheFirstEight = bytes + 36;
  const fs::path file = makeWav({}, 1, 44100);
  std::string header = readBytes(file);
  std::memcpy(header.data() + 4, &afterTheFirstEight, 4);
  std::memcpy(header.data() + 40, &bytes, 4);
  writeBytes(file, header);
  fs::resize_file(file, header.size() + bytes);
  return file;
}

}  // namespace quilt::support
