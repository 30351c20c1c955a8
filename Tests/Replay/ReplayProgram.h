#pragma once

/// Runs plugin-replay as its users do and reads what it prints.

#include <filesystem>
#include <string>
#include <vector>

#include "Platform/Value.h"

namespace palisade {

struct ReplayRun {
  int exitStatus = -1;
  std::string output;
  std::string errors;

  /// The printed lines, each parsed.
  std::vector<Value> results() const;
};

std::string contentOf(const std::filesystem::path& file);

ReplayRun runReplay(const std::vector<std::string>& arguments, const std::string& input = "");

/// How the operations of a trace ended, in order: "0 granted", "1 refused", "1 refused with AccountsErrorDomain 7",
/// "2 blocked-forever by alert"; or the scenario's error or crash.
std::vector<std::string> outcomesOf(const Value& result);

/// The events of a name.
std::vector<Value> eventsOf(const Value& result, const std::string& name);

}  // namespace palisade
