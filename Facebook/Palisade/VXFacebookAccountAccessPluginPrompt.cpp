// The consent prompt: a modal alert with an allow and a do-not-allow button.
//
// Three layers, from the specific to the general: the prompt makes the sentence, the consent alert knows the title and the
// buttons, the generic alert talks to the alert service. Only the response word 0 is consent. The word starts as nobody's
// answer, so an alert service that writes nothing refuses.

#include "Facebook/Palisade/ExactlyOnce.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Platform/Client.h"

namespace palisade {
namespace {

constexpr const char* promptUser = "_promptUserToApproveRequestForPermissions:withAudience:fromClient:account:completion:";
constexpr const char* showUserNotification =
    "_showUserNotificationWithTitle:message:defaultButtonTitle:alternateButtonTitle:withCompletionBlock:";

constexpr double waitForEver = 0;

// Releases an alert at the end of its scope, whether the scope was left by a return or by an exception.
class ReleasedAlert {
 public:
  ReleasedAlert(SystemAlert& alert, std::shared_ptr<AlertHandle> handle, Log& log)
      : _alert(alert),
        _handle(std::move(handle)),
        _log(log) {}
  ReleasedAlert(const ReleasedAlert&) = delete;
  ReleasedAlert& operator=(const ReleasedAlert&) = delete;

  ~ReleasedAlert() {
    if (_handle == nullptr) return;
    try {
      _alert.releaseAlert(_handle);
    } catch (...) {
      logUnexpectedFailure(_log, showUserNotification, std::current_exception());
    }
  }

  const std::shared_ptr<AlertHandle>& handle() const { return _handle; }

 private:
  SystemAlert& _alert;
  std::shared_ptr<AlertHandle> _handle;
  Log& _log;
};

}  // namespace

void VXFacebookAccountAccessPlugin::_promptUserToApproveRequestForPermissions(const PermissionSetRef& permissions,
                                                                              const std::optional<std::string>& withAudience,
                                                                              const std::shared_ptr<const Client>& fromClient,
                                                                              const std::shared_ptr<Account>& account,
                                                                              const PromptCompletion& completion) const {
  const std::string appName = fromClient->localizedAppName();
  const auto message = _constructUserMessageForPermissions(*permissions, withAudience, appName, account);
  if (!message) {
    log().record(promptUser, LogLevel::error, "Something really bad happened and we ended up with an invalid message", "");
    completion(false, false, nullptr);
    return;
  }
  _showAlertWithMessage(*message, [&](bool granted) { completion(granted, false, permissions); });
}

void VXFacebookAccountAccessPlugin::_showAlertWithMessage(const std::string& message, const AlertCompletion& completion) const {
  const std::string title = _localizedString("ACCOUNT_ACCESS_REQUEST_TITLE");
  const std::string allow = _localizedString("ACCOUNT_ACCESS_ALLOW_BUTTON_TITLE");
  const std::string doNotAllow = _localizedString("ACCOUNT_ACCESS_DO_NOT_ALLOW_BUTTON_TITLE");
  _showUserNotificationWithTitle(
      title, message, allow, doNotAllow,
      [&](const std::shared_ptr<AlertHandle>&, AlertResponse response) { completion(response == AlertResponseDefaultButton); });
}

void VXFacebookAccountAccessPlugin::_showUserNotificationWithTitle(const std::string& title, const std::string& message,
                                                                   const std::string& defaultButtonTitle,
                                                                   const std::string& alternateButtonTitle,
                                                                   const NotificationCompletion& withCompletionBlock) const {
  const AlertDescription description{.header = title,
                                     .message = message,
                                     .alternateButtonTitle = alternateButtonTitle,
                                     .defaultButtonTitle = defaultButtonTitle,
                                     .topMost = true,
                                     .dismissOnLock = true,
                                     .doNotDismissOnUnlock = true};
  const ReleasedAlert shown(
      alert(), alert().createAlert(AlertAllocator::defaultAllocator, waitForEver, AlertFlagsPlain, nullptr, description),
      log());
  AlertResponse response = AlertResponseNobody;
  alert().receiveResponse(shown.handle(), waitForEver, response);
  withCompletionBlock(shown.handle(), response);
}

}  // namespace palisade
