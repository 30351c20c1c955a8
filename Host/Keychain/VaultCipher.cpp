#include "Host/Keychain/VaultCipher.h"

#include <sodium.h>

#include "Host/Keychain/KeychainError.h"

namespace palisade {
namespace {

static_assert(KeyHalf::size == crypto_aead_xchacha20poly1305_ietf_KEYBYTES);
static_assert(KeyHalf::size >= crypto_generichash_KEYBYTES_MIN && KeyHalf::size <= crypto_generichash_KEYBYTES_MAX);

constexpr std::size_t nonceSize = crypto_aead_xchacha20poly1305_ietf_NPUBBYTES;
constexpr std::size_t tagSize = crypto_aead_xchacha20poly1305_ietf_ABYTES;

// What else a half may come to be hashed for begins otherwise.
constexpr std::string_view keyOfFile = "palisade vault key 1: file";
constexpr std::string_view keyOfFileAndService = "palisade vault key 1: file and service";

const unsigned char* bytes(std::string_view text) { return reinterpret_cast<const unsigned char*>(text.data()); }
unsigned char* bytes(std::string& text) { return reinterpret_cast<unsigned char*>(text.data()); }

// Every text comes behind its length, so unlike parts give unlike wholes.
void add(crypto_generichash_state& state, std::string_view text) {
  const auto size = static_cast<unsigned char>(text.size());
  crypto_generichash_update(&state, &size, 1);
  crypto_generichash_update(&state, bytes(text), text.size());
}

}  // namespace

VaultCipher::VaultCipher(std::string_view keyID, const KeyHalf& inFile, const KeyHalf* inService) {
  crypto_generichash_state state;
  crypto_generichash_init(&state, inFile.bytes(), KeyHalf::size, KeyHalf::size);
  add(state, inService == nullptr ? keyOfFile : keyOfFileAndService);
  add(state, keyID);
  if (inService != nullptr) crypto_generichash_update(&state, inService->bytes(), KeyHalf::size);
  crypto_generichash_final(&state, _key.bytes(), KeyHalf::size);
  sodium_memzero(&state, sizeof state);
}

VaultCipher::Sealed VaultCipher::seal(std::string_view secret, std::string_view place) const {
  Sealed sealed{.nonce = std::string(nonceSize, '\0'), .ciphertext = std::string(secret.size() + tagSize, '\0')};
  randombytes_buf(sealed.nonce.data(), nonceSize);
  crypto_aead_xchacha20poly1305_ietf_encrypt(bytes(sealed.ciphertext), nullptr, bytes(secret), secret.size(), bytes(place),
                                             place.size(), nullptr, bytes(sealed.nonce), _key.bytes());
  return sealed;
}

std::optional<std::string> VaultCipher::open(const Sealed& sealed, std::string_view place) const {
  if (sealed.nonce.size() != nonceSize || sealed.ciphertext.size() < tagSize) return std::nullopt;
  std::string secret(sealed.ciphertext.size() - tagSize, '\0');
  const std::string_view ciphertext = sealed.ciphertext;
  const std::string_view nonce = sealed.nonce;
  if (crypto_aead_xchacha20poly1305_ietf_decrypt(bytes(secret), nullptr, nullptr, bytes(ciphertext), ciphertext.size(),
                                                 bytes(place), place.size(), bytes(nonce), _key.bytes()) != 0) {
    return std::nullopt;
  }
  return secret;
}

}  // namespace palisade
