// Shows an alert that is to go when the session locks, says "shown by" what, and then what became of it. A line of input takes
// it down.
//
//   palisade-shown-alert FRONT-END TITLE [HELPER]

#include <cstdlib>
#include <iostream>
#include <mutex>
#include <string>
#include <thread>

#include "Host/Alert/SessionAlert.h"
#include "Host/Bus/BusAccessDialog.h"
#include "Host/Bus/SessionLock.h"

namespace {

using namespace palisade;

std::optional<AlertSubject> subject() {
  return AlertSubject{.applicationName = "Photos", .applicationID = "org.example.photos", .account = "ada@example.org"};
}

const char* nameOfResponse(AlertResponse response) {
  return response == AlertResponseDefaultButton ? "allowed" : response == AlertResponseAlternateButton ? "refused" : "nobody";
}

}  // namespace

int main(int argumentCount, char** arguments) {
  SessionAlert::Options options{
      .choice = alertFrontEndNamed(arguments[1]),
      .desktop = {.helper = argumentCount > 3 ? arguments[3] : "", .subject = subject},
      .portal = {.isReachable = isOnSessionBus, .open = openAccessDialog, .subject = subject},
      .hasUsableDisplay = [] { return true; },
      .watchLock = [](auto onLock) { return std::make_shared<const SessionLock>(std::move(onLock)); }};
  SessionAlert alert(options);
  const AlertDescription description{.header = arguments[2],
                                     .message = "“Photos” asks for <b>100 %</b> &amp; more.",
                                     .alternateButtonTitle = "Don’t Allow",
                                     .defaultButtonTitle = "Allow",
                                     .topMost = true,
                                     .dismissOnLock = true,
                                     .doNotDismissOnUnlock = true};
  const std::string frontEnd = alert.description();
  auto handle = alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, description);
  std::cout << (handle == nullptr ? "not shown by " : "shown by ") << frontEnd << std::endl;
  // It waits for input to the end of the program, which is not to come while it holds the alert.
  std::mutex takingDown;
  std::thread([&takingDown, standing = std::weak_ptr(handle)] {
    std::string line;
    if (!std::getline(std::cin, line)) return;
    const std::scoped_lock guard(takingDown);
    if (const auto shown = standing.lock()) SessionAlert::takeDown(shown);
  }).detach();
  AlertResponse response = AlertResponseDefaultButton;
  alert.receiveResponse(handle, 0, response);
  std::cout << nameOfResponse(response) << std::endl;
  alert.releaseAlert(std::move(handle));
  takingDown.lock();
  std::_Exit(0);
}
