#include "Cli/Commands.h"

#include <fmt/core.h>
#include <termios.h>
#include <unistd.h>

#include <charconv>
#include <csignal>
#include <iostream>

#include "Platform/AccountConstants.h"

namespace palisade {
namespace {

constexpr int yes = 0;
constexpr int no = 1;

termios shownSettings{};

void showAgain() { tcsetattr(STDIN_FILENO, TCSAFLUSH, &shownSettings); }

// Whoever is interrupted at the prompt finds the terminal as it was.
extern "C" void showAgainAndEnd(int signal) {
  showAgain();
  std::signal(signal, SIG_DFL);
  std::raise(signal);
}

// Reads one line without showing it.
std::string readSecretFromTerminal(std::string_view prompt) {
  tcgetattr(STDIN_FILENO, &shownSettings);
  for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT}) std::signal(signal, showAgainAndEnd);
  termios hidden = shownSettings;
  hidden.c_lflag &= ~static_cast<tcflag_t>(ECHO);
  tcsetattr(STDIN_FILENO, TCSAFLUSH, &hidden);
  fmt::print(stderr, "{}", prompt);
  std::string secret;
  std::getline(std::cin, secret);
  showAgain();
  for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT}) std::signal(signal, SIG_DFL);
  fmt::print(stderr, "\n");
  return secret;
}

std::string readToken() {
  if (isatty(STDIN_FILENO) == 1) return readSecretFromTerminal("The account's token (not shown): ");
  std::string token;
  std::getline(std::cin, token);
  return token;
}

std::string audienceValue(const std::string& word) {
  if (word == "everyone") return std::string(FacebookAudienceEveryone);
  if (word == "friends") return std::string(FacebookAudienceFriends);
  return std::string(FacebookAudienceOnlyMe);
}

// "true" and "false" are booleans, digits are numbers, everything else is text.
Value valueOfText(const std::string& text) {
  if (text == "true") return true;
  if (text == "false") return false;
  std::int64_t number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error == std::errc() && end == text.data() + text.size()) return number;
  return text;
}

int tellAnswer(const Output& output, const AccessAnswer& answer) {
  Dictionary object{{"granted", answer.response == AccessAnswer::Response::granted}};
  for (const auto& [key, value] : answer.results) object.set(key, value);
  const std::string reason = shown(answer.results.find("error_message"));
  const bool isNobodyAsked = shown(answer.results.find("error_domain")).ends_with(".NotAsked");
  switch (answer.response) {
    case AccessAnswer::Response::granted: output.say("Access is granted.", object); return yes;
    case AccessAnswer::Response::withdrawn:
      object.set("withdrawn", true);
      output.say(reason.empty() ? "Nobody answered. Nothing was recorded; ask again."
                                : (isNobodyAsked ? "Nobody was asked. " : "Nothing was granted. ") + reason,
                 object);
      return no;
    default: output.say(reason.empty() ? "Access is refused." : "Access is refused: " + reason, object); return no;
  }
}

void tellToAnswer() { fmt::print(stderr, "The user is being asked, or a server. Ctrl-C withdraws the request.\n"); }

}  // namespace

int listAccounts(AccountsClient& client, const Output& output, const std::string& accountType) {
  output.list(client.listAccounts(accountType), {{"ID", "id"}, {"USER", "username"}, {"TYPE", "account_type"}},
              "There are no accounts. `palisade account add USER` adds one.");
  return yes;
}

int addAccount(AccountsClient& client, const Output& output, const std::string& accountType, const std::string& username) {
  const std::string token = readToken();
  if (token.empty())
    throw std::runtime_error("There is no token on standard input. Try: palisade account add USER < token-file");
  const std::string id = client.addAccount(accountType, username, token);
  output.say(fmt::format("Added account {} for {}.", id, username), {{"id", id}});
  return yes;
}

int removeAccount(AccountsClient& client, const Output& output, const std::string& id) {
  client.removeAccount(id);
  output.say(fmt::format("Removed account {}.", id), {{"removed", id}});
  return yes;
}

