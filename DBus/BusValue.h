#pragma once

/// Values between D-Bus and the platform.
///
/// Every basic D-Bus type has a place: the smaller integers become integers, object paths and signatures strings. Arrays and
/// dictionaries with string keys are converted with all that they hold, nested as deep as D-Bus allows.
/// Threads: pure functions. Errors: `UnsuitableType` for a type that has no place, such as a file descriptor.

#include <sdbus-c++/Types.h>

#include <map>
#include <stdexcept>
#include <string>

#include "Platform/Value.h"

namespace palisade {

/// `what()` says which entry has which type, and which types have a meaning.
class UnsuitableType : public std::invalid_argument {
 public:
  using std::invalid_argument::invalid_argument;
};

using BusDictionary = std::map<std::string, sdbus::Variant>;

Value valueFromBus(const sdbus::Variant& variant, const std::string& name);
Dictionary dictionaryFromBus(const BusDictionary& entries);

/// A null value has no place on the bus: such entries are left out.
BusDictionary dictionaryToBus(const Dictionary& dictionary);

}  // namespace palisade
