#pragma once

/// Encodes form fields as application/x-www-form-urlencoded. Pure; does not fail.

#include <span>
#include <string>
#include <utility>

namespace palisade {

using FormField = std::pair<std::string, std::string>;

/// Fields keep their order; a name may occur several times. Every byte that is no letter, digit, "-", ".", "_" or "~" is
/// written as "%" and two hexadecimal digits.
std::string formEncoded(std::span<const FormField> fields);

}  // namespace palisade
