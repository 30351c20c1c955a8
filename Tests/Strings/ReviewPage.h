#pragma once

/// A page for people who know a language and look at its consent messages, in Markdown.
///
/// It shows the alert's title and buttons, the message for each permission alone, and a choice of the messages for several:
/// each kind of sentence with each kind of phrase.

#include <string>

#include "Tests/Strings/ConsentMessages.h"

namespace palisade {

std::string reviewPage(const std::string& language, const ConsentMessages& messages);

}  // namespace palisade
