#include "Tools/Story/AnnouncedAnswer.h"

#include <ostream>

#include "Host/Alert/TerminalText.h"

namespace palisade {

std::shared_ptr<AlertHandle> AnnouncedAnswer::createAlert(AlertAllocator, double, unsigned, int*,
                                                          const AlertDescription& description) {
  _output << "    " << description.header << "\n\n";
  for (const std::string& line : wrapped(description.message, 72)) _output << "    " << line << '\n';
  _output << "\n    [ " << description.alternateButtonTitle << " ]  [ " << description.defaultButtonTitle << " ]\n\n"
          << "There is no terminal to ask on, so this program answers: "
          << (_allows ? description.defaultButtonTitle : description.alternateButtonTitle) << ".\n";
  return std::make_shared<AlertHandle>();
}

int AnnouncedAnswer::receiveResponse(const std::shared_ptr<AlertHandle>&, double, AlertResponse& response) {
  response = _allows ? AlertResponseDefaultButton : AlertResponseAlternateButton;
  return 0;
}

void AnnouncedAnswer::releaseAlert(std::shared_ptr<AlertHandle> handle) { handle.reset(); }

}  // namespace palisade
