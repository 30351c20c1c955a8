#pragma once

/// 32 random bytes that a key is made of, in memory that is neither swapped nor dumped and is wiped when it is given back.
///
/// Threads: a value; the functions are safe from every thread. Ownership: moves, never copies. Errors: `KeychainError`.

#include <cstddef>
#include <filesystem>
#include <memory>
#include <optional>
#include <string_view>

namespace palisade {

class KeyHalf {
 public:
  static constexpr std::size_t size = 32;

  /// Zeros, to be filled.
  KeyHalf();
  static KeyHalf random();

  /// None unless the text is twice as many hexadecimal digits.
  static std::optional<KeyHalf> fromHexadecimal(std::string_view digits);

  /// Calls `use` with the hexadecimal digits, which are wiped afterwards.
  template <typename Use>
  void withHexadecimal(Use use) const {
    const Digits digits(*this);
    use(digits.text());
  }

  unsigned char* bytes() { return _bytes.get(); }
  const unsigned char* bytes() const { return _bytes.get(); }

 private:
  struct GuardedFree {
    void operator()(unsigned char* memory) const;
  };

  class Digits {
   public:
    explicit Digits(const KeyHalf& half);
    Digits(const Digits&) = delete;
    Digits& operator=(const Digits&) = delete;
    ~Digits();
    std::string_view text() const { return {_text, 2 * size}; }

   private:
    char _text[2 * size + 1];
  };

  std::unique_ptr<unsigned char[], GuardedFree> _bytes;
};

enum class KeyFile {
  ownKey,           ///< a file of this user's that nobody else may read
  systemCredential  ///< a file that the service manager has put there for us
};

/// Reads a file that holds a half and nothing else. Throws `KeychainErrorKey` for a file that others may read, or that is
/// something else.
KeyHalf readKeyFile(const std::filesystem::path& keyFile, KeyFile kind);

/// Makes a file with a random half, readable for this user only, unless there is one.
void createKeyFile(const std::filesystem::path& keyFile);

}  // namespace palisade
