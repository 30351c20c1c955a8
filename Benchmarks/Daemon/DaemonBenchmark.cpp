// Measures the account daemon beside the least that a call over the same bus can cost. Runs inside a session of Tools/Trial.

#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "Benchmarks/Daemon/AccountsCalls.h"
#include "Benchmarks/Daemon/BusLoad.h"
#include "Benchmarks/Daemon/MeasuredDaemon.h"
#include "Benchmarks/Daemon/ServerExchange.h"
#include "Benchmarks/Daemon/StandingRequests.h"
#include "Host/Accounts/AccountStoreSchema.h"
#include "Host/Sqlite/Database.h"
#include "Host/Sqlite/Transaction.h"
#include "Host/Vantad/Outbox.h"

namespace palisade {
namespace {

constexpr int rounds = 5;
constexpr std::chrono::milliseconds roundLength{400};
constexpr const char* daemonProgram = "accountd";
constexpr const char* answeringDaemonProgram = "palisade-answering-accountd";

using Clock = std::chrono::steady_clock;

double median(std::vector<double> values) {
  std::ranges::sort(values);
  return values[values.size() / 2];
}

template <typename Work>
double microsecondsOf(const Work& work) {
  const auto start = Clock::now();
  work();
  return std::chrono::duration<double, std::micro>(Clock::now() - start).count();
}

struct Measurement {
  std::vector<Load> loads;

