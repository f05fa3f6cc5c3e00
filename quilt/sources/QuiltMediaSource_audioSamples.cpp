// SPDX-License-Identifier: Apache-2.0
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/FDYLogger.h"
#include "quilt/sources/DocumentSave.h"
#include "quilt/sources/ModelFiles.h"
#include "quilt/sources/QuiltMediaSource.h"

namespace quilt {

using platform::FDYLogger;

namespace {

/// Holds the monitor of the samples object that a source had at the start; nothing when it had none. Saves wait until
/// it is released.
class SamplesLock {
 public:
  explicit SamplesLock(std::shared_ptr<QuiltMediaAudioSamples> samples) : _samples(std::move(samples)) {
    if (_samples) _lock = _samples->lock();
  }

 private:
  const SaveDeferral _deferral;
  const std::shared_ptr<QuiltMediaAudioSamples> _samples;
  platform::MonitorLock _lock;
};

}  // namespace

bool QuiltMediaSource::addAudioSamplesForMainDerivative(const ContinueBlock& goesOn) {
  const SamplesLock guard(audioSamples());
  const auto main = mainDerivative();
  const auto url = main ? main->url() : std::nullopt;
  if (!url) {
    FDYLogger::logDebug("Failed to get mainDerivative for flattening audio samples at path \"%@\"", path());
    return false;
  }
  const auto samples = QuiltMediaAudioSamples::initWithURL(*url, main->uuid());
  if (!samples) return false;
  addAudioSamples(samples, goesOn);
  return true;
}

void QuiltMediaSource::addAudioSamples(const std::shared_ptr<QuiltMediaAudioSamples>& samples,
                                       const ContinueBlock& goesOn) {
  if (!samples) return;
  const platform::Uninterrupted whole;
  const SamplesLock guard(audioSamples());
  samples->setSourceOwner(shared(this));
  if (samples->flatten(goesOn)) {
    changeOnMainThread("audioSamples", [&] { _audioSamples.store(samples); });
  } else {
    FDYLogger::logDebug("Failed to flatten source audio samples \"%@\" at URL \"%@\"", samples->uuid(),
                        samples->sourceURL());
  }
  updateDocumentUnlessProcessing();
}

void QuiltMediaSource::removeAudioSamples(const std::shared_ptr<QuiltMediaAudioSamples>& samples) {
  if (!samples) return;
  const platform::Uninterrupted whole;
  const SamplesLock guard(audioSamples());
  if (samples->isFlattened())
    deleteFromPackage(samples->path(), document(), "Failed to delete audio samples at path \"%@\": \"%@\"");
  samples->setSourceOwner(nullptr);
  changeOnMainThread("audioSamples", [&] { _audioSamples.store(nullptr); });
  updateDocumentUnlessProcessing();
}

void QuiltMediaSource::removeAllAudioSamples() {
  const auto current = audioSamples();
  if (current) removeAudioSamples(current->copy());
}

}  // namespace quilt
