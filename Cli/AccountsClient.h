#pragma once

/// The account daemon as the command line sees it: calls over the session bus.
///
/// Threads: one. Ownership: owns its connection. Errors: `CallFailed` with a sentence that says what to do next.

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "Platform/Value.h"

namespace palisade {

class CallFailed : public std::runtime_error {
 public:
  CallFailed(std::string name, const std::string& message) : std::runtime_error(message), _name(std::move(name)) {}

  /// The last element of the D-Bus error's name: "NotGranted", say.
  const std::string& name() const { return _name; }

 private:
  std::string _name;
};

using Rows = std::vector<Dictionary>;

struct AccessAnswer {
  enum class Response : std::uint32_t { granted = 0, refused = 1, withdrawn = 2, pending = 3 };
  Response response = Response::refused;
  /// "error_domain", "error_code", "error_message", where there is an error.
  Dictionary results;
};

/// Of a program that is known by a name on the bus.
enum class ServiceState { runs, canBeStarted, unknown };

class AccountsClient {
 public:
  AccountsClient();
  ~AccountsClient();

  AccountsClient(const AccountsClient&) = delete;
  AccountsClient& operator=(const AccountsClient&) = delete;

  /// `whenPending` is called once if the user has to be asked.
  AccessAnswer requestAccess(const std::string& accountType, const Dictionary& accessOptions,
                             const std::function<void()>& whenPending);
  AccessAnswer authorize(const std::string& accountType, const std::string& client, const std::function<void()>& whenPending);

  std::string credential(const std::string& accountType);
  Rows listAccounts(const std::string& accountType);
  std::string addAccount(const std::string& accountType, const std::string& username, const std::string& token);
  void removeAccount(const std::string& id);
  Rows listGrants(const std::string& accountType);
  void revoke(const std::string& accountType, const std::string& client);
  void revokeAll(const std::string& accountType);
  Rows history(std::uint32_t limit, const std::optional<std::string>& client);
  Rows listRevocations();
  Rows listClients();
  std::optional<Value> preference(const std::string& domain, const std::string& key);
  void setPreference(const std::string& domain, const std::string& key, const std::optional<Value>& value);
  Dictionary status();
  ServiceState serviceState(const std::string& busName);

  /// Posts a notification to whoever listens.
  void notify(const std::string& name);

 private:
  class Bus;
  std::unique_ptr<Bus> _bus;
};

}  // namespace palisade
