#pragma once

/// What the daemon offers a plug-in: one pointer a service, none of them null.
///
/// Ownership: borrowed. The daemon keeps every service alive until the process ends, because a module is never unloaded and a
/// notification registration may outlive the plug-in object that made it. `strings` holds the tables beside the plug-in's own
/// module; all other services may be shared by all plug-ins.

#include <cstdint>

namespace palisade {

class JsonParser;
class KeychainManager;
class Log;
class NotificationBus;
class PreferencesStore;
class SerialQueueFactory;
class SocialFramework;
class StringTable;
class SystemAlert;

/// The number of this binary interface: everything under Platform/. It goes up when a virtual function is inserted, removed or
/// changed, or a structure changes its layout; a daemon and a plug-in work together only when their numbers are equal.
inline constexpr std::uint32_t AccountAccessPluginABINumber = 2;

struct PlatformServices {
  std::uint32_t abiNumber = AccountAccessPluginABINumber;
  Log* log = nullptr;
  KeychainManager* keychain = nullptr;
  SocialFramework* social = nullptr;
  SystemAlert* alert = nullptr;
  PreferencesStore* preferences = nullptr;
  NotificationBus* notifications = nullptr;
  SerialQueueFactory* queues = nullptr;
  JsonParser* json = nullptr;
  StringTable* strings = nullptr;
};

}  // namespace palisade
