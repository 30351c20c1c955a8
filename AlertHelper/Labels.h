#pragma once

/// The buttons' labels: their texts with the letter underlined that leads the keyboard to them together with Alt.
///
/// Threads: a pure function. Errors: a text without a letter of its own gets none.

#include <string>

namespace palisade {

struct ButtonLabels {
  std::string refuse;
  std::string allow;
  /// In lower case; zero for a text without one.
  char refuseLetter = 0;
  char allowLetter = 0;
};

/// The letters differ from each other and are plain Latin ones, which every keyboard can type. "_" stands before the letter;
/// an underscore of the text is doubled.
ButtonLabels buttonLabels(const std::string& refuse, const std::string& allow);

}  // namespace palisade
