#include "Tests/Unit/Access/AccessModel.h"

#include <algorithm>

namespace palisade::model {
namespace {

const Names writing{"publish", "publish_actions", "publish_checkins", "publish_stream"};

// Of the names that random requests ask for, those that the server has to describe.
bool isUnknown(const std::string& name) { return name.starts_with("unknown") || name == "Publish" || name.empty(); }

std::optional<std::string> textIn(const std::optional<Value>& value) {
  if (!value || value->string() == nullptr) return std::nullopt;
  return *value->string();
}

Names namesIn(const std::optional<Value>& value) {
  Names names;
  if (!value || value->array() == nullptr) return names;
  for (const Value& element : *value->array()) {
    if (element.string() != nullptr) names.insert(*element.string());
  }
  return names;
}

bool share(const Names& some, const Names& others) {
  return std::ranges::any_of(some, [&](const std::string& name) { return others.contains(name); });
}

Names without(const Names& some, const Names& others) {
  Names rest;
  std::ranges::set_difference(some, others, std::inserter(rest, rest.end()));
  return rest;
}

bool areValid(const Options& options) {
  const bool appIDIsGood = textIn(options.appID).value_or("") != "";
  const bool permissionsAreGood = !options.permissions || options.permissions->array() != nullptr;
  const bool audienceIsGood = !share(namesIn(options.permissions), writing) || textIn(options.audience).has_value();
  return appIDIsGood && permissionsAreGood && audienceIsGood;
}

Names stillHeld(const Record& record, const Options& asked) {
  if (!record.hasOptions) return {};
  Names held;
  const auto appID = textIn(record.options.appID);
  if (appID && appID == textIn(asked.appID)) held = record.permissions.value_or(Names());
  const auto audience = textIn(record.options.audience);
  const bool isForTheSameAudience = audience && audience == textIn(asked.audience);
  if (share(namesIn(asked.permissions), writing) && !isForTheSameAudience) held = without(held, writing);
  return held;
}

bool canBeDescribed(const Names& names, const std::optional<std::string>& description) {
  if (std::ranges::none_of(names, isUnknown)) return true;
  return description && description->starts_with('"') && description != R"("")" && description != R"("API_EC_PARAM")";
}

std::optional<std::string> serversWordFor(const std::optional<std::string>& audience) {
  if (audience == "FacebookAudienceEveryone") return "EVERYONE";
  if (audience == "FacebookAudienceFriends") return "ALL_FRIENDS";
  if (audience == "FacebookAudienceOnlyMe") return "SELF";
  return std::nullopt;
}

std::pair<std::string, int> accountsError(int code) { return {"AccountsErrorDomain", code}; }

void askTheServer(const Request& request, const Names& names, Record grant, Outcome& outcome) {
  if (!request.bundleID) {
    outcome.error = accountsError(16);
    return;
  }
  outcome.requestedFromServer = names;
  outcome.serverAudience = serversWordFor(textIn(request.options->audience));
  switch (request.serverSays) {
    case ServerSays::networkDown: outcome.error = {"org.example.network", 7}; return;
    case ServerSays::nothing: return;
    case ServerSays::noJson: outcome.error = {"JsonErrorDomain", 1}; return;
    case ServerSays::noToken: outcome.error = accountsError(7); return;
    case ServerSays::tokenAlone: grant.permissions = Names(); break;
    case ServerSays::tokenAndPermissions: grant.permissions = request.serverGrants; break;
  }
  outcome.granted = true;
  outcome.tokenStored = true;
  outcome.record = std::move(grant);
}

}  // namespace

Outcome outcomeOf(const Request& request) {
  Outcome outcome{.record = request.record};
  if (request.hasAllAccountsAccess) {
    outcome.granted = true;
    return outcome;
  }
  if (request.accounts == 0 && !request.hasDefaultAccess) {
    outcome.error = accountsError(6);
    return outcome;
  }
  if (!request.options || !areValid(*request.options)) {
    outcome.error = accountsError(8);
    return outcome;
  }
  const Options& options = *request.options;
  const Names asked = namesIn(options.permissions);

  Names held;
  if (request.record) {
    if (!request.record->granted) return outcome;
    held = stillHeld(*request.record, options);
    if (!held.empty() && without(asked, held).empty()) {
      outcome.granted = true;
      return outcome;
    }
  }
  const Names added = without(asked, held);
  Record record{.hasOptions = true, .options = {.appID = options.appID, .audience = options.audience}};

  bool agreed = request.hasDefaultAccess;
  if (!request.hasDefaultAccess) {
    outcome.consentSought = added;
    outcome.alertShown = canBeDescribed(added, request.description);
    agreed = outcome.alertShown && request.responseWord == std::uintptr_t{0};
  }
  if (request.requestsAreIgnored) return outcome;
  if (!agreed) {
    outcome.error = accountsError(7);
    if (!request.record) outcome.record = record;
    return outcome;
  }
  record.granted = true;
  if (request.accounts == 0) {
    outcome.granted = true;
    record.permissions = held;
    record.permissions->insert(added.begin(), added.end());
    outcome.record = record;
    return outcome;
  }
  askTheServer(request, added, record, outcome);
  return outcome;
}

}  // namespace palisade::model
