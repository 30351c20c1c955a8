#include "Tests/Strings/ConsentMessages.h"

#include <algorithm>
#include <iterator>

#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Host/Json/Json.h"
#include "Host/Strings/GettextStringTable.h"

namespace palisade {

class ConsentMessages::PluginThatSpeaks : public VXFacebookAccountAccessPlugin {
 public:
  using VXFacebookAccountAccessPlugin::_constructUserMessageForPermissions;
  using VXFacebookAccountAccessPlugin::_extendedReadPermissions;
  using VXFacebookAccountAccessPlugin::_managePermissions;
  using VXFacebookAccountAccessPlugin::VXFacebookAccountAccessPlugin;
};

ConsentMessages::ConsentMessages(const std::filesystem::path& resourcesFolder, const std::string& language)
    : _strings(std::make_shared<GettextStringTable>(resourcesFolder, language)),
      _platform(FakePlatform::create(std::make_shared<NlohmannJsonParser>(), _strings)),
      _plugin(std::make_shared<const PluginThatSpeaks>(_platform.services())) {
  _platform.log.enableUpTo(LogLevel::error);
  _platform.store->addAccount({.id = "1", .type = "facebook", .description = "me"});
  _platform.social.descriptionAnswers = {{.data = '"' + std::string(serverDescription) + '"', .delivery = Delivery::inLine}};
}

ConsentMessages::~ConsentMessages() = default;

std::vector<ConsentMessage> ConsentMessages::forRequests(const std::vector<ConsentRequest>& requests) const {
  const auto account = _platform.store->accountsWithAccountTypeIdentifier("facebook").front();
  std::vector<ConsentMessage> messages;
  for (const ConsentRequest& request : requests) {
    const auto text = _plugin->_constructUserMessageForPermissions(request.permissions, request.audience, appName, account);
    messages.push_back({.title = request.title,
                        .text = text.value_or(""),
                        .isDescribedByServer = request.permissions.contains(permissionThatOnlyTheServerKnows)});
  }
  return messages;
}

std::vector<ConsentMessage> ConsentMessages::ofOnePermission() const {
  std::vector<ConsentMessage> messages = forRequests(requestsForEachOf(_plugin->_extendedReadPermissions()));
  std::ranges::move(forRequests(requestsForEachOf(_plugin->_managePermissions())), std::back_inserter(messages));
  return messages;
}

std::vector<ConsentMessage> ConsentMessages::ofEveryShape() const { return forRequests(requestsOfEveryShape()); }

std::vector<ConsentMessage> ConsentMessages::all() const {
  std::vector<ConsentMessage> messages = ofOnePermission();
  std::ranges::move(ofEveryShape(), std::back_inserter(messages));
  return messages;
}

std::string ConsentMessages::text(const char* key) const { return _strings->localizedString(key, "", "Localizable"); }

}  // namespace palisade
