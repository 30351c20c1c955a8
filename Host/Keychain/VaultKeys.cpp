#include "Host/Keychain/VaultKeys.h"

#include <string>
#include <string_view>
#include <utility>

#include "Host/Keychain/KeychainError.h"

namespace palisade {
namespace {

constexpr std::string_view knownText = "This key opens this vault.";

bool isThere(const std::filesystem::path& path) {
  std::error_code error;
  return std::filesystem::exists(std::filesystem::symlink_status(path, error));
}

// 128 random bits: no two keys have the same, whichever vault they are of.
std::string newKeyID() {
  std::string id;
  KeyHalf::random().withHexadecimal([&](std::string_view digits) { id = digits.substr(0, KeyHalf::size); });
  return id;
}

bool opens(const VaultCipher& cipher, const VaultKey& key) { return cipher.open(key.check, keychainServiceName) == knownText; }

}  // namespace

VaultKeys::VaultKeys(const VaultOptions& options, VaultStore& store)
    : _options(options),
      _store(store),
      _service(options.serviceTimeLimit) {}

VaultKeys::Cipher VaultKeys::cipher(std::int64_t number) {
  {
    const std::lock_guard lock(_mutex);
    const auto known = _ciphers.find(number);
    if (known != _ciphers.end()) return known->second;
  }
  const std::optional<VaultKey> key = _store.key(number);
  if (!key) throw lost("the vault does not know the key that a credential was sealed with");
  Cipher cipher = opened(*key);
  const std::lock_guard lock(_mutex);
  return _ciphers.emplace(number, std::move(cipher)).first->second;
}

VaultKeys::Current VaultKeys::current() {
  // Another process may be faster to make a key, and another thread too: theirs is used then.
  constexpr int enoughAttempts = 3;
  for (int attempt = 0;; ++attempt) {
    const std::optional<VaultKey> newest = _store.newestKey();
    if (newest && isAsChosen(*newest)) {
      try {
        return {.number = newest->number, .cipher = cipher(newest->number)};
      } catch (const KeychainError& error) {
        if (error.code() != KeychainErrorKeyLost || attempt == enoughAttempts) throw;
      }
    }
    make(newest);
  }
}

bool VaultKeys::areAsChosen() {
  const std::optional<VaultKey> newest = _store.newestKey();
  return !newest || isAsChosen(*newest);
}

void VaultKeys::tryAll() {
  for (const std::int64_t number : _store.keysInUse()) {
    if (const std::optional<VaultKey> key = _store.key(number)) opened(*key);
  }
}

bool VaultKeys::isAsChosen(const VaultKey& key) const {
  return _options.choice == KeychainChoice::automatic ||
         key.hasHalfInService == (_options.choice == KeychainChoice::secretService);
}

VaultKeys::Cipher VaultKeys::opened(const VaultKey& key) {
  const std::vector<KeyHalf> inFiles = halvesInFiles(key.number);
  Cipher right;
  const auto take = [&](const KeyHalf* inService) {
    for (const KeyHalf& inFile : inFiles) {
      auto cipher = std::make_shared<const VaultCipher>(key.id, inFile, inService);
      if (opens(*cipher, key)) right = std::move(cipher);
    }
    return right != nullptr;
  };
  if (!key.hasHalfInService) {
    if (!take(nullptr)) throw lost("its key file " + ownKeyFile(key.number).string() + " holds another key");
    return right;
  }
  const std::size_t offered = _service.offer(key.id, [&](const KeyHalf& inService) { return take(&inService); });
  if (right != nullptr) return right;
  throw lost(offered == 0 ? "the half of its key that lay in the session's Secret Service is gone"
                          : "its key is another one: the half of it that lay in the session's Secret Service was "
                            "replaced, or the one in " +
                                ownKeyFile(key.number).string());
}

// The halves are stored before the vault names them: what a crash or a faster process leaves is a half that nobody asks for.
void VaultKeys::make(const std::optional<VaultKey>& newest) {
  VaultKey key{.number = newest ? newest->number + 1 : 1,
               .id = newKeyID(),
               .hasHalfInService = shallHaveHalfInService(newest),
               .check = {}};
  std::optional<KeyHalf> inFile = halfOfServiceManager();
  if (!inFile) {
    createKeyFile(ownKeyFile(key.number));
    inFile = readKeyFile(ownKeyFile(key.number), KeyFile::ownKey);
  }
  const std::map<std::int64_t, Cipher> earlier = ciphersInUse();
  std::optional<KeyHalf> inService;
  if (key.hasHalfInService) {
    inService = KeyHalf::random();
    _service.add(key.id, *inService);
  }
  const auto cipher = std::make_shared<const VaultCipher>(key.id, *inFile, inService ? &*inService : nullptr);
  key.check = cipher->seal(knownText, keychainServiceName);

  const bool isAdded = _store.addKey(
      key, [&](const SealedCredential& credential, const std::string& place) -> std::optional<VaultCipher::Sealed> {
        const auto known = earlier.find(credential.keyNumber);
        const auto text = known == earlier.end() ? std::nullopt : known->second->open(credential.sealed, place);
        return text ? std::optional(cipher->seal(*text, place)) : std::nullopt;
      });
  if (!isAdded) return;
  const std::lock_guard lock(_mutex);
  _ciphers.emplace(key.number, cipher);
}

bool VaultKeys::shallHaveHalfInService(const std::optional<VaultKey>& newest) {
  switch (_options.choice) {
    case KeychainChoice::secretService: return true;
    case KeychainChoice::vault: return false;
    case KeychainChoice::automatic: break;
  }
  return newest ? newest->hasHalfInService : _service.isPresent();
}

// Those that can be opened now; the others keep what they have sealed.
std::map<std::int64_t, VaultKeys::Cipher> VaultKeys::ciphersInUse() {
  std::map<std::int64_t, Cipher> ciphers;
  for (const std::int64_t number : _store.keysInUse()) {
    try {
      ciphers.emplace(number, cipher(number));
    } catch (const KeychainError&) {
    }
  }
  return ciphers;
}

std::vector<KeyHalf> VaultKeys::halvesInFiles(std::int64_t number) const {
  std::vector<KeyHalf> halves;
  if (std::optional<KeyHalf> half = halfOfServiceManager()) halves.push_back(std::move(*half));
  const std::filesystem::path own = ownKeyFile(number);
  if (isThere(own)) halves.push_back(readKeyFile(own, KeyFile::ownKey));
  if (halves.empty()) throw lost("its key file " + own.string() + " is missing");
  return halves;
}

std::optional<KeyHalf> VaultKeys::halfOfServiceManager() const {
  if (!_options.credentialsFolder) return std::nullopt;
  const std::filesystem::path credential = *_options.credentialsFolder / "keychain.key";
  return isThere(credential) ? std::optional(readKeyFile(credential, KeyFile::systemCredential)) : std::nullopt;
}

std::filesystem::path VaultKeys::ownKeyFile(std::int64_t number) const {
  return number == 1 ? _options.keyFile : std::filesystem::path(_options.keyFile.string() + '.' + std::to_string(number));
}

KeychainError VaultKeys::lost(const std::string& reason) const {
  return {KeychainErrorKeyLost, "cannot open the vault " + _store.path().string() + ": " + reason +
                                    "; put back what was there, or sign in again with `palisade account add`"};
}

}  // namespace palisade
