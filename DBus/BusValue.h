#pragma once

/// Values between D-Bus and the platform. What is received is read out of its message straight into a `Dictionary`: the bus
/// library's own variants are messages each, which costs more than all the rest of a call. What is sent is made of them.
///
/// Every basic D-Bus type has a place: the smaller integers become integers, object paths and signatures strings. Arrays and
/// dictionaries with string keys are converted with all that they hold, nested as deep as D-Bus allows; a variant is what it
/// holds. Text that the bus's library does not send (ValidText.h) is repaired, so that one bad name spoils no listing.
///
/// A dictionary holds at most `largestBusDictionary`: the bytes of its texts and keys, and eight more for each key and value.
/// When that is exceeded, the rest of what is received is not looked at. Threads: pure functions. Errors: `UnsuitableType` for
/// a type that has no place, such as a file descriptor; `TooLarge`.

#include <sdbus-c++/Error.h>
#include <sdbus-c++/Message.h>
#include <sdbus-c++/TypeTraits.h>
#include <sdbus-c++/Types.h>

#include <cstddef>
#include <map>
#include <string>

#include "Platform/Value.h"

namespace palisade {

/// Says which entry holds which type, and which types have a meaning. The bus carries it to a caller as it is.
class UnsuitableType : public sdbus::Error {
 public:
  explicit UnsuitableType(const std::string& message) : Error("com.veltran.Accounts1.Error.InvalidArguments", message) {}
};

inline constexpr std::size_t largestBusDictionary = 64 * 1024;

/// A dictionary holds more than that.
class TooLarge : public sdbus::Error {
 public:
  TooLarge() : Error("com.veltran.Accounts1.Error.InvalidArguments", "A dictionary holds more than 64 KiB.") {}
};

using BusDictionary = std::map<std::string, sdbus::Variant>;

/// Reads a{sv}.
sdbus::Message& operator>>(sdbus::Message& message, Dictionary& dictionary);

/// A null value has no place on the bus: such entries are left out.
BusDictionary dictionaryToBus(const Dictionary& dictionary);

}  // namespace palisade

/// Has the bus library's templates take a `Dictionary` for a{sv}.
template <>
struct sdbus::signature_of<palisade::Dictionary> : sdbus::signature_of<palisade::BusDictionary> {};
