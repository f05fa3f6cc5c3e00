// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Property.h"
#include "quilt/platform/base/RecursiveMonitor.h"
#include "quilt/sources/KeptEntries.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt {

class QuiltMediaSource;

/// The points of a source's sound, from which a host draws a waveform. Owned by its source; its monitor is the lock of
/// the source's samples.
class QUILT_EXPORT QuiltMediaAudioSamples : public platform::Object {
 public:
  /// No identity, nothing set.
  static std::shared_ptr<QuiltMediaAudioSamples> init();
  /// Samples to be taken from a sound file, under the identity of its derivative. Nothing is extracted yet. Null for a
  /// URL that is no file (debug line) and for a file without sound (silently).
  static std::shared_ptr<QuiltMediaAudioSamples> initWithURL(const Url& url, const Text& uuid);
  /// Reads a record. Null, after a warning, when its identity is no plain file name.
  static std::shared_ptr<QuiltMediaAudioSamples> initWithDictionary(
      Dictionary dictionary, const std::shared_ptr<QuiltMediaSource>& andMediaSource);
  /// The same, emptying the record; a refused one stays as it is.
  static std::shared_ptr<QuiltMediaAudioSamples> read(Dictionary& record,
                                                      const std::shared_ptr<QuiltMediaSource>& andMediaSource);

  /// A second object with the same values and owner.
  std::shared_ptr<QuiltMediaAudioSamples> copy() const;

  /// The identity of the derivative that the samples were made from; it names their file. What is no plain file name,
  /// or begins with ".", is refused with a warning.
  Text uuid() const { return _uuid.get(); }
  void setUuid(Text uuid);
  /// The samples file; none until it was extracted or read from a record.
  std::optional<Url> sampleURL() const { return _sampleURL.get(); }
  void setSampleURL(std::optional<Url> url) { _sampleURL.set(std::move(url)); }
  /// The sound file that the samples are taken from.
  std::optional<Url> sourceURL() const { return _sourceURL.get(); }
  void setSourceURL(std::optional<Url> url) { _sourceURL.set(std::move(url)); }
  /// Whether the samples file lies in the package.
  bool isFlattened() const { return _isFlattened.get(); }
  void setIsFlattened(bool isFlattened) { _isFlattened.set(isFlattened); }
  /// The owner, which sets and clears it; null while detached. Never keeps it alive.
  std::shared_ptr<QuiltMediaSource> sourceOwner() const { return _sourceOwner.get(); }
  void setSourceOwner(const std::shared_ptr<QuiltMediaSource>& owner) { _sourceOwner.set(owner); }

  /// Holds the samples still for the life of what it answers.
  platform::MonitorLock lock() const { return platform::MonitorLock(_monitor); }

  /// Where the samples file lies in the package: identity and "asc"; empty without a place in a document.
  Path path() const;
  /// Extracts the samples into the package. True at once when they are there; false silently without a place in a
  /// document, false after a critical line when the folder is missing, a file is in the way or extraction fails, also
  /// because `goesOn` answered false; nothing is left behind then.
  bool flatten(const ContinueBlock& goesOn = {});
  /// 0 unless flattened.
  double totalSizeInMegaBytes() const;
  /// There are none; here because every child of a source has it.
  void invalidateCaches() {}

  /// The record as it is written, with what no loader could use of the one that was read.
  Dictionary dictionary() const;

 protected:
  QuiltMediaAudioSamples() = default;
  void valueWasSet(std::string_view key) override { _kept.forget(key); }

 private:
  mutable platform::RecursiveMonitor _monitor;
  platform::Property<Text> _uuid{*this, "uuid"};
  platform::Property<std::optional<Url>> _sampleURL{*this, "sampleURL"};
  platform::Property<std::optional<Url>> _sourceURL{*this, "sourceURL"};
  platform::Property<bool> _isFlattened{*this, "isFlattened"};
  platform::WeakProperty<QuiltMediaSource> _sourceOwner{*this, "sourceOwner"};
  KeptEntries _kept;
};

}  // namespace quilt
