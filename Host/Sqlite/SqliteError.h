#pragma once

/// What went wrong with a store: told in a sentence that names the file, what was being done, and what to do about it.
///
/// Threads: an exception, thrown and caught on one thread. Ownership: a value.
/// Errors: after one of these nothing of the transaction in progress has been stored.

#include <filesystem>
#include <stdexcept>
#include <string>
#include <string_view>

#include "Platform/Error.h"

namespace palisade {

/// The domain of the errors that stores answer.
inline constexpr std::string_view StoreErrorDomain = "StoreErrorDomain";

/// Codes in `StoreErrorDomain`.
enum StoreErrorCode : int {
  StoreErrorFull = 1,              ///< no space left for the change
  StoreErrorNotWritable = 2,       ///< the file or its folder cannot be written, or belongs to somebody else
  StoreErrorDamaged = 3,           ///< the content is not what was written
  StoreErrorNewerVersion = 4,      ///< a newer version of the program wrote the store
  StoreErrorBusy = 5,              ///< another process holds the store for longer than the busy time-out
  StoreErrorSetAside = 6,          ///< the store was damaged earlier and has been set aside; there is no other yet
  StoreErrorForeign = 7,           ///< the file is a database of something else
  StoreErrorConstraint = 8,        ///< the change contradicts what is stored
  StoreErrorNotRepresentable = 9,  ///< a value that would not read back as it was written
  StoreErrorOther = 99
};

class SqliteError : public std::runtime_error {
 public:
  /// `during` completes "cannot ...": "open the store", "read an authorization".
  SqliteError(StoreErrorCode code, const std::filesystem::path& path, std::string_view during, std::string_view reason);

  /// For a result code of the library. A known code brings its own advice; `detail` is the library's message.
  static SqliteError fromResult(int resultCode, const std::filesystem::path& path, std::string_view during,
                                std::string_view detail);

  StoreErrorCode code() const { return _code; }

  /// The same for callers that are answered an error instead of an exception.
  Error error() const { return {.domain = std::string(StoreErrorDomain), .code = _code, .description = what()}; }

 private:
  StoreErrorCode _code;
};

}  // namespace palisade
