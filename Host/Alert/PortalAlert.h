#pragma once

/// The system alert as a dialog of the user's desktop, shown by the backend of the session's portal.
///
/// Threads: as `SystemAlert` says; `takeDown`, `backend` and `trouble` may be called from any thread. Ownership: a handle owns
/// its dialog, which does not outlive it. Only a daemon that is killed leaves its dialog behind, and nobody hears what is
/// answered there. Errors: without a backend that can be asked no alert is created, and the answer is nobody's, as it is when
/// the backend fails, leaves the bus, is replaced, or replies anything but consent, a refusal included (see `responseOfReply`).
/// Consent that comes within half a second of the question is nobody's too: no person has read it. Whether the dialog stands
/// above all other windows is the backend's choice.

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "Host/Alert/AccessDialog.h"
#include "Host/Alert/AccessQuestion.h"
#include "Host/Alert/PortalBackend.h"
#include "Platform/SystemAlert.h"

namespace palisade {

class PortalAlert final : public SystemAlert {
 public:
  struct Options {
    /// The bus name of the session's backend.
    std::function<std::optional<std::string>()> backend = accessBackend;
    /// Whether a program has that name on the session bus, or can be started for it.
    std::function<bool(const std::string&)> isReachable = [](const auto&) { return false; };
    /// Asks that backend and returns at once; null when the session bus cannot be reached.
    std::function<std::unique_ptr<AccessDialog>(const std::string&, const AccessQuestion&)> open =
        [](const auto&, const auto&) { return nullptr; };
    /// Who asks through the calling thread; called in `createAlert`. None when that is not known.
    std::function<std::optional<AlertSubject>()> subject = [] { return std::nullopt; };
    /// Catalogue names, best first, separated by colons; called in `createAlert`.
    std::function<std::string()> languages = [] { return std::string("en"); };
  };

  explicit PortalAlert(Options options) : _options(std::move(options)) {}

  /// The bus name of the backend that can be asked now.
  std::optional<std::string> backend() const;

  /// A sentence that says what to do when there is none.
  std::optional<std::string> trouble() const;

  std::shared_ptr<AlertHandle> createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags, int* errorPlace,
                                           const AlertDescription& description) override;
  int receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) override;
  void releaseAlert(std::shared_ptr<AlertHandle> handle) override;

  /// Ends the wait for the alert's answer, which is then nobody's, and closes its dialog.
  static void takeDown(const std::shared_ptr<AlertHandle>& handle);

 private:
  Options _options;
};

}  // namespace palisade
