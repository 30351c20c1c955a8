#include "Tools/PluginReplay/ScenarioReader.h"

#include <algorithm>
#include <utility>

#include "Platform/AccountConstants.h"
#include "Tools/PluginReplay/AnswerReader.h"
#include "Tools/PluginReplay/ConstantNames.h"

namespace palisade {
namespace {

std::string identifier(const JsonPlace& place) { return constantValue(place.text()); }

std::optional<std::string> textOrNull(const JsonObject& object, std::string_view member) {
  const auto place = object.findValue(member);
  return place ? std::optional(place->text()) : std::nullopt;
}

FakeClientData readClient(const std::string& id, const JsonPlace& place) {
  const JsonObject object = place.object({"bundleID", "appName", "description", "entitlements"});
  FakeClientData client{.id = id, .bundleID = textOrNull(object, "bundleID"), .appName = id, .description = id};
  if (const auto appName = object.find("appName")) client.appName = appName->text();
  if (const auto description = object.find("description")) client.description = description->text();
  if (const auto entitlements = object.find("entitlements")) {
    for (const JsonPlace& entitlement : entitlements->elements()) client.entitlements.push_back(identifier(entitlement));
  }
  return client;
}

FakeAccountData readAccount(const JsonPlace& place, const std::string& usualType) {
  const JsonObject object = place.object({"id", "type", "description"});
  const std::string id = object.require("id").text();
  FakeAccountData account{.id = id, .type = usualType, .description = id};
  if (const auto type = object.find("type")) account.type = identifier(*type);
  if (const auto description = object.find("description")) account.description = description->text();
  return account;
}

ScenarioCredential readCredential(const JsonPlace& place) {
  const JsonObject object = place.object({"account", "clientID", "oauthToken"});
  return {.accountID = object.require("account").text(),
          .clientID = textOrNull(object, "clientID"),
          .oauthToken = textOrNull(object, "oauthToken")};
}

// Constants are known at the top level alone: a client's keys, and the text that is its audience.
std::shared_ptr<const Dictionary> readOptions(const std::optional<JsonPlace>& place) {
  if (!place) return nullptr;
  Dictionary options;
  for (const auto& [name, entry] : place->entries()) {
    const std::string key = constantValue(name);
    const bool isAudience = key == FacebookAudienceKey && entry.value().string() != nullptr;
    options.set(key, isAudience ? Value(identifier(entry)) : entry.value());
  }
  return std::make_shared<const Dictionary>(std::move(options));
}

std::string readClientID(const JsonObject& object, const Scenario& scenario) {
  const JsonPlace place = object.require("client");
  const std::string& id = place.text();
  if (!scenario.clients.contains(id)) place.fail("no client \"" + id + "\" is defined");
  return id;
}

ScenarioRecord readRecord(const JsonPlace& place, const Scenario& scenario) {
  const JsonObject object = place.object({"client", "granted", "options", "permissions"});
  ScenarioRecord record{.clientID = readClientID(object, scenario),
                        .granted = object.require("granted").boolean(),
                        .options = readOptions(object.findValue("options")),
                        .permissions = nullptr};
  if (const auto permissions = object.findValue("permissions")) {
    PermissionSet names;
    for (const JsonPlace& permission : permissions->elements()) names.insert(permission.text());
    record.permissions = std::make_shared<const PermissionSet>(std::move(names));
  }
  return record;
}

ScenarioOperation readOperation(const JsonPlace& place, const Scenario& scenario) {
  // Which members an operation has depends on its name, so the name is looked for among all of them first.
  const JsonPlace name = place.object({"name", "identifier", "client", "options", "allowUserInteraction"}).require("name");
  const auto known = operationNamed(name.text());
  if (!known) name.fail("there is no operation \"" + name.text() + "\"");
  ScenarioOperation operation{.name = *known};
  switch (operation.name) {
    case OperationName::supportsAccountType:
      operation.identifier = identifier(place.object({"name", "identifier"}).require("identifier"));
      break;
    case OperationName::handleAccessRequest: {
      const JsonObject object = place.object({"name", "client", "options", "allowUserInteraction"});
      operation.clientID = readClientID(object, scenario);
      operation.options = readOptions(object.findValue("options"));
      if (const auto allowed = object.find("allowUserInteraction")) operation.allowUserInteraction = allowed->boolean();
      break;
    }
    case OperationName::authorizeAccess:
    case OperationName::revokeAccess: operation.clientID = readClientID(place.object({"name", "client"}), scenario); break;
    case OperationName::revokeAllAccess:
    case OperationName::environmentChange:
    case OperationName::newPlugin: place.object({"name"}); break;
  }
  return operation;
}

Value readPreference(const JsonPlace& place) {
  if (place.isNull()) place.fail("has to be a value; leave it out when there is none");
  return place.value();
}

}  // namespace

std::optional<std::string> scenarioID(const Value& document) {
  const Dictionary* scenario = document.dictionary();
  const Value* id = scenario == nullptr ? nullptr : scenario->find("id");
  return id == nullptr || id->string() == nullptr ? std::nullopt : std::optional(*id->string());
}

Scenario readScenario(const Value& document) {
  const JsonObject object = JsonPlace(document, "")
                                .object({"id", "clients", "accountType", "accounts", "keychain", "records", "storeErrors",
                                         "preference", "alert", "server", "strings", "operations"});
  Scenario scenario;
  const auto forEach = [&](std::string_view member, auto read) {
    if (const auto list = object.find(member)) std::ranges::for_each(list->elements(), read);
  };

  if (const auto id = object.find("id")) id->text();
  if (const auto clients = object.find("clients")) {
    for (const auto& [id, place] : clients->entries()) scenario.clients.emplace(id, readClient(id, place));
  }
  if (const auto type = object.find("accountType")) {
    scenario.accountType = identifier(type->object({"identifier"}).require("identifier"));
  }
  forEach("accounts", [&](const JsonPlace& place) { scenario.accounts.push_back(readAccount(place, scenario.accountType)); });
  forEach("keychain", [&](const JsonPlace& place) { scenario.keychain.push_back(readCredential(place)); });
  forEach("records", [&](const JsonPlace& place) { scenario.records.push_back(readRecord(place, scenario)); });
  forEach("storeErrors", [&](const JsonPlace& place) { scenario.storeErrors.push_back(readErrorOrNull(place)); });
  if (const auto preference = object.find("preference")) scenario.preference = readPreference(*preference);
  if (const auto alert = object.find("alert")) scenario.alertAnswers = readAlertAnswers(*alert);
  if (const auto server = object.find("server")) {
    const JsonObject answers = server->object({"authorization", "description"});
    if (const auto list = answers.find("authorization")) scenario.authorizationAnswers = readServerAnswers(*list);
    if (const auto list = answers.find("description")) scenario.descriptionAnswers = readServerAnswers(*list);
  }
  if (const auto strings = object.find("strings")) {
    for (const auto& [key, place] : strings->entries()) {
      scenario.strings[key] = place.isNull() ? std::nullopt : std::optional(place.text());
    }
  }
  for (const JsonPlace& place : object.require("operations").elements()) {
    scenario.operations.push_back(readOperation(place, scenario));
  }
  return scenario;
}

}  // namespace palisade
