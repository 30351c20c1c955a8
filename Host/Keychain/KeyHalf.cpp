#include "Host/Keychain/KeyHalf.h"

#include <fcntl.h>
#include <sodium.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <system_error>

#include "Host/Files/FileDescriptor.h"
#include "Host/Keychain/KeychainError.h"

namespace palisade {
namespace {

KeychainError keyError(const std::filesystem::path& keyFile, const std::string& reason) {
  return {KeychainErrorKey, "cannot use the vault's key file " + keyFile.string() + ": " + reason};
}

KeychainError systemFailure(const std::filesystem::path& keyFile, int errorNumber) {
  return keyError(keyFile, std::generic_category().message(errorNumber));
}

void requireTrustworthy(const std::filesystem::path& keyFile, const struct stat& status, KeyFile kind) {
  if (!S_ISREG(status.st_mode)) throw keyError(keyFile, "it is not a plain file");
  const bool isOurs = status.st_uid == ::geteuid();
  if (kind == KeyFile::ownKey) {
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
  if (status.st_size != static_cast<off_t>(KeyHalf::size)) {
    throw keyError(keyFile,
                   "it holds " + std::to_string(status.st_size) + " bytes, and a key has " + std::to_string(KeyHalf::size));
  }
}

}  // namespace

void KeyHalf::GuardedFree::operator()(unsigned char* memory) const { sodium_free(memory); }

KeyHalf::KeyHalf() {
  if (sodium_init() < 0) throw KeychainError(KeychainErrorUnavailable, "cannot open the vault: no source of random numbers");
  _bytes.reset(static_cast<unsigned char*>(sodium_malloc(size)));
  if (_bytes == nullptr) throw KeychainError(KeychainErrorUnavailable, "cannot open the vault: no memory for its key");
  sodium_memzero(_bytes.get(), size);
}

KeyHalf KeyHalf::random() {
  KeyHalf half;
  randombytes_buf(half.bytes(), size);
  return half;
}

std::optional<KeyHalf> KeyHalf::fromHexadecimal(std::string_view digits) {
  KeyHalf half;
  std::size_t length = 0;
  const char* end = nullptr;
  if (digits.size() != 2 * size ||
      sodium_hex2bin(half.bytes(), size, digits.data(), digits.size(), nullptr, &length, &end) != 0 || length != size) {
    return std::nullopt;
  }
  return half;
}

KeyHalf::Digits::Digits(const KeyHalf& half) { sodium_bin2hex(_text, sizeof _text, half.bytes(), size); }

KeyHalf::Digits::~Digits() { sodium_memzero(_text, sizeof _text); }

KeyHalf readKeyFile(const std::filesystem::path& keyFile, KeyFile kind) {
  const FileDescriptor file(::open(keyFile.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  struct stat status {};
  if (!file.isOpen() || ::fstat(file.number(), &status) != 0) throw systemFailure(keyFile, errno);
  requireTrustworthy(keyFile, status, kind);
  KeyHalf half;
  if (::read(file.number(), half.bytes(), KeyHalf::size) != static_cast<ssize_t>(KeyHalf::size)) {
    throw keyError(keyFile, "it cannot be read whole");
  }
  return half;
}

// The half is written to a file beside, which then gets its name, so that nobody ever reads a part of it or replaces one.
void createKeyFile(const std::filesystem::path& keyFile) {
  const KeyHalf half = KeyHalf::random();
  const std::filesystem::path unfinished =
      keyFile.string() + ".new-" + std::to_string(::getpid()) + "-" + std::to_string(::gettid());
  ::unlink(unfinished.c_str());
  const FileDescriptor file(
      ::open(unfinished.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR));
  if (!file.isOpen()) throw systemFailure(keyFile, errno);

  const bool isWritten =
      ::write(file.number(), half.bytes(), KeyHalf::size) == static_cast<ssize_t>(KeyHalf::size) && ::fsync(file.number()) == 0;
  const bool isNamed = isWritten && (::link(unfinished.c_str(), keyFile.c_str()) == 0 || errno == EEXIST);
  const int errorNumber = errno;
  ::unlink(unfinished.c_str());
  if (!isNamed) throw systemFailure(keyFile, errorNumber);

  const FileDescriptor folder(::open(keyFile.parent_path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!folder.isOpen() || ::fsync(folder.number()) != 0) throw systemFailure(keyFile, errno);
}

}  // namespace palisade
