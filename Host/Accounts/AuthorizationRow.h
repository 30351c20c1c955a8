#pragma once

/// An authorization record as the store writes it: options and permissions as JSON, and a digest over the whole.
///
/// Threads: all functions are pure. Ownership: values.

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "Platform/ClientAuthorization.h"

namespace palisade {

struct AuthorizationRow {
  std::string clientID;
  std::optional<std::string> bundleID;
  std::string appName;
  bool granted = false;
  bool answeredByNobody = false;
  std::optional<std::string> options;      ///< a JSON object; none as none
  std::optional<std::string> permissions;  ///< a JSON array in alphabetical order; none as none
  std::int64_t updatedAt = 0;
};

/// The record's options or permissions as they are stored. Throws `std::invalid_argument` for what would not read back as it
/// is: text that is not UTF-8 or holds U+0000, a number that is not finite, options nested too deep.
std::optional<std::string> storedOptions(const ClientAuthorization& record);
std::optional<std::string> storedPermissions(const ClientAuthorization& record);

/// The record that the row holds, for `client`; null when the JSON is not what the functions above wrote.
std::shared_ptr<ClientAuthorization> recordInRow(const AuthorizationRow& row, std::shared_ptr<const Client> client);

/// A number that changes with every byte of the row and of its account type. The file format has no check sums: a bit that
/// flips on the disk could turn a refusal into a grant, and this is how it is noticed. It is no protection against somebody
/// who can write to the file.
std::int64_t digestOf(std::string_view accountTypeIdentifier, const AuthorizationRow& row);

}  // namespace palisade
