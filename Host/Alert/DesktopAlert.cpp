#include "Host/Alert/DesktopAlert.h"

#include <unistd.h>

#include <cerrno>

#include "Host/Alert/AskedQuestion.h"
#include "Host/Alert/HelperEnding.h"
#include "Host/Alert/HelperProcess.h"

namespace palisade {
namespace {

struct DesktopAlertHandle final : AlertHandle {
  DesktopAlertHandle(std::unique_ptr<HelperProcess> process, const AlertNonce& number)
      : helper(std::move(process)),
        nonce(number) {}

  std::unique_ptr<HelperProcess> helper;
  AlertNonce nonce;
};

std::shared_ptr<DesktopAlertHandle> ownHandle(const std::shared_ptr<AlertHandle>& handle) {
  return std::dynamic_pointer_cast<DesktopAlertHandle>(handle);
}

}  // namespace

bool DesktopAlert::isInstalled() const { return access(_options.helper.c_str(), X_OK) == 0; }

std::shared_ptr<AlertHandle> DesktopAlert::createAlert(AlertAllocator, double, unsigned, int* errorPlace,
                                                       const AlertDescription& description) {
  AlertQuestion question = askedQuestion(description, _options.subject(), _options.languages());
  question.networkDisplay = _options.networkDisplay;
  question.nonce = freshNonce();
  const auto frame = alertQuestionFrame(question);
  auto helper = frame ? HelperProcess::start(_options.helper, *frame) : nullptr;
  if (helper == nullptr) {
    if (errorPlace != nullptr) *errorPlace = frame ? errno : EMSGSIZE;
    return nullptr;
  }
  return std::make_shared<DesktopAlertHandle>(std::move(helper), question.nonce);
}

int DesktopAlert::receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) {
  response = AlertResponseNobody;
  const auto alert = ownHandle(handle);
  if (alert == nullptr) return EINVAL;
  const auto ending = alert->helper->waitForEnd(deadlineAfter(timeoutSeconds));
  response = responseOfEnding(ending.received, ending.waitStatus, alert->nonce);
  return 0;
}

// The handle ends the helper when its last owner lets go of it.
void DesktopAlert::releaseAlert(std::shared_ptr<AlertHandle> handle) { handle.reset(); }

void DesktopAlert::takeDown(const std::shared_ptr<AlertHandle>& handle) {
  if (const auto alert = ownHandle(handle)) alert->helper->takeDown();
}

}  // namespace palisade
