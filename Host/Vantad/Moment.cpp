#include "Host/Vantad/Moment.h"

#include <algorithm>
#include <ctime>
#include <fstream>

namespace palisade {
namespace {

std::string readBoot() {
  std::string boot;
  std::getline(std::ifstream("/proc/sys/kernel/random/boot_id"), boot);
  return boot;
}

}  // namespace

Moment presentMoment() {
  static const std::string boot = readBoot();
  timespec uptime = {};
  clock_gettime(CLOCK_BOOTTIME, &uptime);
  return {.date = std::chrono::floor<std::chrono::seconds>(std::chrono::system_clock::now()),
          .boot = boot,
          .uptime = std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::seconds(uptime.tv_sec) +
                                                                          std::chrono::nanoseconds(uptime.tv_nsec))};
}

std::optional<std::chrono::milliseconds> elapsed(const Moment& from, const Moment& until) {
  if (from.boot.empty() || from.boot != until.boot || from.uptime > until.uptime) return std::nullopt;
  // Both were cut off to whole milliseconds, so the difference may be one too large.
  return std::max(until.uptime - from.uptime - std::chrono::milliseconds(1), std::chrono::milliseconds(0));
}

}  // namespace palisade
