// Asks once about the calendar and keeps the answer.
//
// A grant comes from the user, from an entitlement or from the daemon, never from a failure: every path that cannot finish ends
// in a refusal. What nobody answered is not recorded, so the next request asks again.

#include "CalendarAccessPlugin.h"

#include "Platform/AccountConstants.h"
#include "Platform/AccountStore.h"
#include "Platform/AccountType.h"
#include "Platform/AuthorizationManager.h"
#include "Platform/Client.h"
#include "Platform/ClientAuthorization.h"
#include "Platform/Format.h"
#include "Platform/Log.h"
#include "Platform/StringTable.h"
#include "Platform/SystemAlert.h"

namespace palisade::example {
namespace {

Error accountsError(AccountsErrorCode code, std::optional<std::string> description = std::nullopt) {
  return {.domain = std::string(AccountsErrorDomain), .code = code, .description = std::move(description)};
}

bool hasCalendar(const AccountType& accountType, AccountStore& store) {
  return !store.accountsWithAccountTypeIdentifier(accountType.identifier()).empty();
}

}  // namespace

void CalendarAccessPlugin::handleAccessRequestToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                                               std::shared_ptr<const Client> forClient,
                                                               std::shared_ptr<const Dictionary> /*withOptions*/,
                                                               std::shared_ptr<AccountStore> store, bool allowUserInteraction,
                                                               AccessCompletion completion) {
  complete(completion, [&]() -> Answer {
    if (forClient->hasEntitlement(AllAccountsAccessEntitlement)) return granted();
    if (!hasCalendar(*accountType, *store)) return refused(accountsError(AccountsErrorAccountNotFound));

    const auto earlier = store->authorizationManager().authorizationForClient(forClient, *accountType);
    if (earlier != nullptr && earlier->isGranted()) return granted();
    if (earlier != nullptr || !allowUserInteraction) return refused(accountsError(AccountsErrorAccessDenied));

    const auto isAllowed = askUser(*forClient);
    if (!isAllowed) return refused(accountsError(AccountsErrorAccessDenied));
    if (const auto failure = record(*isAllowed, true, *accountType, forClient, *store)) return refused(failure);
    return *isAllowed ? granted() : refused(accountsError(AccountsErrorAccessDenied));
  });
}

void CalendarAccessPlugin::authorizeAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                                           std::shared_ptr<const Client> forClient,
                                                           std::shared_ptr<AccountStore> store, AccessCompletion completion) {
  complete(completion, [&] {
    if (!hasCalendar(*accountType, *store)) return refused(accountsError(AccountsErrorAccountNotFound));
    const auto failure = record(true, false, *accountType, forClient, *store);
    return failure ? refused(failure) : granted();
  });
}

void CalendarAccessPlugin::revokeAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                                        std::shared_ptr<const Client> forClient,
                                                        std::shared_ptr<AccountStore> store, AccessCompletion completion) {
  complete(completion, [&] {
    if (store->authorizationManager().authorizationForClient(forClient, *accountType) == nullptr) return granted();
    // The record stays, as a refusal: an application that was sent away does not ask again by itself.
    const auto failure = record(false, false, *accountType, forClient, *store);
    return failure ? refused(failure) : granted();
  });
}

void CalendarAccessPlugin::revokeAllAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                                           std::shared_ptr<AccountStore> store,
                                                           AccessCompletion withCompletion) {
  complete(withCompletion, [&] {
    const auto failure = store->authorizationManager().removeAllClientAuthorizationsForAccountType(*accountType);
    return failure ? refused(failure) : granted();
  });
}

void CalendarAccessPlugin::complete(const AccessCompletion& completion, const std::function<Answer()>& decide) const {
  Answer answer = refused(accountsError(AccountsErrorUnexpectedFailure, "The calendar plug-in failed unexpectedly."));
  try {
    answer = decide();
  } catch (const std::exception& failure) {
    answer.error->description = failure.what();
  } catch (...) {
    // The refusal that `answer` began with says all that is known.
  }
  completion(answer.isGranted, answer.error);
}

std::optional<bool> CalendarAccessPlugin::askUser(const Client& client) const {
  constexpr double waitForEver = 0;
  const auto handle = alert().createAlert(AlertAllocator::defaultAllocator, waitForEver, AlertFlagsPlain, nullptr,
                                          {.header = text("CALENDAR_ACCESS_TITLE"),
                                           .message = formatText(text("CALENDAR_ACCESS_MESSAGE"), {client.localizedAppName()}),
                                           .alternateButtonTitle = text("CALENDAR_ACCESS_DO_NOT_ALLOW"),
                                           .defaultButtonTitle = text("CALENDAR_ACCESS_ALLOW"),
                                           .topMost = true,
                                           .dismissOnLock = true,
                                           .doNotDismissOnUnlock = true});
  AlertResponse response = AlertResponseNobody;
  try {
    alert().receiveResponse(handle, waitForEver, response);
  } catch (...) {
    if (handle != nullptr) alert().releaseAlert(handle);
    throw;
  }
  if (handle != nullptr) alert().releaseAlert(handle);

  if (response == AlertResponseNobody) return std::nullopt;
  return response == AlertResponseDefaultButton;
}

std::optional<Error> CalendarAccessPlugin::record(bool isGranted, bool userPrompted, const AccountType& accountType,
                                                  const std::shared_ptr<const Client>& client, AccountStore& store) const {
  ClientAuthorization authorization(client);
  authorization.setIsGranted(isGranted);
  auto failure = store.authorizationManager().setAuthorization(authorization, client, accountType);
  log().logAccessRequest({.accountTypeIdentifier = accountType.identifier(),
                          .bundleID = client->bundleID(),
                          .granted = isGranted && !failure,
                          .userPrompted = userPrompted});
  return failure;
}

// Each text is looked up when it is needed: the user may change the language at any time.
std::string CalendarAccessPlugin::text(std::string_view key) const { return strings().localizedString(key, "", "Localizable"); }

}  // namespace palisade::example
