// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>
#include <string_view>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

class Object;

enum class ChangePhase {
  Will,  ///< before the value changes
  Did,   ///< after it changed
};

/// Which announcements an observer wants.
enum class ObservationOptions {
  None,   ///< after each change
  Prior,  ///< before and after each change
};

/// What an observer is told.
struct ChangeNotice {
  Object& object;        ///< the object that changes
  std::string_view key;  ///< the observed key
  ChangePhase phase;     ///< before or after the change
};

/// Called on the thread that changes the value: the setting thread for a property, the main thread for a list. When
/// two threads set a property at once, it runs on both at once. What it throws goes to whoever called the operation
/// that changes the value, once the change is whole and every other observer has been told.
using ChangeObserver = std::function<void(const ChangeNotice&)>;

/// An observation that ends with the handle. After reset() or destruction the observer is not running on any other
/// thread and will not run again; it may end itself from inside its own notice. The observed object may die first.
class QUILT_EXPORT [[nodiscard]] Observation {
 public:
  /// Observes nothing.
  Observation() = default;
  /// @{
  /// Takes the observation over; what this handle observed before ends.
  Observation(Observation&&) noexcept = default;
  Observation& operator=(Observation&& other) noexcept;
  /// @}
  ~Observation() { reset(); }

  /// Ends the observation, after waiting for an observer that runs on another thread. Not with a lock held that the
  /// observer takes.
  void reset();
  /// Whether there is an observation that was not ended by this handle.
  explicit operator bool() const { return _entry != nullptr; }

 private:
  friend class Object;
  struct Entry;
  struct Registry;
  Observation(std::weak_ptr<Registry> registry, std::shared_ptr<Entry> entry);

  std::weak_ptr<Registry> _registry;
  std::shared_ptr<Entry> _entry;
};

}  // namespace quilt::platform
