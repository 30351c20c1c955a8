#include "Benchmarks/Daemon/AccountsCalls.h"

#include <systemd/sd-bus.h>
#include <unistd.h>

#include <cstdint>
#include <optional>

namespace palisade {
namespace {

constexpr const char* accounts = "com.veltran.Accounts1";
constexpr const char* accountsPath = "/com/veltran/Accounts1";
constexpr const char* manager = "com.veltran.Accounts1.Manager";
constexpr const char* request = "com.veltran.Accounts1.Request";
constexpr const char* facebook = "com.veltran.accounttype.facebook";
constexpr const char* permissions = "org.freedesktop.impl.portal.PermissionStore";
constexpr const char* permissionsPath = "/org/freedesktop/impl/portal/PermissionStore";
constexpr std::uint32_t granted = 0;
constexpr std::uint32_t pending = 3;

struct ReleaseMessage {
  void operator()(sd_bus_message* message) const { sd_bus_message_unref(message); }
};
using Message = std::unique_ptr<sd_bus_message, ReleaseMessage>;

Message newCall(sd_bus& bus, const char* service, const char* path, const char* interface, const char* member) {
  sd_bus_message* message = nullptr;
  requireSuccess(sd_bus_message_new_method_call(&bus, &message, service, path, interface, member), member);
  return Message(message);
}

Message answerTo(sd_bus& bus, const Message& call) {
  sd_bus_error error = SD_BUS_ERROR_NULL;
  sd_bus_message* answer = nullptr;
  if (sd_bus_call(&bus, call.get(), 0, &error, &answer) < 0) {
    const std::string text =
        std::string(error.name == nullptr ? "" : error.name) + ": " + (error.message == nullptr ? "" : error.message);
    sd_bus_error_free(&error);
    throw BusCallError(text);
  }
  return Message(answer);
}

void appendRequest(const Message& message) {
  requireSuccess(sd_bus_message_append(message.get(), "sa{sv}a{sv}", facebook, 2, "FacebookAppIdKey", "s", "1234567890",
                                       "FacebookPermissionsKey", "as", 2, "email", "user_photos", 0),
                 "The request cannot be written");
}

struct Reply {
  std::string request;
  std::uint32_t response;
};

Reply requestAccess(sd_bus& bus) {
  const Message call = newCall(bus, accounts, accountsPath, manager, "RequestAccess");
  appendRequest(call);
  const Message answer = answerTo(bus, call);
  const char* path = nullptr;
  std::uint32_t response = 0;
  requireSuccess(sd_bus_message_read(answer.get(), "ou", &path, &response), "RequestAccess was answered otherwise");
  return {.request = path, .response = response};
}

void requireGrant(std::uint32_t response) {
  if (response != granted) throw BusCallError("The request was answered with " + std::to_string(response) + ".");
}

}  // namespace

void callEcho(sd_bus& bus) {
  const Message call = newCall(bus, "com.veltran.Echo1", "/com/veltran/Echo1", "com.veltran.Echo1", "Echo");
  appendRequest(call);
  answerTo(bus, call);
}

void requestGrantedAccess(sd_bus& bus) { requireGrant(requestAccess(bus).response); }

int requestWithoutWaiting(sd_bus& bus, int count) {
  struct Replies {
    int all = 0;
    int pending = 0;
  } replies;
  const auto countReply = [](sd_bus_message* message, void* place, sd_bus_error*) {
    auto& counted = *static_cast<Replies*>(place);
    ++counted.all;
    const char* path = nullptr;
    std::uint32_t response = 0;
    if (sd_bus_message_read(message, "ou", &path, &response) >= 0 && response == pending) ++counted.pending;
    return 0;
  };
  for (int request = 0; request < count; ++request) {
    const Message call = newCall(bus, accounts, accountsPath, manager, "RequestAccess");
    requireSuccess(sd_bus_message_append(call.get(), "sa{sv}a{sv}", facebook, 2, "FacebookAppIdKey", "s", "1234567890",
                                         "FacebookPermissionsKey", "as", 1, "user_playlists", 0),
                   "The request cannot be written");
    requireSuccess(sd_bus_call_async(&bus, nullptr, call.get(), countReply, &replies, UINT64_MAX),
                   "The request cannot be sent");
  }
  while (replies.all < count) {
    if (requireSuccess(sd_bus_process(&bus, nullptr), "The bus went away") == 0) sd_bus_wait(&bus, UINT64_MAX);
  }
  return replies.pending;
}

WaitingApplication::WaitingApplication(sd_bus& bus) : _bus(bus) {
  sd_bus_slot* slot = nullptr;
  requireSuccess(sd_bus_match_signal(&bus, &slot, accounts, nullptr, request, "Response", rememberOutcome, &_outcome),
                 "The Response signal cannot be waited for");
  _match.reset(slot);
}

void WaitingApplication::requestAccess() {
  const Reply reply = palisade::requestAccess(_bus);
  if (reply.response != pending) return requireGrant(reply.response);
  while (_outcome.request != reply.request) {
    if (requireSuccess(sd_bus_process(&_bus, nullptr), "The bus went away") == 0) sd_bus_wait(&_bus, UINT64_MAX);
  }
  requireGrant(_outcome.response);
}

int WaitingApplication::rememberOutcome(sd_bus_message* message, void* outcome, sd_bus_error*) {
  std::uint32_t response = 0;
  if (sd_bus_message_read(message, "u", &response) >= 0) {
    *static_cast<Outcome*>(outcome) = {.request = sd_bus_message_get_path(message), .response = response};
  }
  return 0;
}

void WaitingApplication::ReleaseSlot::operator()(sd_bus_slot* slot) const { sd_bus_slot_unref(slot); }

void readCredential(sd_bus& bus) {
  const Message call = newCall(bus, accounts, accountsPath, manager, "GetCredentialDescriptor");
  requireSuccess(sd_bus_message_append(call.get(), "sa{sv}", facebook, 0), "The call cannot be written");
  const Message answer = answerTo(bus, call);
  int pipe = -1;
  requireSuccess(sd_bus_message_read(answer.get(), "h", &pipe), "GetCredentialDescriptor was answered otherwise");
  char token[4096];
  if (read(pipe, token, sizeof token) <= 0) throw BusCallError("The pipe holds no token.");
}

void revokeEverything(sd_bus& bus) {
  const Message call = newCall(bus, accounts, accountsPath, manager, "RevokeAll");
  requireSuccess(sd_bus_message_append(call.get(), "sa{sv}", facebook, 0), "The call cannot be written");
  answerTo(bus, call);
}

void preparePermissionStore(sd_bus& bus) {
  const Message call = newCall(bus, permissions, permissionsPath, permissions, "Set");
  requireSuccess(
      sd_bus_message_append(call.get(), "sbsa{sas}v", "accounts", 1, "facebook", 1, "org.example.photos", 1, "yes", "y", 0),
      "The call cannot be written");
  answerTo(bus, call);
}

void lookUpPermission(sd_bus& bus) {
  const Message call = newCall(bus, permissions, permissionsPath, permissions, "Lookup");
  requireSuccess(sd_bus_message_append(call.get(), "ss", "accounts", "facebook"), "The call cannot be written");
  answerTo(bus, call);
}

void checkAuthorization(sd_bus& bus) {
  const char* name = nullptr;
  requireSuccess(sd_bus_get_unique_name(&bus, &name), "The connection has no name");
  const Message call = newCall(bus, "org.freedesktop.PolicyKit1", "/org/freedesktop/PolicyKit1/Authority",
                               "org.freedesktop.PolicyKit1.Authority", "CheckAuthorization");
  requireSuccess(sd_bus_message_append(call.get(), "(sa{sv})sa{ss}us", "system-bus-name", 1, "name", "s", name,
                                       "org.freedesktop.policykit.exec", 0, 0U, ""),
                 "The call cannot be written");
  answerTo(bus, call);
}

}  // namespace palisade
