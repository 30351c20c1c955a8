// palisade: the command line for people, administrators and scripts.

#include <CLI/CLI.hpp>
#include <clocale>
#include <cstdio>
#include <functional>

#include "Cli/Commands.h"
#include "Platform/AccountConstants.h"

namespace {

using palisade::AccountsClient;

constexpr int error = 2;

}  // namespace

int main(int argumentCount, char** arguments) {
  std::setlocale(LC_ALL, "");
  palisade::Output output;
  std::string accountType(palisade::AccountTypeIdentifierFacebook);
  std::string domain(palisade::FacebookPreferencesAppID);
  std::string subject;
  std::string key;
  std::optional<std::string> value;
  std::optional<std::string> who;
  unsigned limit = 100;
  bool isAll = false;
  palisade::AccessRequestArguments request;
  std::function<int()> command;

  // The daemon is called when the whole line has been understood.
  const auto calls = [&](auto function) {
    return [&command, function] {
      command = [function] {
        AccountsClient client;
        return function(client);
      };
    };
  };

  CLI::App app("Accounts of this user, and the applications that may use them.", "palisade");
  app.require_subcommand(1);
  app.fallthrough();
  app.set_version_flag("--version", "palisade " PALISADE_VERSION);
  app.add_flag_callback(
      "--json", [&] { output.setJson(true); }, "Print JSON");
  app.add_option_function<std::string>(
         "--color",
         [&](const std::string& when) {
           output.setColour(when == "always"  ? palisade::Colour::always
                            : when == "never" ? palisade::Colour::never
                                              : palisade::Colour::automatic);
         },
         "auto, always or never")
      ->check(CLI::IsMember({"auto", "always", "never"}));
  app.add_option("--type", accountType, "The account type")->capture_default_str();
  app.footer(
      "Exit status: 0 yes, 1 no, 2 error.\n\n"
      "Examples:\n"
      "  palisade account add ada < token-file\n"
      "  palisade request --app 1234567890 --permission email --permission publish_actions --audience friends\n"
      "  palisade grants --json\n"
      "  palisade revoke org.example.photos");

  auto* account = app.add_subcommand("account", "Add, list and remove accounts")->require_subcommand(1);
  account->add_subcommand("list", "List the accounts")->callback(calls([&](AccountsClient& client) {
    return listAccounts(client, output, accountType);
  }));
  auto* add = account->add_subcommand("add", "Add an account; its token is read from standard input");
  add->add_option("USER", subject, "The user's name at the server")->required();
  add->callback(calls([&](AccountsClient& client) { return addAccount(client, output, accountType, subject); }));
  auto* remove = account->add_subcommand("remove", "Remove an account, and what was granted on it");
  remove->add_option("ID", subject, "As `palisade account list` shows it")->required();
  remove->callback(calls([&](AccountsClient& client) { return removeAccount(client, output, subject); }));

  auto* ask = app.add_subcommand("request", "Ask for access, as the application that runs this");
  ask->add_option("--app", request.appID, "The application's Facebook app ID")->required();
  ask->add_option("--permission", request.permissions, "A permission; may be given several times");
  ask->add_option("--audience", request.audience, "Who may see what the application posts")
      ->check(CLI::IsMember({"everyone", "friends", "only-me"}));
  ask->callback(calls([&](AccountsClient& client) { return requestAccess(client, output, accountType, request); }));
  app.add_subcommand("token", "Print the application's own token")->callback(calls([&](AccountsClient& client) {
    return printToken(client, output, accountType);
  }));

  app.add_subcommand("grants", "List what was granted and refused")->callback(calls([&](AccountsClient& client) {
    return listGrants(client, output, accountType);
  }));
  auto* takeBack = app.add_subcommand("revoke", "Take back what a client was granted");
  auto* client = takeBack->add_option("CLIENT", who, "As `palisade grants` shows it");
  takeBack->add_flag("--all", isAll, "Every client")->excludes(client);
  takeBack->callback([&] {
    if (!who && !isAll) throw CLI::RequiredError("CLIENT or --all");
    calls([&](AccountsClient& accounts) { return revoke(accounts, output, accountType, who); })();
  });
  auto* grant = app.add_subcommand("authorize", "Grant a client access without asking");
  grant->add_option("CLIENT", subject, "As `palisade clients` shows it")->required();
  grant->callback(calls([&](AccountsClient& accounts) { return authorize(accounts, output, accountType, subject); }));

  auto* history = app.add_subcommand("history", "Show what was decided, newest first");
  history->add_option("--limit", limit, "How many decisions")->capture_default_str();
  history->add_option("--client", who, "Of this bundle ID only");
  history->callback(calls([&](AccountsClient& accounts) { return showHistory(accounts, output, limit, who); }));
  app.add_subcommand("revocations", "Show which tokens the server has yet to make invalid")
      ->callback(calls([&](AccountsClient& accounts) { return showRevocations(accounts, output); }));
  app.add_subcommand("clients", "List the client records")->callback(calls([&](AccountsClient& accounts) {
    return listClients(accounts, output);
  }));

  auto* preferences = app.add_subcommand("preferences", "Read and change preferences")->require_subcommand(1);
  preferences->add_option("--domain", domain, "The preferences domain")->capture_default_str();
  auto* get = preferences->add_subcommand("get", "Print a preference");
  get->add_option("KEY", key)->required();
  get->callback(calls([&](AccountsClient& accounts) { return getPreference(accounts, output, domain, key); }));
  auto* set = preferences->add_subcommand("set", "Change a preference; without a value, remove it");
  set->add_option("KEY", key)->required();
  set->add_option("VALUE", value, "true, false, a number or a text");
  set->callback(calls([&](AccountsClient& accounts) { return setPreference(accounts, output, domain, key, value); }));
  auto* post = app.add_subcommand("notify", "Post a notification");
  post->add_option("NAME", subject, "Its name, such as FacebookEnvironmentDidChangeNotification")->required();
  post->callback(calls([&](AccountsClient& accounts) { return notify(accounts, output, subject); }));
  app.add_subcommand("doctor", "Check what Palisade runs on, and say what to do")->callback([&] {
    command = [&] { return examine(output); };
  });

  try {
    app.parse(argumentCount, arguments);
    return command();
  } catch (const CLI::ParseError& problem) {
    return app.exit(problem) == 0 ? 0 : error;
  } catch (const std::exception& failure) {
    std::fprintf(stderr, "palisade: %s\n", failure.what());
    return error;
  }
}
