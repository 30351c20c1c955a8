#pragma once

/// Decides whether a client application may use the user's calendar: asks once, keeps the answer, takes it back when told to.
///
/// Threads: every operation may be called on any thread, several at a time; the object holds nothing of its own. A question
/// blocks the calling thread until the user has answered. Completions run on that thread before the operation returns.
/// Ownership: made by the module's entry point and shared.
/// Errors: a refusal is `AccountsErrorAccessDenied`, a missing account `AccountsErrorAccountNotFound`; the store's errors are
/// passed on. A service that throws is answered with `AccountsErrorUnexpectedFailure`.

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "Platform/AccountAccessPlugin.h"

namespace palisade::example {

inline constexpr std::string_view AccountTypeIdentifierCalendar = "org.example.accounttype.calendar";

class CalendarAccessPlugin final : public AccountAccessPlugin {
 public:
  /// Throws `std::invalid_argument` when the base class refuses the services.
  explicit CalendarAccessPlugin(const PlatformServices& services) : AccountAccessPlugin(services) {}

  /// The calendar has no permissions of its own, so `withOptions` is not read.
  void handleAccessRequestToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                           std::shared_ptr<const Client> forClient,
                                           std::shared_ptr<const Dictionary> withOptions, std::shared_ptr<AccountStore> store,
                                           bool allowUserInteraction, AccessCompletion completion) override;
  void authorizeAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType, std::shared_ptr<const Client> forClient,
                                       std::shared_ptr<AccountStore> store, AccessCompletion completion) override;
  void revokeAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType, std::shared_ptr<const Client> forClient,
                                    std::shared_ptr<AccountStore> store, AccessCompletion completion) override;
  void revokeAllAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType, std::shared_ptr<AccountStore> store,
                                       AccessCompletion withCompletion) override;

 private:
  struct Answer {
    bool isGranted = false;
    std::optional<Error> error;
  };
  static Answer granted() { return {.isGranted = true, .error = std::nullopt}; }
  static Answer refused(std::optional<Error> error) { return {.isGranted = false, .error = std::move(error)}; }

  /// Calls the completion once: with what `decide` answers, or with a refusal when it throws.
  void complete(const AccessCompletion& completion, const std::function<Answer()>& decide) const;

  /// Whether the user allows access; none when nobody answered.
  std::optional<bool> askUser(const Client& client) const;

  /// Makes `isGranted` the client's record. Answers the store's error, or none when the record is stored.
  std::optional<Error> record(bool isGranted, bool userPrompted, const AccountType& accountType,
                              const std::shared_ptr<const Client>& client, AccountStore& store) const;

  std::string text(std::string_view key) const;
};

}  // namespace palisade::example
