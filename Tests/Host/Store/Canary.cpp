// A program that has held a secret and has given it back in many ways. It looks for the secret in its own memory and answers
// how many places hold a piece of it: none, when it is linked with the wiping operators.
//
// The secret is never written down in one piece: it is made from a key when it is needed, and looked for by its making.

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <functional>
#include <map>
#include <memory>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "Host/Json/Json.h"
#include "Host/Keychain/VaultKeychain.h"
#include "Host/Secrets/WipingMemory.h"
#include "Platform/AccountCredential.h"
#include "Platform/Value.h"
#include "Tests/Host/Store/KeychainEntries.h"
#include "Tests/Host/TemporaryFolder.h"

namespace {

using namespace palisade;

constexpr std::size_t length = 96;

// The secret's character at a position; a multiplication whose result the compiler cannot know beforehand.
volatile unsigned multiplier = 197;
char characterAt(std::size_t position) { return static_cast<char>('!' + (position * multiplier + position * position) % 90); }

std::string makeSecret() {
  std::string secret;
  for (std::size_t position = 0; position < length; ++position) secret += characterAt(position);
  return secret;
}

void passThroughStrings() {
  const std::string secret = makeSecret();
  std::string grown;
  for (int round = 0; round < 50; ++round) grown += secret;
  const std::vector<std::string> copies(20, secret);
  std::map<std::string, std::string> keyed{{secret, secret}};
  keyed.erase(secret);
}

void passThroughStreams() {
  std::ostringstream stream;
  stream << makeSecret() << makeSecret();
  std::istringstream back(stream.str());
  std::string read;
  back >> read;
}

void passThroughJson() {
  const Dictionary object{{"access_token", makeSecret()}, {makeSecret(), Array{makeSecret()}}};
  const auto parsed = NlohmannJsonParser().parse(writeJson(object), JsonFragments::refused);
  const Value copy = *parsed.value;
}

void passThroughThreads() {
  auto credential = std::make_shared<const AccountCredential>(makeSecret(), makeSecret(), distantFuture);
  const std::function<void()> work = [credential, copy = makeSecret()] { const std::string another = copy; };
  std::thread(work).join();
}

void passThroughLibraries() {
  const std::string secret = makeSecret();
  auto* buffer = static_cast<char*>(wipingMalloc(16));
  for (std::size_t size = 16; size < 40 * length; size *= 2) {
    buffer = static_cast<char*>(wipingRealloc(buffer, size));
    for (std::size_t filled = 0; filled + length < size; filled += length) std::memcpy(buffer + filled, secret.data(), length);
  }
  wipingFree(buffer);
  wipingFree(wipingStrdup(secret.c_str()));
  void* counted = wipingCalloc(2, length);
  std::memcpy(counted, secret.data(), length);
  wipingFreeAt(wipingReallocAt(counted, 3 * length, "", 0), "", 0);
}

void passThroughTheVault(const std::filesystem::path& folder) {
  VaultKeychain vault(
      {.choice = KeychainChoice::vault, .path = folder / "vault" / "vault.sqlite", .keyFile = folder / "vault" / "vault.key"});
  const auto account = makeAccount("a", AccountCredential(makeSecret(), makeSecret(), distantFuture));
  vault.setCredentialForAccount(account, "client");
  account->setCredential(nullptr);
  vault.credentialForAccount(account, "client");
}

// Whether the secret's characters from `position` on stand here.
bool standsHere(const char* memory, std::size_t position, std::size_t size) {
  for (std::size_t index = 0; index < size; ++index) {
    if (memory[index] != characterAt(position + index)) return false;
  }
  return true;
}

// How often a piece of the secret, as long as a vector register, stands in the readable memory of the process.
int piecesInMemory() {
  constexpr std::size_t piece = 16;
  constexpr std::size_t greatestRegion = std::size_t{1} << 30U;  // a sanitizer's shadow is larger, and no memory of ours
  static std::array<char, 1 << 16> buffer;
  const int memory = ::open("/proc/self/mem", O_RDONLY | O_CLOEXEC);
  std::ifstream regions("/proc/self/maps");
  int found = 0;
  for (std::string line; std::getline(regions, line);) {
    unsigned long begin = 0;
    unsigned long end = 0;
    char readable = '-';
    if (std::sscanf(line.c_str(), "%lx-%lx %c", &begin, &end, &readable) != 3) continue;
    if (readable != 'r' || end - begin > greatestRegion) continue;
    for (unsigned long place = begin; place < end; place += buffer.size() - length) {
      const ssize_t size =
          ::pread(memory, buffer.data(), std::min<std::size_t>(buffer.size(), end - place), static_cast<off_t>(place));
      for (ssize_t offset = 0; offset + static_cast<ssize_t>(piece) <= size; ++offset) {
        for (std::size_t position = 0; position + piece <= length; position += piece) {
          found += standsHere(buffer.data() + offset, position, piece) ? 1 : 0;
        }
      }
    }
  }
  ::close(memory);
  return found;
}

}  // namespace

int main() {
  const TemporaryFolder folder;
  for (int round = 0; round < 3; ++round) {
    passThroughStrings();
    passThroughStreams();
    passThroughJson();
    passThroughThreads();
    passThroughLibraries();
    passThroughTheVault(folder.path());
  }
  std::printf("%d\n", piecesInMemory());
  return 0;
}
