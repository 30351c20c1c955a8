#pragma once

/// The system alert as a window of the user's desktop, shown by a helper process.
///
/// Threads: as `SystemAlert` says; `takeDown` may be called from any thread. Ownership: a handle owns its helper process, which
/// does not outlive it. Errors: without a helper no alert is created and the answer is nobody's, as it is when the helper
/// crashes, is killed, or says anything but one complete answer to this very question.

#include <filesystem>
#include <functional>
#include <optional>
#include <string>

#include "Host/Alert/AlertQuestion.h"
#include "Platform/SystemAlert.h"

namespace palisade {

class DesktopAlert final : public SystemAlert {
 public:
  struct Options {
    /// The program that shows the window.
    std::filesystem::path helper;
    /// Who asks through the calling thread; called in `createAlert`. None when that is not known.
    std::function<std::optional<AlertSubject>()> subject = [] { return std::nullopt; };
    /// Catalogue names, best first, separated by colons; called in `createAlert`.
    std::function<std::string()> languages = [] { return std::string("en"); };
    /// The display that may be reached over the network; empty for none.
    std::string networkDisplay = {};
  };

  explicit DesktopAlert(Options options) : _options(std::move(options)) {}

  /// Whether the helper is there to be started.
  bool isInstalled() const;

  std::shared_ptr<AlertHandle> createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags, int* errorPlace,
                                           const AlertDescription& description) override;
  int receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) override;
  void releaseAlert(std::shared_ptr<AlertHandle> handle) override;

  /// Ends the wait for the alert's answer, which is then nobody's, and closes its window.
  static void takeDown(const std::shared_ptr<AlertHandle>& handle);

 private:
  Options _options;
};

}  // namespace palisade
