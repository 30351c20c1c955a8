#include "AlertHelper/Labels.h"

namespace palisade {
namespace {

bool isLatinLetter(char byte) { return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z'); }
char lowerCase(char letter) { return static_cast<char>(letter | 0x20); }

// The first letter but `taken` is the one that is chosen.
std::string labelled(const std::string& text, char taken, char& chosen) {
  std::string label;
  for (const char byte : text) {
    if (chosen == 0 && isLatinLetter(byte) && lowerCase(byte) != taken) {
      chosen = lowerCase(byte);
      label += '_';
    }
    label += byte;
    if (byte == '_') label += byte;
  }
  return label;
}

}  // namespace

ButtonLabels buttonLabels(const std::string& refuse, const std::string& allow) {
  ButtonLabels labels;
  labels.allow = labelled(allow, 0, labels.allowLetter);
  labels.refuse = labelled(refuse, labels.allowLetter, labels.refuseLetter);
  return labels;
}

}  // namespace palisade
