// palisade-story: shows on one screen what the plug-in decides, with the person at the terminal as its user.

#include <unistd.h>

#include <exception>
#include <filesystem>
#include <iostream>
#include <string_view>

#include "Host/Alert/TerminalAlert.h"
#include "Tools/Story/AnnouncedAnswer.h"
#include "Tools/Story/Story.h"

namespace {

constexpr std::string_view help = R"(Usage: palisade-story [--answer allow|refuse] [MODULE]

Loads a plug-in module and carries a request for access through it, from the client's options to the stored grant.

With a terminal the question comes to you: Tab chooses a button, Return presses it, Escape closes the alert.
Without one, or with --answer, the program announces an answer and gives it.

MODULE is the plug-in beside this program when it is left out.
)";

std::filesystem::path moduleBesideThisProgram() {
  const auto program = std::filesystem::read_symlink("/proc/self/exe");
  return program.parent_path().parent_path() / "plugins/VXFacebookAccountAccessPlugin/VXFacebookAccountAccessPlugin.so";
}

int usageError(std::string_view problem) {
  std::cerr << "palisade-story: " << problem << " Try palisade-story --help.\n";
  return 2;
}

}  // namespace

int main(int argumentCount, char** arguments) {
  std::filesystem::path module;
  palisade::TerminalAlert terminal({.terminal = "/dev/tty"});
  bool asksUser = terminal.isAvailable() && isatty(STDOUT_FILENO) == 1;
  bool allows = true;

  for (int index = 1; index < argumentCount; ++index) {
    const std::string_view argument = arguments[index];
    if (argument == "-h" || argument == "--help") {
      std::cout << help;
      return 0;
    }
    if (argument == "--answer") {
      const std::string_view answer = index + 1 < argumentCount ? arguments[++index] : "";
      if (answer != "allow" && answer != "refuse") return usageError("--answer takes 'allow' or 'refuse'.");
      asksUser = false;
      allows = answer == "allow";
    } else if (argument.starts_with('-')) {
      return usageError("There is no option " + std::string(argument) + ".");
    } else {
      module = argument;
    }
  }

  try {
    if (module.empty()) module = moduleBesideThisProgram();
    palisade::AnnouncedAnswer announced(std::cout, allows);
    if (asksUser) {
      palisade::tellStory(module, terminal, std::cout);
    } else {
      palisade::tellStory(module, announced, std::cout);
    }
    return 0;
  } catch (const std::exception& failure) {
    std::cerr << "palisade-story: " << failure.what() << '\n';
    return 2;
  }
}
