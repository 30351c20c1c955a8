#include "Host/Secrets/ProcessEnvironment.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace palisade {
namespace {

// Where the user's files, buses and displays are, which language they read, and how their windows look.
constexpr std::array<std::string_view, 28> known = {"AT_SPI_BUS_ADDRESS",
                                                    "CREDENTIALS_DIRECTORY",
                                                    "DBUS_SESSION_BUS_ADDRESS",
                                                    "DBUS_SYSTEM_BUS_ADDRESS",
                                                    "DISPLAY",
                                                    "GDK_BACKEND",
                                                    "GDK_DPI_SCALE",
                                                    "GDK_SCALE",
                                                    "GSETTINGS_BACKEND",
                                                    "GTK_THEME",
                                                    "HOME",
                                                    "LANG",
                                                    "LANGUAGE",
                                                    "LOGNAME",
                                                    "NO_AT_BRIDGE",
                                                    "TZ",
                                                    "USER",
                                                    "WAYLAND_DISPLAY",
                                                    "XAUTHORITY",
                                                    "XDG_CACHE_HOME",
                                                    "XDG_CONFIG_DIRS",
                                                    "XDG_CONFIG_HOME",
                                                    "XDG_CURRENT_DESKTOP",
                                                    "XDG_DATA_DIRS",
                                                    "XDG_DATA_HOME",
                                                    "XDG_RUNTIME_DIR",
                                                    "XDG_SESSION_TYPE",
                                                    "XDG_STATE_HOME"};
static_assert(std::ranges::is_sorted(known));

// A clock for trials, libfaketime, asks for its variables at every call. Without that library they mean nothing.
bool isKnown(std::string_view name) {
  return name.starts_with("LC_") || name.starts_with("FAKETIME") || std::ranges::binary_search(known, name);
}

}  // namespace

void keepKnownEnvironment() {
  std::vector<std::pair<std::string, std::string>> kept;
  for (char** entry = environ; *entry != nullptr; ++entry) {
    const std::string_view text = *entry;
    const std::size_t sign = text.find('=');
    if (sign != std::string_view::npos && isKnown(text.substr(0, sign)))
      kept.emplace_back(text.substr(0, sign), text.substr(sign + 1));
  }
  clearenv();
  for (const auto& [name, value] : kept) setenv(name.c_str(), value.c_str(), 1);
  setenv("PATH", "/usr/local/bin:/usr/bin:/bin", 1);
}

}  // namespace palisade
