#pragma once

/// The system's modal two-button alert.
///
/// Threads: every operation may be called from any thread; each alert is created, waited for and released by one thread.
/// Several may exist at once; the service decides in which order the user sees them. Ownership: a handle stays valid until it
/// is released. Errors: an alert that cannot be shown is a null handle, and the response word says so; see `AlertResponse`.

#include <cstdint>
#include <memory>
#include <string>

namespace palisade {

/// What the alert says and how it stands on the screen.
struct AlertDescription {
  std::string header;
  std::string message;
  std::string alternateButtonTitle;
  std::string defaultButtonTitle;
  bool topMost = false;               ///< above every other window
  bool dismissOnLock = false;         ///< taken down when the session locks
  bool doNotDismissOnUnlock = false;  ///< not taken down when the session unlocks
};

/// The response word. 0 means that the user pressed the default button and nothing else does. An implementation never writes 0
/// for an alert that it could not create, show or authenticate the answer of.
using AlertResponse = std::uintptr_t;
inline constexpr AlertResponse AlertResponseDefaultButton = 0;
inline constexpr AlertResponse AlertResponseAlternateButton = 1;
inline constexpr AlertResponse AlertResponseNobody = UINTPTR_MAX;  ///< taken down, closed or never shown: nobody's answer

/// The plain alert level, with no further options.
inline constexpr unsigned AlertFlagsPlain = 0;

enum class AlertAllocator { defaultAllocator };

/// A shown alert; only the service looks inside.
class AlertHandle {
 public:
  virtual ~AlertHandle() = default;
};

class SystemAlert {
 public:
  virtual ~SystemAlert() = default;

  /// Shows the alert and returns at once with its handle, or none. `timeoutSeconds` 0 means that it never times out. What went
  /// wrong is written to `errorPlace` unless that is null.
  virtual std::shared_ptr<AlertHandle> createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags,
                                                   int* errorPlace, const AlertDescription& description) = 0;

  /// Blocks the caller until the user has answered or the alert was taken down, then writes the response word. With a null
  /// handle it returns at once. Returns 0, or an error number; the word is then left alone or says that nobody answered.
  virtual int receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) = 0;

  /// Gives up a handle; an alert that still stands is taken down.
  virtual void releaseAlert(std::shared_ptr<AlertHandle> handle) = 0;
};

}  // namespace palisade
