#pragma once

/// How the platform's objects stand in a trace.
///
/// None is null and a null value is `{"$null": true}`, so that the two stay apart. A set is `{"$set": [sorted names]}`, a
/// client
/// `{"$client": ID}`, an account `{"$account": ID}`, an error `{"$error": {domain, code, description}}`.
/// Threads: all functions are pure. Errors: none.

#include <memory>
#include <optional>
#include <string>

#include "Platform/AccountCredential.h"
#include "Platform/ClientAuthorization.h"
#include "Platform/Error.h"
#include "Platform/PermissionSet.h"
#include "Platform/Value.h"

namespace palisade {

class Account;
class Client;

Value traceText(const std::optional<std::string>& text);
Value traceSet(const PermissionSetRef& permissions);
Value traceError(const std::optional<Error>& error);
Value traceClient(const Client* client);
Value traceAccount(const Account* account);

/// A value of a client's options, with every null below it written as a present one.
Value traceValue(const Value& value);
Value traceDictionary(const std::shared_ptr<const Dictionary>& dictionary);

/// `{token, refreshToken, expiryDate}`. The expiry is "distantFuture" or the seconds since the epoch.
Value traceCredential(const std::shared_ptr<const AccountCredential>& credential);

/// `{client, granted, options, permissions}`.
Value traceRecord(const ClientAuthorization& record);

}  // namespace palisade
