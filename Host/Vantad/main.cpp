// vantad, the social daemon.

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <stdexcept>

#include "Host/Log/JournalLog.h"
#include "Host/Preferences/TomlFile.h"
#include "Host/Secrets/ProcessEnvironment.h"
#include "Host/Secrets/ProcessSecrecy.h"
#include "Host/Vantad/Vantad.h"

namespace {

using namespace palisade;

void serve(VantadOptions options) {
  dropDumpable();
  if (const auto table = readConfiguration(options.accountdConfiguration)) options.takeDefaultsFrom(*table);
  JournalLog log(options.logLevel.value_or(LogLevel::notice), nullptr);
  Vantad(options, log).run();
}

void run(const VantadOptions& options) {
  switch (options.request) {
    case VantadOptions::Request::help: std::fputs(vantadHelp().c_str(), stdout); break;
    case VantadOptions::Request::version: std::puts("vantad " PALISADE_VERSION); break;
    case VantadOptions::Request::serve: serve(options); break;
  }
}

}  // namespace

int main(int count, char** words) {
  constexpr int failure = 2;
  constexpr int notNeeded = 1;
  try {
    keepKnownEnvironment();
    run(parseVantadOptions(count, words));
    return EXIT_SUCCESS;
  } catch (const StateIsTaken& error) {
    std::fprintf(stderr, "vantad: %s\n", error.what());
    return notNeeded;
  } catch (const std::invalid_argument& error) {
    std::fprintf(stderr, "vantad: %s Try vantad --help.\n", error.what());
  } catch (const std::exception& error) {
    std::fprintf(stderr, "vantad: %s\n", error.what());
  }
  return failure;
}
