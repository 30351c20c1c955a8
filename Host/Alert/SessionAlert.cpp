#include "Host/Alert/SessionAlert.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <exception>
#include <utility>

namespace palisade {
namespace {

constexpr std::array<std::pair<AlertFrontEnd, std::string_view>, 4> frontEndNames = {{{AlertFrontEnd::desktop, "desktop"},
                                                                                      {AlertFrontEnd::portal, "portal"},
                                                                                      {AlertFrontEnd::terminal, "terminal"},
                                                                                      {AlertFrontEnd::nobody, "nobody"}}};

void takeDownShown(const std::shared_ptr<AlertHandle>& shown) {
  // Each front end knows its own handles.
  DesktopAlert::takeDown(shown);
  PortalAlert::takeDown(shown);
  TerminalAlert::takeDown(shown);
}

struct SessionAlertHandle final : AlertHandle {
  SessionAlertHandle(SystemAlert& shower, std::shared_ptr<AlertHandle> alert) : frontEnd(shower), shown(std::move(alert)) {}
  ~SessionAlertHandle() override {
    lockWatch.reset();
    frontEnd.releaseAlert(std::move(shown));
  }

  SystemAlert& frontEnd;
  std::shared_ptr<AlertHandle> shown;
  // Shared with the watch, which may call while the handle is going away.
  const std::shared_ptr<std::atomic<bool>> endedByLock = std::make_shared<std::atomic<bool>>(false);
  std::shared_ptr<const void> lockWatch;
};

}  // namespace

std::string nameOf(AlertFrontEnd frontEnd) {
  for (const auto& [candidate, name] : frontEndNames) {
    if (candidate == frontEnd) return std::string(name);
  }
  return "nobody";
}

std::optional<AlertFrontEnd> alertFrontEndNamed(std::string_view word) {
  for (const auto& [candidate, name] : frontEndNames) {
    if (name == word) return candidate;
  }
  return std::nullopt;
}

SessionAlert::SessionAlert(const Options& options)
    : _choice(options.choice || !options.terminal ? options.choice : AlertFrontEnd::terminal),
      _hasTerminal(options.terminal.has_value()),
      _hasUsableDisplay(options.hasUsableDisplay),
      _keepsWindowsOnTop(options.keepsWindowsOnTop),
      _watchLock(options.watchLock),
      _desktop(options.desktop),
      _portal(options.portal),
      _terminal({.terminal = options.terminal.value_or(""),
                 .subject = options.desktop.subject,
                 .languages = options.desktop.languages}) {}

bool SessionAlert::isUsable(AlertFrontEnd frontEnd) const {
  switch (frontEnd) {
    case AlertFrontEnd::desktop: return _desktop.isInstalled() && _hasUsableDisplay();
    case AlertFrontEnd::portal: return _hasUsableDisplay() && _portal.backend();
    case AlertFrontEnd::terminal: return _hasTerminal && _terminal.isAvailable();
    case AlertFrontEnd::nobody: break;
  }
  return true;
}

AlertFrontEnd SessionAlert::frontEnd() const {
  if (_choice && isUsable(*_choice)) return *_choice;
  std::array candidates = {AlertFrontEnd::desktop, AlertFrontEnd::portal, AlertFrontEnd::terminal};
  if (!_keepsWindowsOnTop()) std::swap(candidates[0], candidates[1]);
  for (const AlertFrontEnd candidate : candidates) {
    if (isUsable(candidate)) return candidate;
  }
  return AlertFrontEnd::nobody;
}

std::string SessionAlert::description() const {
  const AlertFrontEnd chosen = frontEnd();
  const auto backend = chosen == AlertFrontEnd::portal ? _portal.backend() : std::nullopt;
  return nameOf(chosen) + (backend ? " (" + *backend + ")" : "");
}

std::optional<std::string> SessionAlert::trouble() const {
  const AlertFrontEnd chosen = frontEnd();
  if (_choice == chosen) return std::nullopt;
  std::string sentence;
  if (chosen == AlertFrontEnd::nobody) {
    sentence =
        "Nobody can be asked: there is no display that palisade-alert or a portal can use, and no terminal. Start accountd "
        "with --terminal \"$(tty)\", or set terminal in accountd.toml.";
  } else if (_choice) {
    sentence = "Alerts are to be shown by the " + nameOf(*_choice) + ", which cannot be used now; the " + nameOf(chosen) +
               " shows them.";
  } else {
    return std::nullopt;
  }
  const auto cause = _choice == AlertFrontEnd::portal && _hasUsableDisplay() ? _portal.trouble() : std::nullopt;
  return cause ? sentence + " " + *cause : sentence;
}

SystemAlert& SessionAlert::showing(AlertFrontEnd frontEnd) {
  if (frontEnd == AlertFrontEnd::desktop) return _desktop;
  if (frontEnd == AlertFrontEnd::portal) return _portal;
  return _terminal;
}

std::shared_ptr<AlertHandle> SessionAlert::createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags,
                                                       int* errorPlace, const AlertDescription& description) {
  const AlertFrontEnd chosen = frontEnd();
  if (chosen == AlertFrontEnd::nobody) {
    if (errorPlace != nullptr) *errorPlace = ENODEV;
    return nullptr;
  }
  SystemAlert& shower = showing(chosen);
  auto shown = shower.createAlert(allocator, timeoutSeconds, flags, errorPlace, description);
  if (shown == nullptr) return nullptr;
  const auto handle = std::make_shared<SessionAlertHandle>(shower, shown);
  if (description.dismissOnLock) {
    try {
      handle->lockWatch = _watchLock([standing = std::weak_ptr(shown), endedByLock = handle->endedByLock] {
        const auto alert = standing.lock();
        if (alert == nullptr) return;
        *endedByLock = true;
        takeDownShown(alert);
      });
    } catch (const std::exception&) {
      // A session without a bus cannot say that it locks; its user is asked all the same.
      handle->lockWatch = nullptr;
    }
  }
  return handle;
}

int SessionAlert::receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) {
  response = AlertResponseNobody;
  const auto alert = std::dynamic_pointer_cast<SessionAlertHandle>(handle);
  if (alert == nullptr) return EINVAL;
  const int status = alert->frontEnd.receiveResponse(alert->shown, timeoutSeconds, response);
  return status == 0 && response == AlertResponseNobody && *alert->endedByLock ? ECANCELED : status;
}

void SessionAlert::releaseAlert(std::shared_ptr<AlertHandle> handle) { handle.reset(); }

void SessionAlert::takeDown(const std::shared_ptr<AlertHandle>& handle) {
  if (const auto alert = std::dynamic_pointer_cast<SessionAlertHandle>(handle)) takeDownShown(alert->shown);
}

}  // namespace palisade