  double of(double Load::*figure) const {
    std::vector<double> values;
    for (const Load& load : loads) values.push_back(load.*figure);
    return median(values);
  }
};

struct Measured {
  const char* name;
  BusCall call;
  pid_t server;
  /// Times the echo, for the call and for the server's processor; 0 is no goal.
  double goal;
  double processorGoal;
};

std::string verdict(double figure, double goal) {
  char text[64] = "";
  if (goal > 0) std::snprintf(text, sizeof text, "at most %.1f: %s", goal, figure <= goal ? "met" : "missed");
  return text;
}

// Every call in turn, round by round, so that whatever else the machine does meets all of them.
void measureSideBySide(const std::vector<Measured>& all, int clients) {
  std::vector<Measurement> measurements(all.size());
  for (int round = 0; round < rounds; ++round) {
    for (std::size_t index = 0; index < all.size(); ++index) {
      measurements[index].loads.push_back(measureLoad(all[index].call, clients, roundLength, all[index].server));
    }
  }
  std::printf("\n%-34s %8s %8s %8s   %-20s %10s %8s   %s\n",
              (std::to_string(clients) + (clients == 1 ? " client" : " clients")).c_str(), "median", "x echo", "p99", "goal",
              "cpu a call", "x echo", "goal");
  for (std::size_t index = 0; index < all.size(); ++index) {
    const Measurement& own = measurements[index];
    const auto timesEcho = [&](double Load::*figure) { return own.of(figure) / measurements.front().of(figure); };
    std::printf(
        "%-34s %5.0f us %8.2f %5.0f us   %-20s %7.1f us %8.2f   %s\n", all[index].name, own.of(&Load::medianMicroseconds),
        timesEcho(&Load::medianMicroseconds), own.of(&Load::slowestHundredthMicroseconds),
        verdict(timesEcho(&Load::medianMicroseconds), all[index].goal).c_str(), own.of(&Load::serverMicroseconds),
        timesEcho(&Load::serverMicroseconds), verdict(timesEcho(&Load::serverMicroseconds), all[index].processorGoal).c_str());
  }
  std::fflush(stdout);
}

void addPeer(std::vector<Measured>& all, sd_bus& bus, const char* name, const char* service, const BusCall& prepare,
             const BusCall& call) {
  try {
    prepare(bus);
    all.push_back({.name = name, .call = call, .server = processOwning(bus, service), .goal = 0, .processorGoal = 0});
  } catch (const BusCallError& error) {
    std::printf("Not measured: %s (%s)\n", name, error.what());
  }
}

void measureCalls() {
  const MeasuredDaemon daemon(daemonProgram);
  const Bus bus = openBus();
  std::vector<Measured> all = {
      {.name = "echo", .call = callEcho, .server = processOwning(*bus, "com.veltran.Echo1"), .goal = 0, .processorGoal = 0},
      {.name = "request, from an earlier grant",
       .call = requestGrantedAccess,
       .server = daemon.process(),
       .goal = 1.3,
       .processorGoal = 2},
      {.name = "credential", .call = readCredential, .server = daemon.process(), .goal = 1.4, .processorGoal = 0},
  };
  addPeer(all, *bus, "peer: xdg-permission-store, Lookup", "org.freedesktop.impl.portal.PermissionStore",
          preparePermissionStore, lookUpPermission);
  addPeer(all, *bus, "peer: polkit, CheckAuthorization", "org.freedesktop.PolicyKit1", checkAuthorization, checkAuthorization);
  for (const int clients : {1, 4, 16}) measureSideBySide(all, clients);
}

// Quiet and beside the other application in turn, so that whatever else the machine does meets both.
void measureBesideStandingRequests() {
  constexpr int others = 300;
  const MeasuredDaemon daemon(daemonProgram);
  Measurement quiet;
  Measurement beside;
  int standing = 0;
  for (int round = 0; round < rounds; ++round) {
    quiet.loads.push_back(measureLoad(requestGrantedAccess, 1, roundLength, daemon.process()));
    const StandingRequests requests(others);
    standing = requests.standing();
    beside.loads.push_back(measureLoad(requestGrantedAccess, 1, roundLength, daemon.process()));
  }
  std::printf("\n%-58s %8s %8s\n", "request, from an earlier grant", "median", "p99");
  const auto print = [](const std::string& name, const Measurement& measurement) {
    std::printf("%-58s %5.0f us %5.0f us\n", name.c_str(), measurement.of(&Load::medianMicroseconds),
                measurement.of(&Load::slowestHundredthMicroseconds));
  };
  print("quiet", quiet);
  print("beside " + std::to_string(others) + " of another at a stopped server (" + std::to_string(standing) + " stand)",
        beside);
  const double times = beside.of(&Load::slowestHundredthMicroseconds) / quiet.of(&Load::slowestHundredthMicroseconds);
  std::printf("p99 beside them %.2f times the quiet one: %s\n", times, verdict(times, 2).c_str());
  std::fflush(stdout);
}

void measureMemory() {
  const MeasuredDaemon daemon(daemonProgram);
  requestGrantedAccess(*openBus());
  const double atRest = proportionalMegabytes(daemon.process());
  double calls = 0;
  while (calls < 100'000) {
    constexpr std::chrono::seconds length{1};
    calls += measureLoad(requestGrantedAccess, 4, length, daemon.process()).callsPerSecond;
  }
  const double afterwards = proportionalMegabytes(daemon.process());
  std::printf("\n%-34s %5.1f MB   %s\n", "memory at rest", atRest, atRest <= 8 ? "at most 8: met" : "at most 8: missed");
  std::printf("%-34s %5.1f MB   %s\n", "memory after 100,000 calls", afterwards,
              afterwards <= atRest * 1.1 + 0.5 ? "flat: met" : "flat: missed");
  std::fflush(stdout);
}

void measureStart() {
  std::vector<double> milliseconds;
  for (int start = 0; start < 11; ++start) {
    const Bus bus = openBus();
    const auto begin = Clock::now();
    const MeasuredDaemon daemon(daemonProgram);
    requestGrantedAccess(*bus);
    milliseconds.push_back(std::chrono::duration<double, std::milli>(Clock::now() - begin).count());
  }
  const double figure = median(milliseconds);
  std::printf("\n%-34s %5.1f ms   %s\n", "start to first answer", figure,
              figure <= 15 ? "at most 15: met" : "at most 15: missed");
  std::fflush(stdout);
}

std::filesystem::path stateFile(const char* name) {
  return std::filesystem::path(std::getenv("XDG_STATE_HOME")) / "palisade" / name;
}

void fillStore(int grants) {
  const auto database = Database::open(
      {.path = stateFile("accounts.sqlite"), .applicationID = accountStoreApplicationID, .migrations = accountStoreMigrations});
  Transaction transaction(*database);
  const std::string sql =
      "WITH RECURSIVE numbers (number) AS (SELECT 1 UNION ALL SELECT number + 1 FROM numbers WHERE number < " +
      std::to_string(grants) +
      ") INSERT OR IGNORE INTO authorizations (account_type, client_id, app_name, granted, answered_by_nobody, updated_at, "
      "digest)"
      " SELECT 'com.veltran.accounttype.facebook', 'org.example.other' || number, 'Other', 1, 0, 0, 0 FROM numbers";
  database->execute("fill the store", sql.c_str());
  transaction.commit();
}

void measureManyGrants() {
  std::vector<double> medians;
  std::vector<double> processor;
  for (const int grants : {1'000, 1'000'000}) {
    fillStore(grants);
    const auto begin = Clock::now();
    const MeasuredDaemon daemon(daemonProgram);
    requestGrantedAccess(*openBus());
    std::printf("\nstart to first answer among %d grants: %.0f ms", grants,
                std::chrono::duration<double, std::milli>(Clock::now() - begin).count());
    Measurement measurement;
    for (int round = 0; round < rounds; ++round) {
      measurement.loads.push_back(measureLoad(requestGrantedAccess, 1, roundLength, daemon.process()));
    }
    medians.push_back(measurement.of(&Load::medianMicroseconds));
    processor.push_back(measurement.of(&Load::serverMicroseconds));
  }
  const double times = medians[1] / medians[0];
  std::printf("\nrequest among 1,000 grants %.0f us (cpu %.1f us), among 1,000,000 %.0f us (cpu %.1f us), %.2f times: %s\n",
              medians[0], processor[0], medians[1], processor[1], times, verdict(times, 1.5).c_str());
  std::fflush(stdout);
}

// Until the social daemon and the server have done with the revoked token, and are there for the next one alone.
void waitForInvalidations(Outbox& outbox) {
  constexpr std::chrono::milliseconds pause(2);
  while (!outbox.pending().empty()) std::this_thread::sleep_for(pause);
}

// The alert is answered by the daemon itself, which is a program of the benchmarks; everything else is the product's.
void measureApproval() {
  const MeasuredDaemon daemon(answeringDaemonProgram);
  const Bus bus = openBus();
  Outbox outbox({.path = stateFile("outbox.sqlite")});
  WaitingApplication application(*bus);
  ServerExchange exchange;
  exchange.run();
  std::vector<double> approvals;
  std::vector<double> echoes;
  std::vector<double> exchanges;
  for (int round = 0; round < 200; ++round) {
    revokeEverything(*bus);
    waitForInvalidations(outbox);
    // The first echo wakes the bus up, for the second one and for the approval alike. Behind the approval the daemon would
    // still be at work.
    callEcho(*bus);
    echoes.push_back(microsecondsOf([&] { callEcho(*bus); }));
    approvals.push_back(microsecondsOf([&] { application.requestAccess(); }));
    exchanges.push_back(microsecondsOf([&] { exchange.run(); }));
  }
  const double times = median(approvals) / median(echoes);
  std::printf("\nfull approval, token over HTTPS, durable grant: %.0f us, %.1f times the echo before it (%.0f us): %s\n",
              median(approvals), times, median(echoes), verdict(times, 6).c_str());
  std::printf("of which a bare exchange with the server takes %.0f us\n", median(exchanges));
  std::fflush(stdout);
}

struct Part {
  std::string_view name;
  void (*measure)();
};

constexpr Part parts[] = {
    {"start", measureStart},   {"calls", measureCalls},       {"standing", measureBesideStandingRequests},
    {"memory", measureMemory}, {"approval", measureApproval}, {"grants", measureManyGrants},
};

void obtainGrant() {
  const Bus bus = openBus();
  WaitingApplication(*bus).requestAccess();
  stopDaemon(processOwning(*bus, "com.veltran.Accounts1"));
}

// Measures the parts that are named, or all. What cannot be measured is said, and the others go on.
bool measure(const std::vector<std::string_view>& names) {
  bool isComplete = true;
  for (const Part& part : parts) {
    if (!names.empty() && std::ranges::find(names, part.name) == names.end()) continue;
    try {
      part.measure();
    } catch (const std::exception& error) {
      std::printf("\nNot measured: %s: %s\n", std::string(part.name).c_str(), error.what());
      isComplete = false;
    }
  }
  return isComplete;
}

}  // namespace
}  // namespace palisade

int main(int argumentCount, char** arguments) {
  try {
    if (argumentCount == 3 && std::string_view(arguments[1]) == "stand") palisade::standAtServer(std::atoi(arguments[2]));
    palisade::obtainGrant();
    return palisade::measure({arguments + 1, arguments + argumentCount}) ? 0 : 1;
  } catch (const std::exception& error) {
    std::fprintf(stderr, "The daemon cannot be measured: %s\n", error.what());
    return 1;
  }
}
