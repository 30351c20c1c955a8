// palisade: the command line for people, administrators and scripts.

#include <CLI/CLI.hpp>
#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <stdexcept>
#include <string>

#include "Cli/Commands.h"
#include "Cli/Doctor.h"
#include "Host/Text/PrintableText.h"
#include "Host/Text/ValidText.h"
#include "Platform/AccountConstants.h"

namespace {

using palisade::AccountsClient;

constexpr int no = 1;
constexpr int error = 2;

/// What the words of a command line are read into.
struct Arguments {
  palisade::Output output;
  std::string accountType{palisade::AccountTypeIdentifierFacebook};
  std::string domain{palisade::FacebookPreferencesAppID};
  std::string subject;
  std::string key;
  std::optional<std::string> value;
  std::optional<std::string> who;
  unsigned limit = 100;
  bool isAll = false;
  palisade::AccessRequestArguments request;
  /// Carried out when the whole line has been understood.
  std::function<int()> command;

  auto call(std::function<int(AccountsClient&)> function) {
    return [this, function] {
      command = [function] {
        AccountsClient client;
        return function(client);
      };
    };
  }
};

constexpr const char* generalHelp =
    "Exit status: 0 yes, 1 no, 2 error.\n\n"
    "Examples:\n"
    "  palisade account add ada < token-file\n"
    "  palisade request --app 1234567890 --permission email --permission publish_actions --audience friends\n"
    "  palisade grants --json\n"
    "  palisade revoke org.example.photos\n\n"
    "`palisade COMMAND --help` says more about a command. --json, --color and --type may stand behind it as well.";

CLI::App* add(CLI::App& parent, const char* name, const char* purpose, const char* help) {
  auto* command = parent.add_subcommand(name, purpose);
  command->footer(help);
  return command;
}

void addGeneralOptions(CLI::App& app, Arguments& arguments) {
  app.set_version_flag("--version", "palisade " PALISADE_VERSION, "Show the version");
  app.add_flag_callback(
      "--json", [&] { arguments.output.setJson(true); }, "Print JSON, also of an error");
  app.add_option_function<std::string>(
         "--color",
         [&](const std::string& when) {
           arguments.output.setColour(when == "always"  ? palisade::Colour::always
                                      : when == "never" ? palisade::Colour::never
                                                        : palisade::Colour::automatic);
         },
         "auto, always or never")
      ->check(CLI::IsMember({"auto", "always", "never"}));
  app.add_option("--type", arguments.accountType, "The account type")->capture_default_str();
}

void addAccountCommands(CLI::App& app, Arguments& arguments) {
  auto* account =
      add(app, "account", "Add, list and remove accounts", "`palisade account add --help` says how a token is given.");
  account->require_subcommand(1);
  add(*account, "list", "List the accounts of the type that --type names", "The ID is what `palisade account remove` takes.")
      ->callback(arguments.call(
          [&](AccountsClient& client) { return listAccounts(client, arguments.output, arguments.accountType); }));

  auto* adding =
      add(*account, "add", "Add an account; its token is read from standard input",
          "The token is one line of standard input, or what is typed at a prompt that does not show it. It goes into\n"
          "the keychain.\n\n"
          "Example: palisade account add ada < token-file");
  adding->add_option("USER", arguments.subject, "The user's name at the server")->required();
  adding->callback(arguments.call(
      [&](AccountsClient& client) { return addAccount(client, arguments.output, arguments.accountType, arguments.subject); }));

  auto* removing = add(*account, "remove", "Remove an account, and what was granted on it",
                       "What was granted is taken back at the server too; `palisade revocations` shows how far that is.");
  removing->add_option("ID", arguments.subject, "As `palisade account list` shows it")->required();
  removing->callback(
      arguments.call([&](AccountsClient& client) { return removeAccount(client, arguments.output, arguments.subject); }));
}

void addApplicationCommands(CLI::App& app, Arguments& arguments) {
  auto* ask =
      add(app, "request", "Ask for access, as the application that runs this",
          "Which application asks is taken from the process that runs the command; `palisade clients` lists those that are\n"
          "known. Without --permission it asks for the basic profile. Permissions to publish need an --audience.\n"
          "Waits for the user; Ctrl-C withdraws the request. Exit status: 0 granted, 1 not, 2 error.\n\n"
          "Example: palisade request --app 1234567890 --permission email --permission user_photos");
  ask->add_option("--app", arguments.request.appID, "The application's Facebook app ID")->required();
  ask->add_option("--permission", arguments.request.permissions, "A permission; may be given several times")
      ->allow_extra_args(false);
  ask->add_option("--audience", arguments.request.audience, "Who may see what the application posts")
      ->check(CLI::IsMember({"everyone", "friends", "only-me"}));
  ask->callback(arguments.call([&](AccountsClient& client) {
    return requestAccess(client, arguments.output, arguments.accountType, arguments.request);
  }));

  add(app, "token", "Print the application's own token",
      "For the application that runs it, while its grant stands. Hand the token on by a pipe, never as an argument:\n"
      "  palisade token | my-program --token-from-stdin\n"
      "Exit status: 0 printed, 1 not granted, 2 error.")
      ->callback(
          arguments.call([&](AccountsClient& client) { return printToken(client, arguments.output, arguments.accountType); }));
}

void addGrantCommands(CLI::App& app, Arguments& arguments) {
  add(app, "grants", "List what was granted and refused", "The CLIENT column holds what `palisade revoke` takes.")
      ->callback(
          arguments.call([&](AccountsClient& client) { return listGrants(client, arguments.output, arguments.accountType); }));

  auto* takeBack =
      add(app, "revoke", "Take back what a client was granted",
          "The application's token is removed at once and made invalid at the server as soon as that can be reached;\n"
          "`palisade revocations` shows how far that is.\n\n"
          "Example: palisade revoke org.example.photos");
  auto* client = takeBack->add_option("CLIENT", arguments.who, "As `palisade grants` shows it");
  takeBack->add_flag("--all", arguments.isAll, "Every client")->excludes(client);
  takeBack->callback([&] {
    if (!arguments.who && !arguments.isAll) throw CLI::RequiredError("CLIENT or --all");
    arguments.call(
        [&](AccountsClient& accounts) { return revoke(accounts, arguments.output, arguments.accountType, arguments.who); })();
  });

  auto* grant = add(app, "authorize", "Grant a client access without asking",
                    "Grants anew what the client's earlier record says; a client that never asked has none.\n"
                    "Exit status: 0 granted, 1 not, 2 error.");
  grant->add_option("CLIENT", arguments.subject, "As `palisade clients` shows it")->required();
  grant->callback(arguments.call([&](AccountsClient& accounts) {
    return authorize(accounts, arguments.output, arguments.accountType, arguments.subject);
  }));
}

void addRecordCommands(CLI::App& app, Arguments& arguments) {
  auto* history =
      add(app, "history", "Show what was decided, newest first",
          "ASKED says whether the user was asked. Example: palisade history --client org.example.photos --limit 10");
  history->add_option("--limit", arguments.limit, "How many decisions")->capture_default_str();
  history->add_option("--client", arguments.who, "Of this bundle ID only");
  history->callback(arguments.call(
      [&](AccountsClient& accounts) { return showHistory(accounts, arguments.output, arguments.limit, arguments.who); }));

  add(app, "revocations", "Show which tokens the server has yet to make invalid, and which it has",
      "STATE is pending, confirmed or refused; a pending one is tried again at NEXT.")
      ->callback(arguments.call([&](AccountsClient& accounts) { return showRevocations(accounts, arguments.output); }));
  add(app, "clients", "List the client records",
      "Applications are known by files in $XDG_DATA_HOME/palisade/clients and /usr/share/palisade/clients; man "
      "palisade-clients says\n"
      "what stands in them.")
      ->callback(arguments.call([&](AccountsClient& accounts) { return listClients(accounts, arguments.output); }));
}

void addSettingCommands(CLI::App& app, Arguments& arguments) {
  auto* preferences = add(app, "preferences", "Read and change preferences",
                          "Examples:\n"
                          "  palisade preferences get FacebookIgnoreAccessRequests\n"
                          "  palisade preferences set FacebookIgnoreAccessRequests true");
  preferences->require_subcommand(1);
  preferences->add_option("--domain", arguments.domain, "The preferences domain")->capture_default_str();
  auto* get =
      add(*preferences, "get", "Print a preference",
          "Exit status: 0 printed, 1 not set, 2 error. `palisade preferences --domain DOMAIN get KEY` reads another domain.");
  get->add_option("KEY", arguments.key, "The preference's name")->required();
  get->callback(arguments.call(
      [&](AccountsClient& accounts) { return getPreference(accounts, arguments.output, arguments.domain, arguments.key); }));
  auto* set = add(*preferences, "set", "Change a preference; without a value, remove it",
                  "Example: palisade preferences set FacebookIgnoreAccessRequests true");
  set->add_option("KEY", arguments.key, "The preference's name")->required();
  set->add_option("VALUE", arguments.value, "true, false, a number or a text");
  set->callback(arguments.call([&](AccountsClient& accounts) {
    return setPreference(accounts, arguments.output, arguments.domain, arguments.key, arguments.value);
  }));

  auto* post = add(app, "notify", "Post a notification", "Example: palisade notify FacebookEnvironmentDidChangeNotification");
  post->add_option("NAME", arguments.subject, "Its name")->required();
  post->callback(
      arguments.call([&](AccountsClient& accounts) { return notify(accounts, arguments.output, arguments.subject); }));

  add(app, "doctor", "Check what Palisade runs on, and say what to do",
      "A line for each check: ok, warn or fail, what was found, and what to do about it.\n"
      "Exit status: 0 all is well, 1 something is amiss, 2 something does not work.")
      ->callback([&] { arguments.command = [&] { return palisade::examine(arguments.output); }; });
}

int tellFailure(const palisade::Output& output, std::string_view name, const char* sentence) {
  if (output.isJson()) {
    output.say("", {{"error", name}, {"message", sentence}});
  } else {
    std::fprintf(stderr, "palisade: %s\n", palisade::printableText(sentence).c_str());
  }
  return name == "NotGranted" ? no : error;
}

// The bus carries no other text; said here, the sentence can name the argument.
void requireText(int argumentCount, char** argumentValues) {
  for (int place = 1; place < argumentCount; ++place) {
    if (palisade::isValidText(argumentValues[place])) continue;
    throw std::runtime_error("Argument " + std::to_string(place) + ", \"" + argumentValues[place] +
                             "\", is no text in UTF-8, or holds a character such as U+FFFF that is none.");
  }
}

}  // namespace

int main(int argumentCount, char** argumentValues) {
  // What is printed is UTF-8, and is measured as that wherever the locale does not know it.
  std::setlocale(LC_ALL, "");
  if (MB_CUR_MAX == 1) std::setlocale(LC_CTYPE, "C.UTF-8");

  Arguments arguments;
  CLI::App app("Accounts of this user, and the applications that may use them.", "palisade");
  app.require_subcommand(1);
  app.fallthrough();
  app.footer(generalHelp);
  addGeneralOptions(app, arguments);
  addAccountCommands(app, arguments);
  addApplicationCommands(app, arguments);
  addGrantCommands(app, arguments);
  addRecordCommands(app, arguments);
  addSettingCommands(app, arguments);

  try {
    requireText(argumentCount, argumentValues);
    app.parse(argumentCount, argumentValues);
    return arguments.command();
  } catch (const CLI::ParseError& problem) {
    return app.exit(problem) == 0 ? 0 : error;
  } catch (const palisade::CallFailed& failure) {
    return tellFailure(arguments.output, failure.name(), failure.what());
  } catch (const std::exception& failure) {
    return tellFailure(arguments.output, "Failed", failure.what());
  }
}
