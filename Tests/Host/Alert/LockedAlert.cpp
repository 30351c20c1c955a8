// Shows an alert that is to go when the session locks, says "shown", and then what became of it. Tests lock the session
// meanwhile.

#include <iostream>

#include "Host/Alert/SessionAlert.h"
#include "Host/Bus/SessionLock.h"

int main(int, char** arguments) {
  using namespace palisade;
  SessionAlert::Options options{.choice = AlertFrontEnd::desktop, .desktop = {.helper = arguments[1]}};
  options.hasUsableDisplay = [] { return true; };
  options.watchLock = [](auto onLock) { return std::make_shared<const SessionLock>(std::move(onLock)); };
  SessionAlert alert(options);
  const AlertDescription description{.header = "linger",
                                     .message = "“Photos” asks.",
                                     .alternateButtonTitle = "Don’t Allow",
                                     .defaultButtonTitle = "Allow",
                                     .topMost = true,
                                     .dismissOnLock = true,
                                     .doNotDismissOnUnlock = true};
  auto handle = alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, description);
  std::cout << "shown" << std::endl;
  AlertResponse response = 0;
  alert.receiveResponse(handle, 20, response);
  std::cout << (response == AlertResponseNobody ? "nobody" : "answered") << std::endl;
  alert.releaseAlert(std::move(handle));
}
