#pragma once

/// People who type while an alert comes: prose, a shell, code, and keys without any sense, at random speeds and moments.
///
/// Threads: plain values. The same seed gives the same typings on every machine.

#include <chrono>
#include <cstdint>
#include <string>
#include <vector>

namespace palisade {

struct TypedKey {
  enum class Kind { character, forward, back, left, right, up, down, alt };

  Kind kind = Kind::character;
  /// The character, or the letter beside Alt. Return is '\n'.
  char character = 0;
  /// Since the key before, or since the alert came.
  std::chrono::milliseconds pause{};
  std::chrono::milliseconds heldFor{};
};

using Typing = std::vector<TypedKey>;

/// `withMoves` has people use Tab, arrows and Alt as well, as they do to complete names, to indent, to edit and to choose.
Typing randomTyping(std::uint32_t seed, bool withMoves);

}  // namespace palisade
