#include "Host/Json/JsonText.h"

#include <algorithm>

namespace palisade {
namespace {

bool isContinuation(char byte) { return (static_cast<unsigned char>(byte) & 0xC0U) == 0x80U; }

// What may follow a leading byte: how many continuation bytes, and the range of the first one, which keeps out overlong forms,
// surrogates and everything above U+10FFFF.
struct Sequence {
  unsigned char firstLead, lastLead;
  std::size_t continuations;
  unsigned char lowest, highest;
};

constexpr Sequence sequences[] = {
    {0x00, 0x7F, 0, 0x00, 0x00}, {0xC2, 0xDF, 1, 0x80, 0xBF}, {0xE0, 0xE0, 2, 0xA0, 0xBF},
    {0xE1, 0xEC, 2, 0x80, 0xBF}, {0xED, 0xED, 2, 0x80, 0x9F}, {0xEE, 0xEF, 2, 0x80, 0xBF},
    {0xF0, 0xF0, 3, 0x90, 0xBF}, {0xF1, 0xF3, 3, 0x80, 0xBF}, {0xF4, 0xF4, 3, 0x80, 0x8F},
};

// The length of the sequence that `text` begins with, or 0.
std::size_t sequenceLength(std::string_view text) {
  const auto lead = static_cast<unsigned char>(text.front());
  const auto sequence = std::find_if(std::begin(sequences), std::end(sequences), [lead](const Sequence& candidate) {
    return lead >= candidate.firstLead && lead <= candidate.lastLead;
  });
  if (sequence == std::end(sequences) || text.size() <= sequence->continuations) return 0;
  if (sequence->continuations == 0) return 1;
  const auto second = static_cast<unsigned char>(text[1]);
  if (second < sequence->lowest || second > sequence->highest) return 0;
  const std::string_view rest = text.substr(2, sequence->continuations - 1);
  return std::all_of(rest.begin(), rest.end(), isContinuation) ? sequence->continuations + 1 : 0;
}

}  // namespace

std::size_t positionOfInvalidUtf8(std::string_view text) {
  std::size_t position = 0;
  while (position < text.size()) {
    const std::size_t length = sequenceLength(text.substr(position));
    if (length == 0) return position;
    position += length;
  }
  return position;
}

TextPlace placeInText(std::string_view text, std::size_t position) {
  const std::string_view before = text.substr(0, position);
  const std::size_t lineStart = before.rfind('\n') + 1;  // npos + 1 is 0: the first line
  const auto line = std::count(before.begin(), before.end(), '\n');
  const std::string_view ahead = before.substr(lineStart);
  const auto characters = ahead.size() - static_cast<std::size_t>(std::count_if(ahead.begin(), ahead.end(), isContinuation));
  return {.line = static_cast<std::size_t>(line) + 1, .column = characters + 1};
}

}  // namespace palisade
