#pragma once

/// What an access request comes to, told plainly and without the plug-in: the yardstick for random requests.
///
/// It is written as the rules are told, one after the other, on ordinary sets and values. Threads and ownership: plain values.

#include <cstdint>
#include <optional>
#include <set>
#include <string>
#include <utility>

#include "Platform/Value.h"

namespace palisade::model {

using Names = std::set<std::string>;

/// The values under the three keys of an options dictionary, each absent or of any type.
struct Options {
  std::optional<Value> appID = {};
  std::optional<Value> permissions = {};
  std::optional<Value> audience = {};
};

struct Record {
  bool granted = false;
  bool hasOptions = false;
  /// Without permissions: a grant keeps only the other two.
  Options options = {};
  std::optional<Names> permissions = {};
};

enum class ServerSays { tokenAndPermissions, tokenAlone, noToken, networkDown, nothing, noJson };

struct Request {
  bool hasAllAccountsAccess = false;
  bool hasDefaultAccess = false;
  std::optional<std::string> bundleID = {};
  int accounts = 0;
  std::optional<Options> options = {};
  std::optional<Record> record = {};
  bool requestsAreIgnored = false;
  /// What the alert writes, if anything.
  std::optional<std::uintptr_t> responseWord = {};
  /// The body of the server's description; none when it cannot be reached.
  std::optional<std::string> description = {};
  ServerSays serverSays = ServerSays::nothing;
  Names serverGrants = {};
};

struct Outcome {
  bool granted = false;
  /// Domain and code.
  std::optional<std::pair<std::string, int>> error = {};
  /// What the user is asked to agree to, and whether the question could be put.
  std::optional<Names> consentSought = {};
  bool alertShown = false;
  /// What the server is asked for, and the audience that it is told.
  std::optional<Names> requestedFromServer = {};
  std::optional<std::string> serverAudience = {};
  bool tokenStored = false;
  /// The client's record afterwards.
  std::optional<Record> record = {};
};

Outcome outcomeOf(const Request& request);

}  // namespace palisade::model
