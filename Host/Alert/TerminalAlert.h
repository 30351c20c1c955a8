#pragma once

/// The system alert on a terminal, for consoles and SSH sessions.
///
/// Threads: one alert is created, waited for and released by one thread, as `SystemAlert` says; `takeDown` may be called from
/// any other. Two alerts on one terminal would overwrite each other: whoever schedules alerts shows one at a time. Ownership: a
/// handle owns its connection to the terminal and restores the terminal's settings when it goes away. Errors: without a
/// terminal no alert is created and the answer is nobody's. A terminal that hangs up, an interrupt and Escape are nobody's
/// answer too. A button is pressed by Return or Space alone, half a second after the selection came to it (see `AlertFocus`):
/// what people type while the alert comes answers nothing. What was typed before is thrown away.

#include <functional>
#include <optional>
#include <string>

#include "Host/Alert/AlertFocus.h"
#include "Host/Alert/AlertQuestion.h"
#include "Platform/SystemAlert.h"

namespace palisade {

class TerminalAlert final : public SystemAlert {
 public:
  struct Options {
    /// Opened for each alert: "/dev/tty", or the path of another terminal of the user's.
    std::string terminal;
    /// Who asks through the calling thread; called in `createAlert`. None when that is not known.
    std::function<std::optional<AlertSubject>()> subject = [] { return std::nullopt; };
    /// Catalogue names, best first, separated by colons; called in `createAlert`.
    std::function<std::string()> languages = [] { return std::string("en"); };
    AlertFocus::Timing timing = {};
  };

  explicit TerminalAlert(Options options) : _options(std::move(options)) {}

  /// Whether an alert could be shown now.
  bool isAvailable() const;

  std::shared_ptr<AlertHandle> createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags, int* errorPlace,
                                           const AlertDescription& description) override;
  int receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) override;
  void releaseAlert(std::shared_ptr<AlertHandle> handle) override;

  /// Ends the wait for the alert's answer, which is then nobody's.
  static void takeDown(const std::shared_ptr<AlertHandle>& handle);

 private:
  Options _options;
};

}  // namespace palisade
