// The user preference that tells the plug-in to leave access requests alone.
//
// Every read of the preference and every re-synchronisation of its domain runs on one serial queue of the process, so a read
// never overlaps a re-synchronisation. The queue and the registration for environment changes are made once, on first use, and
// stay until the process ends: they are never destroyed, because notifications may arrive while the process is being torn down.

#include "Facebook/Palisade/ExactlyOnce.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Platform/AccountConstants.h"
#include "Platform/NotificationBus.h"
#include "Platform/PreferencesStore.h"
#include "Platform/SerialQueue.h"

namespace palisade {
namespace {

constexpr const char* shouldIgnoreAccessRequest = "_shouldIgnoreAccessRequest";

const std::shared_ptr<SerialQueue>& preferencesQueue(SerialQueueFactory& queues) {
  static const auto* queue =
      new std::shared_ptr<SerialQueue>(queues.makeSerialQueue("com.veltran.social.facebook.preferencesQueue"));
  return *queue;
}

void watchEnvironmentOnce(NotificationBus& notifications, PreferencesStore& preferences, Log& log,
                          const std::shared_ptr<SerialQueue>& queue) {
  const auto synchronize = [&preferences, &log] {
    try {
      preferences.synchronize(FacebookPreferencesAppID);
    } catch (...) {
      logUnexpectedFailure(log, shouldIgnoreAccessRequest, std::current_exception());
    }
  };
  [[maybe_unused]] static const auto* registration = new std::shared_ptr<NotificationRegistration>(
      notifications.registerHandler(FacebookEnvironmentDidChangeNotification, queue, synchronize));
}

// A preference is meant to be a boolean or a number. Text and collections say nothing.
bool isSet(const std::optional<Value>& preference) {
  if (!preference) return false;
  if (const bool* boolean = preference->boolean()) return *boolean;
  if (const std::int64_t* integer = preference->integer()) return *integer != 0;
  if (const double* real = preference->real()) return *real != 0;
  return preference->largeInteger() != nullptr;
}

}  // namespace

bool VXFacebookAccountAccessPlugin::_shouldIgnoreAccessRequest() const {
  const std::shared_ptr<SerialQueue>& queue = preferencesQueue(queues());
  watchEnvironmentOnce(notifications(), preferences(), log(), queue);

  std::optional<Value> preference;
  queue->sync([&] {
    preference = preferences().copyValue(FacebookIgnoreAccessRequests, FacebookPreferencesAppID, PreferencesUser::current,
                                         PreferencesHost::any);
  });
  return isSet(preference);
}

}  // namespace palisade
