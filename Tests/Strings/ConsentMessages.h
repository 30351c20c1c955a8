#pragma once

/// The consent messages that the real plug-in makes with a real table of texts.
///
/// Threads: one thread. Ownership: owns its plug-in. Errors: a message that the plug-in does not make is empty.

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "Testing/FakePlatform.h"
#include "Tests/Strings/ConsentRequests.h"

namespace palisade {

/// What is put into the texts: no table holds it.
inline constexpr const char* appName = "Photo Wall";
inline constexpr const char* serverDescription = "Play games with your friends";

struct ConsentMessage {
  /// What is asked for, in English.
  std::string title;
  std::string text;
  bool isDescribedByServer = false;
};

class ConsentMessages {
 public:
  /// In the language of a folder of compiled catalogues.
  ConsentMessages(const std::filesystem::path& resourcesFolder, const std::string& language);
  ~ConsentMessages();

  std::vector<ConsentMessage> forRequests(const std::vector<ConsentRequest>& requests) const;
  /// For each permission that has a name of its own, alone.
  std::vector<ConsentMessage> ofOnePermission() const;
  std::vector<ConsentMessage> ofEveryShape() const;
  std::vector<ConsentMessage> all() const;

  /// A text of the table.
  std::string text(const char* key) const;

 private:
  class PluginThatSpeaks;

  std::shared_ptr<StringTable> _strings;
  FakePlatform& _platform;
  std::shared_ptr<const PluginThatSpeaks> _plugin;
};

}  // namespace palisade
