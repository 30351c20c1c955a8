// vantad, the social daemon.

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <stdexcept>

#include "Host/Http/Environment.h"
#include "Host/Log/JournalLog.h"
#include "Host/Secrets/ProcessSecrecy.h"
#include "Host/Vantad/Vantad.h"

int main(int count, char** words) {
  using namespace palisade;
  constexpr int failure = 2;
  constexpr int notNeeded = 1;
  try {
    const VantadOptions options = parseVantadOptions(count, words);
    if (options.wantsHelp) {
      std::fputs(vantadHelp().c_str(), stdout);
      return EXIT_SUCCESS;
    }
    forgetNetworkEnvironment();
    dropDumpable();
    JournalLog log(options.isVerbose ? LogLevel::debug : LogLevel::notice, nullptr);
    Vantad(options, log).run();
    return EXIT_SUCCESS;
  } catch (const AlreadyRunning& error) {
    std::fprintf(stderr, "vantad: %s It runs already.\n", error.what());
    return notNeeded;
  } catch (const std::invalid_argument& error) {
    std::fprintf(stderr, "vantad: %s Try vantad --help.\n", error.what());
  } catch (const std::exception& error) {
    std::fprintf(stderr, "vantad: %s\n", error.what());
  }
  return failure;
}
