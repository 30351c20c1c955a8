// The least that a call over the bus can cost: a service that reads a message like RequestAccess's and answers one like its
// reply, written on the bus library itself.

#include <systemd/sd-bus.h>

#include <cstdio>
#include <cstring>
#include <exception>

#include "Benchmarks/Daemon/BusLoad.h"

namespace {

int echo(sd_bus_message* message, void*, sd_bus_error*) {
  const char* text = nullptr;
  int result = sd_bus_message_read(message, "s", &text);
  if (result >= 0) result = sd_bus_message_skip(message, "a{sv}a{sv}");
  if (result < 0) return result;
  return sd_bus_reply_method_return(message, "oua{sv}", "/", 0U, 0U);
}

const sd_bus_vtable methods[] = {
    SD_BUS_VTABLE_START(0),
    SD_BUS_METHOD("Echo", "sa{sv}a{sv}", "oua{sv}", echo, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_VTABLE_END,
};

}  // namespace

int main() {
  try {
    const palisade::Bus bus = palisade::openBus();
    palisade::requireSuccess(
        sd_bus_add_object_vtable(bus.get(), nullptr, "/com/veltran/Echo1", "com.veltran.Echo1", methods, nullptr),
        "The echo cannot be served");
    palisade::requireSuccess(sd_bus_request_name(bus.get(), "com.veltran.Echo1", 0), "The echo's name cannot be owned");
    while (true) {
      const int result = palisade::requireSuccess(sd_bus_process(bus.get(), nullptr), "The bus went away");
      if (result == 0) palisade::requireSuccess(sd_bus_wait(bus.get(), UINT64_MAX), "The bus went away");
    }
  } catch (const std::exception& error) {
    std::fprintf(stderr, "palisade-bus-echo: %s\n", error.what());
    return 1;
  }
}
