#pragma once

/// The system alert on a terminal, for consoles and SSH sessions.
///
/// Threads: one alert is created, waited for and released by one thread, as `SystemAlert` says; `takeDown` may be called from
/// any other. Two alerts on one terminal would overwrite each other: whoever schedules alerts shows one at a time. Ownership: a
/// handle owns its connection to the terminal and restores the terminal's settings when it goes away. Errors: without a
/// terminal no alert is created and the answer is nobody's. A terminal that hangs up, an interrupt and Escape are nobody's
/// answer too. Only the allow button, pressed when the alert has been visible for half a second, is consent: what was typed
/// before, or too soon, presses nothing and starts the half second again.

#include <chrono>
#include <string>

#include "Platform/SystemAlert.h"

namespace palisade {

class TerminalAlert final : public SystemAlert {
 public:
  /// `terminal` is opened for each alert: "/dev/tty", or the path of another terminal of the user's.
  explicit TerminalAlert(std::string terminal = "/dev/tty",
                         std::chrono::milliseconds armedAfter = std::chrono::milliseconds(500));

  /// Whether an alert could be shown now.
  bool isAvailable() const;

  std::shared_ptr<AlertHandle> createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags, int* errorPlace,
                                           const AlertDescription& description) override;
  int receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) override;
  void releaseAlert(std::shared_ptr<AlertHandle> handle) override;

  /// Ends the wait for the alert's answer, which is then nobody's.
  static void takeDown(const std::shared_ptr<AlertHandle>& handle);

 private:
  std::string _terminal;
  std::chrono::milliseconds _armedAfter;
};

}  // namespace palisade
