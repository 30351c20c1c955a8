#include "Host/Vantad/Vantad.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <csignal>
#include <limits>
#include <random>
#include <string>

#include "Host/Accounts/StoredAccount.h"
#include "Host/Keychain/VaultKeychain.h"
#include "Host/Preferences/TomlFile.h"
#include "Host/Secrets/Wipe.h"
#include "Host/Vantad/Departures.h"
#include "Platform/Log.h"

namespace palisade {
namespace {

constexpr auto settledAreShown = std::chrono::hours(24 * 90);
constexpr auto afterAFailure = std::chrono::minutes(1);
constexpr std::chrono::milliseconds noPatience(0);

// The signals are read from a descriptor, so no thread may have them delivered.
int openSignals() {
  sigset_t ends;
  sigemptyset(&ends);
  sigaddset(&ends, SIGTERM);
  sigaddset(&ends, SIGINT);
  pthread_sigmask(SIG_BLOCK, &ends, nullptr);
  return signalfd(-1, &ends, SFD_CLOEXEC);
}

int pollTimeout(const std::optional<std::chrono::milliseconds>& wait) {
  if (!wait) return -1;
  return static_cast<int>(std::clamp<std::int64_t>(wait->count(), 0, std::numeric_limits<int>::max()));
}

}  // namespace

Vantad::Vantad(const VantadOptions& options, Log& log)
    : _options(options),
      _log(log),
      _outbox({.path = _options.outbox()}),
      _lock(_options.state, "vantad", noPatience),
      _bus(socialDaemonBusName),
      _bell(Outbox::bellOf(_options.outbox())),
      _configurationFile(_options.configuration),
      _signals(openSignals()),
      _answers(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)),
      _keychain([vault = _options.vaultOptions()] { return std::make_unique<VaultKeychain>(vault); }) {}

Vantad::~Vantad() {
  close(_signals);
  close(_answers);
}

void Vantad::run() {
  _outbox.removeSettledBefore(presentMoment().date - settledAreShown);
  _log.record("Vantad::run", LogLevel::notice, "Serving %@ with %d pending invalidations.", "outbox, pending",
              _options.outbox().string(), _outbox.pending().size());
  while (serve(readConfiguration()) == Reason::configuration) {
    _log.record("Vantad::run", LogLevel::notice, "The configuration has changed.", "");
  }
}

ServerConfiguration Vantad::readConfiguration() {
  try {
    return ServerConfiguration(palisade::readConfiguration(_options.configuration).value_or(Dictionary()));
  } catch (const std::exception& error) {
    _log.record("Vantad::readConfiguration", LogLevel::error, "%@: %@ No server is asked until that is mended.", "path, reason",
                _options.configuration.string(), std::string_view(error.what()));
    return {};
  }
}

Vantad::Reason Vantad::serve(const ServerConfiguration& configuration) {
  const FacebookServer server(configuration);
  HttpClient http(configuration.httpOptions());
  std::minstd_rand generator(std::random_device{}());
  Courier courier({.outbox = _outbox,
                   .http = http,
                   .server = server,
                   .keychain = _keychain,
                   .json = _json,
                   .log = _log,
                   .account = [](const std::string& id) { return std::make_shared<StoredAccount>(id, "", ""); },
                   .onAnswer = [this] { eventfd_write(_answers, 1); },
                   .random = [&generator] { return std::generate_canonical<double, 32>(generator); }});
  while (true) {
    const auto wait = advance(courier);
    wipeDeadStack();
    std::array<pollfd, 6> events = {{{.fd = _signals, .events = POLLIN, .revents = 0},
                                     {.fd = _configurationFile.descriptor(), .events = POLLIN, .revents = 0},
                                     {.fd = _network.descriptor(), .events = POLLIN, .revents = 0},
                                     {.fd = _bell.descriptor(), .events = POLLIN, .revents = 0},
                                     {.fd = _answers, .events = POLLIN, .revents = 0},
                                     {.fd = _bus.descriptor(), .events = POLLIN, .revents = 0}}};
    poll(events.data(), events.size(), pollTimeout(wait));
    if (events[0].revents != 0 || !_bus.serve()) return Reason::end;
    if (_configurationFile.hasChanged()) return Reason::configuration;
    if (_network.hasImproved()) courier.hurry();
    _bell.hasChanged();
    eventfd_t count = 0;
    eventfd_read(_answers, &count);
  }
}

std::optional<std::chrono::milliseconds> Vantad::advance(Courier& courier) {
  try {
    const auto wait = courier.advance();
    removeTokensOfDepartedAccounts(_outbox, _keychain);
    return wait;
  } catch (const SqliteError& error) {
    _log.record("Vantad::advance", LogLevel::error, "%@", "error", std::string_view(error.what()));
    return afterAFailure;
  }
}

}  // namespace palisade
