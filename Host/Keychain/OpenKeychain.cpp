#include "Host/Keychain/OpenKeychain.h"

#include <array>
#include <fstream>
#include <string>
#include <utility>

#include "Host/Keychain/KeychainError.h"
#include "Host/Keychain/SecretServiceKeychain.h"

namespace palisade {
namespace {

constexpr std::array<std::pair<KeychainChoice, std::string_view>, 3> names{{{KeychainChoice::automatic, "automatic"},
                                                                            {KeychainChoice::secretService, "secret-service"},
                                                                            {KeychainChoice::vault, "vault"}}};

KeychainError choiceError(const std::filesystem::path& choiceFile, std::string_view reason) {
  std::string text = "cannot choose the keychain by " + choiceFile.string() + ": ";
  return {KeychainErrorStorage, text.append(reason)};
}

std::optional<KeychainChoice> earlierChoice(const std::filesystem::path& choiceFile) {
  std::ifstream file(choiceFile);
  if (!file) {
    std::error_code error;
    if (std::filesystem::exists(choiceFile, error) || error) throw choiceError(choiceFile, "it cannot be read");
    return std::nullopt;
  }
  std::string word;
  file >> word;
  const auto choice = keychainChoiceNamed(word);
  if (!choice || *choice == KeychainChoice::automatic) {
    throw choiceError(choiceFile, "it says neither \"secret-service\" nor \"vault\"; write one of the two into it");
  }
  return choice;
}

void writeDown(KeychainChoice choice, const std::filesystem::path& choiceFile) {
  const std::filesystem::path unfinished = choiceFile.string() + ".new";
  std::error_code error;
  std::filesystem::create_directories(choiceFile.parent_path(), error);
  {
    std::ofstream file(unfinished);
    file << nameOf(choice) << '\n';
    if (!file.flush()) throw choiceError(choiceFile, "it cannot be written");
  }
  std::filesystem::rename(unfinished, choiceFile, error);
  if (error) throw choiceError(choiceFile, error.message());
}

}  // namespace

std::optional<KeychainChoice> keychainChoiceNamed(std::string_view name) {
  for (const auto& [choice, itsName] : names) {
    if (itsName == name) return choice;
  }
  return std::nullopt;
}

std::string_view nameOf(KeychainChoice choice) {
  for (const auto& [each, itsName] : names) {
    if (each == choice) return itsName;
  }
  return {};
}

std::unique_ptr<Keychain> openKeychain(const KeychainOptions& options) {
  const bool isAutomatic = options.choice == KeychainChoice::automatic;
  const auto choice = isAutomatic ? earlierChoice(options.choiceFile) : std::optional(options.choice);
  if (choice == KeychainChoice::secretService) return std::make_unique<SecretServiceKeychain>();
  if (choice == KeychainChoice::vault) return std::make_unique<VaultKeychain>(options.vault);

  if (auto secretService = std::make_unique<SecretServiceKeychain>(); secretService->isPresent()) {
    writeDown(KeychainChoice::secretService, options.choiceFile);
    return secretService;
  }
  auto vault = std::make_unique<VaultKeychain>(options.vault);
  writeDown(KeychainChoice::vault, options.choiceFile);
  return vault;
}

}  // namespace palisade
