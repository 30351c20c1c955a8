#include "Host/Keychain/VaultCipher.h"

#include <fcntl.h>
#include <sodium.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <system_error>

#include "Host/Keychain/KeychainError.h"

namespace palisade {
namespace {

static_assert(VaultCipher::keySize == crypto_aead_xchacha20poly1305_ietf_KEYBYTES);

constexpr std::size_t nonceSize = crypto_aead_xchacha20poly1305_ietf_NPUBBYTES;
constexpr std::size_t tagSize = crypto_aead_xchacha20poly1305_ietf_ABYTES;

class File {
 public:
  explicit File(int descriptor) : _descriptor(descriptor) {}
  File(const File&) = delete;
  File& operator=(const File&) = delete;
  ~File() {
    if (_descriptor >= 0) ::close(_descriptor);
  }
  int descriptor() const { return _descriptor; }
  bool isOpen() const { return _descriptor >= 0; }

 private:
  int _descriptor;
};

KeychainError keyError(const std::filesystem::path& keyFile, const std::string& reason) {
  return {KeychainErrorKey, "cannot use the vault's key file " + keyFile.string() + ": " + reason};
}

KeychainError systemFailure(const std::filesystem::path& keyFile, int errorNumber) {
  return keyError(keyFile, std::generic_category().message(errorNumber));
}

void requireTrustworthy(const std::filesystem::path& keyFile, const struct stat& status, VaultCipher::KeyFile kind) {
  if (!S_ISREG(status.st_mode)) throw keyError(keyFile, "it is not a plain file");
  const bool isOurs = status.st_uid == ::geteuid();
  if (kind == VaultCipher::KeyFile::ownKey) {
    if (!isOurs) throw keyError(keyFile, "it belongs to another user; make it this user's with chown");
    if ((status.st_mode & (S_IRWXG | S_IRWXO)) != 0) {
      throw keyError(keyFile,
                     "other users may read or write it; take these rights away with chmod 600, and think of what was "
                     "stored as known to them");
    }
  } else if ((!isOurs && status.st_uid != 0) || (status.st_mode & S_IRWXO) != 0) {
    // The service manager lets the service in through an access list, which shows as a right of the group.
    throw keyError(keyFile, "every user may read or write it, or it is neither root's nor this user's");
  }
  if (status.st_size != static_cast<off_t>(VaultCipher::keySize)) {
    throw keyError(keyFile, "it holds " + std::to_string(status.st_size) + " bytes, and a key has " +
                                std::to_string(VaultCipher::keySize));
  }
}

void startLibrary() {
  if (sodium_init() < 0) throw KeychainError(KeychainErrorUnavailable, "cannot open the vault: no source of random numbers");
}

const unsigned char* bytes(std::string_view text) { return reinterpret_cast<const unsigned char*>(text.data()); }
unsigned char* bytes(std::string& text) { return reinterpret_cast<unsigned char*>(text.data()); }

}  // namespace

void VaultCipher::GuardedFree::operator()(unsigned char* memory) const { sodium_free(memory); }

VaultCipher::VaultCipher(const std::filesystem::path& keyFile, KeyFile kind) {
  startLibrary();
  _key.reset(static_cast<unsigned char*>(sodium_malloc(keySize)));
  if (_key == nullptr) throw KeychainError(KeychainErrorUnavailable, "cannot open the vault: no memory for its key");

  const File file(::open(keyFile.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  struct stat status {};
  if (!file.isOpen() || ::fstat(file.descriptor(), &status) != 0) throw systemFailure(keyFile, errno);
  requireTrustworthy(keyFile, status, kind);
  if (::read(file.descriptor(), _key.get(), keySize) != static_cast<ssize_t>(keySize)) {
    throw keyError(keyFile, "it cannot be read whole");
  }
  sodium_mprotect_readonly(_key.get());
}

// The key is written to a file beside and then gets its name, so that nobody ever reads half a key or replaces one.
void VaultCipher::createKeyFile(const std::filesystem::path& keyFile) {
  startLibrary();
  const std::filesystem::path unfinished = keyFile.string() + ".new-" + std::to_string(::getpid());
  ::unlink(unfinished.c_str());
  const File file(::open(unfinished.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR));
  if (!file.isOpen()) throw systemFailure(keyFile, errno);

  unsigned char key[keySize];
  randombytes_buf(key, sizeof key);
  const bool isWritten =
      ::write(file.descriptor(), key, sizeof key) == static_cast<ssize_t>(sizeof key) && ::fsync(file.descriptor()) == 0;
  sodium_memzero(key, sizeof key);
  const bool isNamed = isWritten && (::link(unfinished.c_str(), keyFile.c_str()) == 0 || errno == EEXIST);
  const int errorNumber = errno;
  ::unlink(unfinished.c_str());
  if (!isNamed) throw systemFailure(keyFile, errorNumber);

  const File folder(::open(keyFile.parent_path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!folder.isOpen() || ::fsync(folder.descriptor()) != 0) throw systemFailure(keyFile, errno);
}

VaultCipher::Sealed VaultCipher::seal(std::string_view secret, std::string_view place) const {
  Sealed sealed{.nonce = std::string(nonceSize, '\0'), .ciphertext = std::string(secret.size() + tagSize, '\0')};
  randombytes_buf(sealed.nonce.data(), nonceSize);
  crypto_aead_xchacha20poly1305_ietf_encrypt(bytes(sealed.ciphertext), nullptr, bytes(secret), secret.size(), bytes(place),
                                             place.size(), nullptr, bytes(sealed.nonce), _key.get());
  return sealed;
}

std::optional<std::string> VaultCipher::open(const Sealed& sealed, std::string_view place) const {
  if (sealed.nonce.size() != nonceSize || sealed.ciphertext.size() < tagSize) return std::nullopt;
  std::string secret(sealed.ciphertext.size() - tagSize, '\0');
  const std::string_view ciphertext = sealed.ciphertext;
  const std::string_view nonce = sealed.nonce;
  if (crypto_aead_xchacha20poly1305_ietf_decrypt(bytes(secret), nullptr, nullptr, bytes(ciphertext), ciphertext.size(),
                                                 bytes(place), place.size(), bytes(nonce), _key.get()) != 0) {
    return std::nullopt;
  }
  return secret;
}

}  // namespace palisade
