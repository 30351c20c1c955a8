#include "Host/Alert/AskedQuestion.h"

#include "Host/Identity/DisplayName.h"

namespace palisade {

AlertQuestion askedQuestion(const AlertDescription& description, std::optional<AlertSubject> subject, std::string languages) {
  AlertQuestion question{.title = oneLine(description.header),
                         .message = oneLine(description.message),
                         .refuseTitle = oneLine(description.alternateButtonTitle),
                         .allowTitle = oneLine(description.defaultButtonTitle),
                         .languages = std::move(languages),
                         .topMost = description.topMost};
  if (subject) {
    subject->applicationName = displayName(subject->applicationName);
    subject->applicationID = displayIdentifier(subject->applicationID);
    subject->account = displayIdentifier(subject->account);
    question.message = isolated(question.message, subject->applicationName);
    question.subject = std::move(subject);
  }
  return question;
}

}  // namespace palisade
