#pragma once

/// What secrets this process has had in its hands, so that none of them leaves it in a text: in a log, or in an error.
///
/// No secret is kept, only keyed hashes of its pieces: twelve bytes each, or the whole of a shorter one. So a piece is found
/// whatever stands around it, wherever a text was cut, and in the writings that a text may hold it in: as it is,
/// percent-encoded, with JSON's escapes, in Base64 or hexadecimal digits. Of a secret of more than 1 KiB the beginning counts;
/// one of fewer than six bytes is none, since ordinary words are as long.
///
/// Threads: safe from every thread. Ownership: owns its hashes, of which there is a bound: the secrets that were not seen for
/// the longest time are forgotten first. Errors: `std::bad_alloc`, after which a secret may be unknown.

#include <array>
#include <cstddef>
#include <cstdint>
#include <list>
#include <map>
#include <mutex>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace palisade {

/// What stands in a secret's place.
inline constexpr std::string_view masked = "[masked]";

class KnownSecrets {
 public:
  KnownSecrets();

  /// The one that the process's logs and errors ask.
  static KnownSecrets& ofProcess();

  void remember(std::string_view secret);

  /// The text with `masked` in place of each piece of a secret, neighbouring pieces together.
  std::string withoutSecrets(std::string_view text) const;

 private:
  struct Secret {
    std::uint64_t whole;
    std::map<std::size_t, std::vector<std::uint64_t>> pieces;  // by their length
    std::size_t count = 0;
  };
  using Secrets = std::list<Secret>;

  std::uint64_t hash(std::string_view bytes) const;
  void addPieces(std::string_view writing, std::size_t length, Secret& secret) const;
  void forgetOldest();

  std::array<std::uint64_t, 3> _key;
  mutable std::mutex _mutex;
  // Below: under _mutex. The secret that was seen last comes first.
  Secrets _secrets;
  std::unordered_map<std::uint64_t, Secrets::iterator> _byWhole;
  std::map<std::size_t, std::unordered_map<std::uint64_t, unsigned>> _pieces;  // how many secrets have each
  std::size_t _count = 0;
};

}  // namespace palisade
