#pragma once

/// The command line of palisade-sandbox. Pure. Errors: `std::invalid_argument` with a sentence for the user.

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include "Sandbox/Certificates.h"

namespace palisade::sandbox {

enum class Command { help, serve, tokens, requests, faults, fault, calm };

struct Options {
  Command command = Command::serve;
  std::filesystem::path folder;
  int port = 0;
  CertificateKind certificate = CertificateKind::good;
  std::optional<std::filesystem::path> permissions;
  std::optional<std::filesystem::path> configuration;
  /// The fields of the fault to arm.
  std::vector<std::pair<std::string, std::string>> fault;
};

Options parseOptions(int count, char** words);

std::string helpText();

}  // namespace palisade::sandbox
