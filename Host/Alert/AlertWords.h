#pragma once

/// An alert's own few words, in the languages of the sentences that it shows.
///
/// Threads: a pure function over constants. Errors: a language without words gets English ones.

#include <string_view>

#include "Host/Alert/AlertQuestion.h"

namespace palisade {

struct AlertWords {
  std::string_view language;
  std::string_view application;
  std::string_view account;
  std::string_view identity;
  std::string_view certain;
  std::string_view likely;
  std::string_view claimedInSandbox;
  std::string_view claimed;
  /// Which keys answer on a terminal.
  std::string_view keys;

  /// What is known about who asks.
  std::string_view wordFor(AlertCertainty certainty) const;

  bool isRightToLeft() const { return language == "ar" || language == "he"; }
};

/// `languages` are catalogue names, best first, separated by colons.
const AlertWords& alertWordsFor(std::string_view languages);

}  // namespace palisade
