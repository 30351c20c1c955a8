#pragma once

/// The system alert of a session: asks wherever the user can be asked at that moment.
///
/// The front end is chosen for each alert: the configured one first, then the helper's window wherever it can be kept above
/// other windows, and the portal's dialog where it cannot, as on GNOME's Wayland. The other of the two is next, then the
/// terminal. When none of them can be used, nobody is asked. An alert that is to go when the session locks is taken down then,
/// whatever shows it, and `receiveResponse` returns ECANCELED. Threads: as `SystemAlert` says; `takeDown`, `frontEnd` and
/// `trouble` may be called from any thread. Ownership: a handle owns what shows it. Errors: an alert that no front end can show
/// is a null handle, and nobody's answer.

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "Host/Alert/DesktopAlert.h"
#include "Host/Alert/PortalAlert.h"
#include "Host/Alert/SessionDisplay.h"
#include "Host/Alert/TerminalAlert.h"

namespace palisade {

enum class AlertFrontEnd { desktop, portal, terminal, nobody };

/// "desktop", "portal", "terminal", "nobody", and back; none for another word.
std::string nameOf(AlertFrontEnd frontEnd);
std::optional<AlertFrontEnd> alertFrontEndNamed(std::string_view word);

class SessionAlert final : public SystemAlert {
 public:
  struct Options {
    /// What was configured. A terminal that is named without it counts as chosen.
    std::optional<AlertFrontEnd> choice = std::nullopt;
    /// The terminal on which to ask; none asks on none.
    std::optional<std::string> terminal = std::nullopt;
    DesktopAlert::Options desktop;
    PortalAlert::Options portal = {};
    std::function<bool()> hasUsableDisplay = [] { return palisade::hasUsableDisplay(); };
    std::function<bool()> keepsWindowsOnTop = palisade::keepsWindowsOnTop;
    /// Calls its argument, from any thread, when the session locks, as long as the result lives. May throw when locks cannot be
    /// heard of; the alert then stands through them.
    std::function<std::shared_ptr<const void>(std::function<void()>)> watchLock = [](const auto&) { return nullptr; };
  };

  explicit SessionAlert(const Options& options);

  /// What would show an alert now.
  AlertFrontEnd frontEnd() const;

  /// The same in words, with the portal's backend: "portal (org.freedesktop.impl.portal.desktop.gtk)".
  std::string description() const;

  /// A sentence that says what to do when nobody can be asked, or when something else than what was configured asks.
  std::optional<std::string> trouble() const;

  std::shared_ptr<AlertHandle> createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags, int* errorPlace,
                                           const AlertDescription& description) override;
  int receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) override;
  void releaseAlert(std::shared_ptr<AlertHandle> handle) override;

  /// Ends the wait for the alert's answer, which is then nobody's.
  static void takeDown(const std::shared_ptr<AlertHandle>& handle);

 private:
  bool isUsable(AlertFrontEnd frontEnd) const;
  SystemAlert& showing(AlertFrontEnd frontEnd);

  std::optional<AlertFrontEnd> _choice;
  bool _hasTerminal;
  std::function<bool()> _hasUsableDisplay;
  std::function<bool()> _keepsWindowsOnTop;
  std::function<std::shared_ptr<const void>(std::function<void()>)> _watchLock;
  DesktopAlert _desktop;
  PortalAlert _portal;
  TerminalAlert _terminal;
};

}  // namespace palisade
