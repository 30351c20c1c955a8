#include "Tests/Strings/ReviewPage.h"

#include <set>
#include <sstream>

namespace palisade {
namespace {

// Arabic and Hebrew are the tables' languages that are written from right to left.
std::string inItsDirection(const std::string& language, const std::string& text) {
  static const std::set<std::string> fromRightToLeft{"ar", "he"};
  return fromRightToLeft.contains(language) ? "<div dir=\"rtl\">" + text + "</div>" : text;
}

void writeTable(std::ostream& page, const std::string& language, const std::vector<ConsentMessage>& messages) {
  page << "| Asked for | Message |\n|---|---|\n";
  for (const ConsentMessage& message : messages) {
    page << "| " << message.title << " | " << inItsDirection(language, message.text) << " |\n";
  }
}

}  // namespace

std::string reviewPage(const std::string& language, const ConsentMessages& messages) {
  std::ostringstream page;
  page << "# Consent messages: " << language << "\n\n"
       << "Written by the build target `sentence-pages` from `Resources/" << language << ".po`; changes belong there.\n\n"
       << "| Text | |\n|---|---|\n"
       << "| Title | " << inItsDirection(language, messages.text("ACCOUNT_ACCESS_REQUEST_TITLE")) << " |\n"
       << "| Buttons | " << inItsDirection(language, messages.text("ACCOUNT_ACCESS_ALLOW_BUTTON_TITLE")) << " |\n"
       << "| | " << inItsDirection(language, messages.text("ACCOUNT_ACCESS_DO_NOT_ALLOW_BUTTON_TITLE")) << " |\n\n"
       << "## Sentences\n\n";
  writeTable(page, language, messages.forRequests(requestsForReview()));
  page << "\n## Permissions\n\n";
  writeTable(page, language, messages.ofOnePermission());
  return page.str();
}

}  // namespace palisade