int requestAccess(AccountsClient& client, const Output& output, const std::string& accountType,
                  const AccessRequestArguments& arguments) {
  Dictionary options{{std::string(FacebookAppIdKey), arguments.appID}};
  if (!arguments.permissions.empty()) {
    options.set(std::string(FacebookPermissionsKey), Array(arguments.permissions.begin(), arguments.permissions.end()));
  }
  if (!arguments.audience.empty()) options.set(std::string(FacebookAudienceKey), audienceValue(arguments.audience));
  return tellAnswer(output, client.requestAccess(accountType, options, tellToAnswer));
}

int printToken(AccountsClient& client, const Output& output, const std::string& accountType) {
  const std::string token = client.credential(accountType);
  output.say(token, {{"token", token}});
  return yes;
}

int listGrants(AccountsClient& client, const Output& output, const std::string& accountType) {
  output.list(client.listGrants(accountType),
              {{"CLIENT", "client"},
               {"NAME", "name"},
               {"GRANTED", "granted", Column::Kind::yesNo},
               {"PERMISSIONS", "permissions"},
               {"AUDIENCE", "audience"},
               {"CHANGED", "changed", Column::Kind::time}},
              "No application has asked yet.");
  return yes;
}

int revoke(AccountsClient& client, const Output& output, const std::string& accountType,
           const std::optional<std::string>& who) {
  if (who) {
    client.revoke(accountType, *who);
    output.say(fmt::format("Revoked access of {}.", *who), {{"revoked", *who}});
  } else {
    client.revokeAll(accountType);
    output.say("Revoked access of every application.", {{"revoked", "all"}});
  }
  return yes;
}

int authorize(AccountsClient& client, const Output& output, const std::string& accountType, const std::string& who) {
  return tellAnswer(output, client.authorize(accountType, who, [] {}));
}

int showHistory(AccountsClient& client, const Output& output, unsigned limit, const std::optional<std::string>& who) {
  output.list(client.history(limit, who),
              {{"FIRST", "first", Column::Kind::time},
               {"LAST", "last", Column::Kind::time},
               {"TIMES", "count"},
               {"CLIENT", "client"},
               {"GRANTED", "granted", Column::Kind::yesNo},
               {"ASKED", "prompted", Column::Kind::yesNo}},
              "Nothing has been decided yet.");
  return yes;
}

int showRevocations(AccountsClient& client, const Output& output) {
  output.list(client.listRevocations(),
              {{"APP", "app_id"},
               {"STATE", "state"},
               {"ATTEMPTS", "attempts"},
               {"REQUESTED", "requested", Column::Kind::time},
               {"NEXT", "next_attempt", Column::Kind::time},
               {"TROUBLE", "last_error"}},
              "No token has been taken back yet.");
  return yes;
}

int listClients(AccountsClient& client, const Output& output) {
  output.list(
      client.listClients(),
      {{"BUNDLE ID", "bundle_id"}, {"NAME", "name"}, {"CLASS", "class"}, {"ENTITLEMENTS", "entitlements"}, {"FILE", "file"}},
      "There are no client records. They stand in $XDG_DATA_HOME/palisade/clients and /usr/share/palisade/clients; "
      "man palisade-clients says what is in them.");
  return yes;
}

int getPreference(AccountsClient& client, const Output& output, const std::string& domain, const std::string& key) {
  const auto value = client.preference(domain, key);
  if (!value) {
    output.say(fmt::format("{} is not set.", key), {});
    return no;
  }
  output.say(shown(&*value), {{"value", *value}});
  return yes;
}

int setPreference(AccountsClient& client, const Output& output, const std::string& domain, const std::string& key,
                  const std::optional<std::string>& value) {
  client.setPreference(domain, key, value ? std::optional(valueOfText(*value)) : std::nullopt);
  output.say(value ? fmt::format("{} is {} now.", key, *value) : fmt::format("{} is not set any more.", key), {{"set", key}});
  return yes;
}

int notify(AccountsClient& client, const Output& output, const std::string& name) {
  client.notify(name);
  output.say(fmt::format("Posted {}.", name), {{"posted", name}});
  return yes;
}

}  // namespace palisade
