#pragma once

/// Which of the faults seeded into a source is alive in this process. `Tools/Mutants/seed.py` writes calls of these functions
/// around the expressions of a copy of the source; each names its fault by a number.
///
/// The environment variable MUTANT holds the number of the one that is alive; without it the program does what it always did.
/// MUTANTS_REACHED names a file with one byte a fault: the bytes of those that are reached become 1, also in a process that
/// crashes later. Threads: safe from every thread. Errors: a file that cannot be mapped ends the process.

#include <type_traits>
#include <utility>

namespace mutants {

bool isAlive(int number) noexcept;

/// A condition: always true, always false, or the other way round.
inline bool condition(int number, bool value) noexcept {
  const bool isTrue = isAlive(number);
  const bool isFalse = isAlive(number + 1);
  const bool isNegated = isAlive(number + 2);
  return isTrue || (!isFalse && value != isNegated);
}

/// One side of && or ||, left out: it no longer matters.
inline bool side(int number, bool value, bool neutral) noexcept { return isAlive(number) ? neutral : value; }

/// What stands for a value that was dropped: nothing, the empty one, the next one.
template <typename T>
T other(const T& value) {
  if constexpr (std::is_same_v<T, bool>) {
    return !value;
  } else if constexpr (std::is_same_v<T, const char*>) {
    return "";
  } else if constexpr (std::is_enum_v<T>) {
    return static_cast<T>(static_cast<std::underlying_type_t<T>>(value) ^ 1);
  } else if constexpr (std::is_arithmetic_v<T>) {
    return static_cast<T>(value + 1);
  } else {
    return T{};
  }
}

template <typename T>
T value(int number, std::type_identity_t<T> value) {
  return isAlive(number) ? other<T>(value) : std::move(value);
}

/// The same for what is passed by reference, so that the object stays the same one as long as the fault sleeps.
template <typename T>
const T& reference(int number, const std::type_identity_t<T>& value) {
  static const T dropped{};
  return isAlive(number) ? dropped : value;
}

}  // namespace mutants
