#pragma once

#include <stdexcept>

namespace palisade {

/// Why a caller could not be identified. The caller is refused.
class IdentityError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

}  // namespace palisade
