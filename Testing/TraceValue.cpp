#include "Testing/TraceValue.h"

#include <algorithm>
#include <utility>
#include <vector>

#include "Testing/FakeAccount.h"
#include "Testing/FakeClient.h"

namespace palisade {
namespace {

Value tagged(const char* tag, Value content) { return Dictionary{{tag, std::move(content)}}; }

}  // namespace

Value traceText(const std::optional<std::string>& text) { return text ? Value(*text) : Value(); }

Value traceSet(const PermissionSetRef& permissions) {
  if (permissions == nullptr) return {};
  std::vector<std::string> names(permissions->begin(), permissions->end());
  std::ranges::sort(names);
  return tagged("$set", Array(names.begin(), names.end()));
}

Value traceError(const std::optional<Error>& error) {
  if (!error) return {};
  return tagged("$error",
                Dictionary{{"domain", error->domain}, {"code", error->code}, {"description", traceText(error->description)}});
}

Value traceClient(const Client* client) { return client == nullptr ? Value() : tagged("$client", FakeClient::idOf(*client)); }

Value traceAccount(const Account* account) {
  return account == nullptr ? Value() : tagged("$account", FakeAccount::idOf(*account));
}

Value traceValue(const Value& value) {
  if (value.isNull()) return tagged("$null", true);
  if (const Array* array = value.array()) {
    Array elements;
    std::ranges::transform(*array, std::back_inserter(elements), traceValue);
    return elements;
  }
  if (const Dictionary* dictionary = value.dictionary()) {
    Dictionary entries;
    for (const auto& [key, entry] : *dictionary) entries.set(key, traceValue(entry));
    return entries;
  }
  return value;
}

Value traceDictionary(const std::shared_ptr<const Dictionary>& dictionary) {
  return dictionary == nullptr ? Value() : traceValue(Value(*dictionary));
}

Value traceCredential(const std::shared_ptr<const AccountCredential>& credential) {
  if (credential == nullptr) return {};
  const Date expiry = credential->expiryDate();
  const Value expiryDate =
      expiry == distantFuture ? Value("distantFuture") : Value(std::int64_t{expiry.time_since_epoch().count()});
  return Dictionary{
      {"token", traceText(credential->oauthToken())}, {"refreshToken", credential->refreshToken()}, {"expiryDate", expiryDate}};
}

Value traceRecord(const ClientAuthorization& record) {
  return Dictionary{{"client", traceClient(record.client().get())},
                    {"granted", record.isGranted()},
                    {"options", traceDictionary(record.options())},
                    {"permissions", traceSet(record.grantedPermissions())}};
}

}  // namespace palisade
