#include "Host/Alert/PortalAlert.h"

#include <cerrno>

#include "Host/Alert/AskedQuestion.h"

namespace palisade {
namespace {

struct PortalAlertHandle final : AlertHandle {
  explicit PortalAlertHandle(std::unique_ptr<AccessDialog> shown) : dialog(std::move(shown)) {}

  std::unique_ptr<AccessDialog> dialog;
};

std::shared_ptr<PortalAlertHandle> portalHandle(const std::shared_ptr<AlertHandle>& handle) {
  return std::dynamic_pointer_cast<PortalAlertHandle>(handle);
}

}  // namespace

std::optional<std::string> PortalAlert::backend() const {
  auto name = _options.backend();
  return name && _options.isReachable(*name) ? name : std::nullopt;
}

std::optional<std::string> PortalAlert::trouble() const {
  const auto name = _options.backend();
  if (!name) {
    return "No portal backend of this session serves " + std::string(accessInterface) +
           ". Install one, such as xdg-desktop-portal-gtk, or allow it in portals.conf.";
  }
  if (_options.isReachable(*name)) return std::nullopt;
  return "The portal backend " + *name +
         " is not on the session bus and cannot be started there. Install it again, or name "
         "another in portals.conf.";
}

std::shared_ptr<AlertHandle> PortalAlert::createAlert(AlertAllocator, double, unsigned, int* errorPlace,
                                                      const AlertDescription& description) {
  const auto name = _options.backend();
  auto dialog = name
                    ? _options.open(*name, accessQuestion(askedQuestion(description, _options.subject(), _options.languages())))
                    : nullptr;
  if (dialog == nullptr) {
    if (errorPlace != nullptr) *errorPlace = name ? ENOTCONN : ENODEV;
    return nullptr;
  }
  return std::make_shared<PortalAlertHandle>(std::move(dialog));
}

int PortalAlert::receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) {
  response = AlertResponseNobody;
  const auto alert = portalHandle(handle);
  if (alert == nullptr) return EINVAL;
  response = responseOfReply(alert->dialog->waitForReply(deadlineAfter(timeoutSeconds)));
  return 0;
}

// The handle closes its dialog when its last owner lets go of it.
void PortalAlert::releaseAlert(std::shared_ptr<AlertHandle> handle) { handle.reset(); }

void PortalAlert::takeDown(const std::shared_ptr<AlertHandle>& handle) {
  if (const auto alert = portalHandle(handle)) alert->dialog->takeDown();
}

}  // namespace palisade
