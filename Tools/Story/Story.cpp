#include "Tools/Story/Story.h"

#include <memory>
#include <ostream>
#include <stdexcept>
#include <string>

#include "Host/Daemon/PluginLoader.h"
#include "Host/Json/Json.h"
#include "Host/Strings/GettextStringTable.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountType.h"
#include "Platform/Format.h"
#include "Testing/FakePlatform.h"

namespace palisade {
namespace {

const std::string accountTypeIdentifier(AccountTypeIdentifierFacebook);

class Story {
 public:
  Story(const std::filesystem::path& modulePath, SystemAlert& alert, std::ostream& output) : _output(output) {
    const LoadedPlugin loaded = loadPlugin(modulePath);
    const auto strings = std::make_shared<GettextStringTable>(loaded.path.parent_path() / "Resources");
    _platform = &FakePlatform::create(std::make_shared<NlohmannJsonParser>(), strings);
    _platform->store->addAccount({.id = "ada", .type = accountTypeIdentifier, .description = "ada@example.org"});
    _platform->keychain.addCredential("ada", std::nullopt, "the account's own token");
    _platform->social.authorizationAnswers = {
        {.data = R"({"access_token": "the application's token", "permissions": ["email", "user_photos", "publish_actions"]})"}};
    _client = _platform->makeClient(
        {.id = "photos", .bundleID = "org.example.photos", .appName = "Photos", .description = "org.example.photos"});

    PlatformServices services = _platform->services();
    services.alert = &alert;
    _plugin = loaded.module->create(services);
    if (_plugin == nullptr) throw std::runtime_error("The module made no plug-in object.");
    _output << "Loaded " << loaded.path.filename().string() << " (ABI " << loaded.module->abiNumber << ").\n\n";
  }

  void tell() {
    _output << "The application Photos (org.example.photos) asks for the Facebook account ada@example.org:\n"
               "it wants the permissions email, user_photos and publish_actions, and posts for friends.\n\n";
    const CompletionCall first = request();
    tellAnswer(first);
    tellRecord();

    _output << "\nPhotos asks again for the same. ";
    tellAnswer(request());

    _output << "\nThe user takes access back. ";
    const CompletionCall revoked =
        carryOut([&] { _plugin->revokeAccessToAccountsOfType(_type, _client, _platform->store, _platform->completion()); });
    _output << (revoked.granted ? "That was handled.\n" : "That failed.\n");
    tellRecord();
  }

 private:
  CompletionCall carryOut(const std::function<void()>& operation) {
    _platform->trace.clear();
    // The alert may write to the same terminal.
    _output << std::flush;
    const std::size_t answersBefore = _platform->completions().size();
    _platform->run(operation);
    const auto answers = _platform->completions();
    if (answers.size() != answersBefore + 1) throw std::runtime_error("The operation was not answered exactly once.");
    return answers.back();
  }

  CompletionCall request() {
    return carryOut([&] {
      const auto options = std::make_shared<const Dictionary>(
          Dictionary{{std::string(FacebookAppIdKey), "1234567890"},
                     {std::string(FacebookPermissionsKey), Array{"email", "user_photos", "publish_actions"}},
                     {std::string(FacebookAudienceKey), FacebookAudienceFriends}});
      _plugin->handleAccessRequestToAccountsOfType(_type, _client, options, _platform->store, true, _platform->completion());
    });
  }

  void tellAnswer(const CompletionCall& answer) {
    const bool userWasAsked = !_platform->trace.named("logAccessRequest").empty();
    const bool tokenWasStored = !_platform->trace.named("KeychainManager.setCredentialForAccount").empty();
    _output << (userWasAsked ? "The user was asked. " : "Nobody was asked. ") << "Access is "
            << (answer.granted ? "granted" : "refused");
    if (answer.error) _output << " (" << describe(*answer.error) << ")";
    _output << ".\n";
    if (tokenWasStored) {
      _output << "The server issued a token for the app; it stands in the keychain under org.example.photos.\n";
    }
  }

  void tellRecord() {
    const auto record = _platform->authorizations.recordOf(*_client, accountTypeIdentifier);
    if (record == nullptr) {
      _output << "Nothing is recorded.\n";
      return;
    }
    _output << "The record says: " << (record->isGranted() ? "granted" : "refused") << ", permissions "
            << describe(LogArgument(record->grantedPermissions())) << ", options " << compactJson(*record->options()) << ".\n";
  }

  std::ostream& _output;
  FakePlatform* _platform;
  std::shared_ptr<const FakeClient> _client;
  std::shared_ptr<const AccountType> _type = std::make_shared<const AccountType>(accountTypeIdentifier);
  std::shared_ptr<AccountAccessPlugin> _plugin;
};

}  // namespace

void tellStory(const std::filesystem::path& module, SystemAlert& alert, std::ostream& output) {
  Story(module, alert, output).tell();
}

}  // namespace palisade
