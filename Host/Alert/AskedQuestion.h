#pragma once

/// What a person is asked: the plug-in's texts and what the daemon knows of who asks, made fit to be shown.
///
/// Threads: a pure function. Errors: none. Every text is one line without controls and marks of direction, whatever an
/// application calls itself.

#include <optional>
#include <string>

#include "Host/Alert/AlertQuestion.h"
#include "Platform/SystemAlert.h"

namespace palisade {

/// `languages` are catalogue names, best first, separated by colons. The question has no number yet.
AlertQuestion askedQuestion(const AlertDescription& description, std::optional<AlertSubject> subject, std::string languages);

}  // namespace palisade
