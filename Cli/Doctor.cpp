// What is examined, in the order in which one thing stands on another: the session bus, the daemon on it, what the daemon
// stands on by its own account, and the social daemon. What the daemon can say only by trying, such as whether the server
// answers, it tries when it is asked.

#include "Cli/Doctor.h"

#include <fmt/core.h>

#include <algorithm>
#include <string>
#include <vector>

#include "Cli/AccountsClient.h"
#include "Host/Text/PrintableText.h"

namespace palisade {
namespace {

constexpr const char* socialDaemon = "com.veltran.Vantad1";

enum class Level { ok, warn, fail };

struct Finding {
  std::string check;
  Level level = Level::ok;
  std::string found;
  std::string advice = {};
};

using Findings = std::vector<Finding>;

const char* nameOf(Level level) {
  switch (level) {
    case Level::ok: return "ok";
    case Level::warn: return "warn";
    case Level::fail: break;
  }
  return "fail";
}

int colourOf(Level level) {
  constexpr int red = 31;
  constexpr int green = 32;
  constexpr int yellow = 33;
  return level == Level::ok ? green : level == Level::warn ? yellow : red;
}

// What the daemon reports under `key`, and how bad a trouble with it is.
struct Reported {
  const char* key;
  const char* check;
  Level trouble;
};

constexpr Reported reported[] = {
    {"plugins", "plug-ins", Level::fail}, {"clients", "client records", Level::warn}, {"keychain", "keychain", Level::fail},
    {"alert", "alert", Level::warn},      {"server", "server", Level::fail},          {"store", "store", Level::fail},
    {"log", "log", Level::warn},
};

Finding findingOf(const Dictionary& status, const Reported& piece) {
  const Value* value = status.find(piece.key);
  const Value* trouble = status.find(piece.key + std::string("_trouble"));
  Finding finding{.check = piece.check, .found = shown(value)};
  if (finding.found.empty()) finding.found = "none";
  if (trouble == nullptr) return finding;
  finding.advice = shown(trouble);
  // One plug-in that is refused does not keep the others from serving.
  const bool isPartial = value != nullptr && value->array() != nullptr && !value->array()->empty();
  finding.level = isPartial ? Level::warn : piece.trouble;
  return finding;
}

struct Waiting {
  std::size_t count = 0;
  std::string lastTrouble;
};

Waiting waitingRevocations(AccountsClient& client) {
  Waiting waiting;
  for (const Dictionary& row : client.listRevocations()) {
    if (shown(row.find("state")) != "pending") continue;
    ++waiting.count;
    if (waiting.lastTrouble.empty()) waiting.lastTrouble = shown(row.find("last_error"));
  }
  return waiting;
}

Finding examineSocialDaemon(AccountsClient& client) {
  Finding finding{.check = "vantad", .found = "runs"};
  const Waiting waiting = waitingRevocations(client);
  const std::string count =
      fmt::format("{} {} at the server", waiting.count, waiting.count == 1 ? "revocation waits" : "revocations wait");
  switch (client.serviceState(socialDaemon)) {
    case ServiceState::runs:
      if (waiting.lastTrouble.empty()) break;
      finding.level = Level::warn;
      finding.advice = fmt::format("{}: {} It is tried again; `palisade revocations` shows when.", count, waiting.lastTrouble);
      break;
    case ServiceState::canBeStarted:
      finding.found = "is started when there is something to do";
      if (waiting.count == 0) break;
      finding.level = Level::fail;
      finding.advice = fmt::format(
          "{}, and vantad does not run. Start it with `systemctl --user start vantad`; `journalctl --user -u vantad` says why "
          "it ended.",
          count);
      break;
    case ServiceState::unknown:
      finding.level = waiting.count == 0 ? Level::warn : Level::fail;
      finding.found = "does not run";
      finding.advice =
          "The session bus cannot start it, so tokens that are taken back stay valid at the server. Start vantad, or install "
          "its "
          "file com.veltran.Vantad1.service where the bus looks for services.";
      break;
  }
  return finding;
}

Findings findings() {
  Findings all;
  try {
    AccountsClient client;
    all.push_back({.check = "session bus", .found = "answers"});
    const Dictionary status = client.status();
    all.push_back({.check = "accountd", .found = "answers"});
    if (status.find("configuration_trouble") != nullptr) {
      // Then it has looked at nothing else.
      all.push_back(findingOf(status, {"configuration", "configuration", Level::fail}));
      return all;
    }
    for (const Reported& piece : reported) all.push_back(findingOf(status, piece));
    all.push_back(examineSocialDaemon(client));
  } catch (const CallFailed& failure) {
    const char* check = all.empty() ? "session bus" : all.size() == 1 ? "accountd" : "vantad";
    all.push_back({.check = check, .level = Level::fail, .found = "no answer", .advice = failure.what()});
  }
  return all;
}

void printAsJson(const Findings& all, Level worst, const Output& output) {
  Array checks;
  for (const Finding& finding : all) {
    Dictionary check{{"check", finding.check}, {"level", nameOf(finding.level)}, {"found", finding.found}};
    if (!finding.advice.empty()) check.set("advice", finding.advice);
    checks.emplace_back(std::move(check));
  }
  output.say("", {{"level", nameOf(worst)}, {"checks", std::move(checks)}});
}

void print(const Findings& all, const Output& output) {
  for (const Finding& finding : all) {
    std::string level = fmt::format("{:<4}", nameOf(finding.level));
    if (output.isColoured()) level = fmt::format("\x1b[{}m{}\x1b[0m", colourOf(finding.level), level);
    fmt::print("{}  {:<14}  {}\n", level, finding.check, printableText(finding.found));
    if (!finding.advice.empty()) fmt::print("{:<22}{}\n", "", printableText(finding.advice));
  }
}

}  // namespace

int examine(const Output& output) {
  const Findings all = findings();
  const Level worst = std::ranges::max_element(all, {}, &Finding::level)->level;
  if (output.isJson()) {
    printAsJson(all, worst, output);
  } else {
    print(all, output);
  }
  return static_cast<int>(worst);
}

}  // namespace palisade
