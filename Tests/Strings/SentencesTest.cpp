// Looks at every consent message in every language, and writes them to a file for people to look at.

#include <gmock/gmock.h>

#include <filesystem>
#include <fstream>
#include <map>
#include <sstream>

#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Host/Json/Json.h"
#include "Host/Strings/GettextStringTable.h"
#include "Testing/FakePlatform.h"
#include "Tests/Strings/ConsentRequests.h"
#include "Tests/Strings/SentenceCheck.h"

namespace palisade {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

constexpr const char* appName = "Photo Wall";
constexpr const char* serverDescription = "Play games with your friends";

class PluginThatSpeaks : public VXFacebookAccountAccessPlugin {
 public:
  using VXFacebookAccountAccessPlugin::_constructUserMessageForPermissions;
  using VXFacebookAccountAccessPlugin::_extendedReadPermissions;
  using VXFacebookAccountAccessPlugin::_managePermissions;
  using VXFacebookAccountAccessPlugin::VXFacebookAccountAccessPlugin;
};

struct Message {
  std::string title;
  std::string text;
  bool isDescribedByServer = false;
};

/// The messages in the language that is the test's parameter.
class ConsentMessages : public testing::TestWithParam<std::string> {
 protected:
  ConsentMessages() {
    _platform.log.enableUpTo(LogLevel::error);
    _platform.store->addAccount({.id = "1", .type = "facebook", .description = "me"});
    _platform.social.descriptionAnswers = {{.data = '"' + std::string(serverDescription) + '"', .delivery = Delivery::inLine}};
  }

  /// Of the permissions that have a name of their own, each alone.
  std::vector<Message> messagesForOnePermission() {
    std::vector<Message> messages = messagesFor(requestsForEachOf(_plugin->_extendedReadPermissions()));
    for (Message& message : messagesFor(requestsForEachOf(_plugin->_managePermissions())))
      messages.push_back(std::move(message));
    return messages;
  }

  std::vector<Message> messagesOfEveryShape() { return messagesFor(requestsOfEveryShape()); }

  std::vector<Message> allMessages() {
    std::vector<Message> messages = messagesForOnePermission();
    for (Message& message : messagesOfEveryShape()) messages.push_back(std::move(message));
    return messages;
  }

 private:
  // A message that the plug-in does not make is empty.
  std::vector<Message> messagesFor(const std::vector<ConsentRequest>& requests) {
    const auto account = _platform.store->accountsWithAccountTypeIdentifier("facebook").front();
    std::vector<Message> messages;
    for (const ConsentRequest& request : requests) {
      const auto text = _plugin->_constructUserMessageForPermissions(request.permissions, request.audience, appName, account);
      messages.push_back({.title = request.title,
                          .text = text.value_or(""),
                          .isDescribedByServer = request.permissions.contains(permissionThatOnlyTheServerKnows)});
    }
    return messages;
  }

  FakePlatform& _platform = FakePlatform::create(std::make_shared<NlohmannJsonParser>(),
                                                 std::make_shared<GettextStringTable>(PALISADE_RESOURCES, GetParam()));
  std::shared_ptr<const PluginThatSpeaks> _plugin = std::make_shared<const PluginThatSpeaks>(_platform.services());
};

TEST_P(ConsentMessages, AreWrittenToAFileForPeopleToRead) {
  const std::filesystem::path file = std::filesystem::path(PALISADE_SENTENCES) / (GetParam() + ".txt");
  std::filesystem::create_directories(file.parent_path());
  std::ofstream stream(file);
  for (const Message& message : allMessages()) stream << "# " << message.title << '\n' << message.text << "\n\n";
  stream.close();
  ASSERT_TRUE(stream) << "Cannot write " << file;
}

TEST_P(ConsentMessages, ReadLikeSentences) {
  for (const Message& message : allMessages()) {
    EXPECT_THAT(flawsOf(message.text, appName, GetParam()), IsEmpty()) << message.title << '\n' << message.text;
  }
}

TEST_P(ConsentMessages, HideNoDifferenceBetweenRequests) {
  for (const auto& messages : {messagesForOnePermission(), messagesOfEveryShape()}) {
    std::map<std::string, std::string> titles;
    for (const Message& message : messages) {
      const auto [earlier, isNew] = titles.emplace(message.text, message.title);
      EXPECT_TRUE(isNew) << message.text << "\nis said of: " << earlier->second << "\nand of: " << message.title;
    }
  }
}

TEST_P(ConsentMessages, QuoteWhatOnlyFacebookCanDescribe) {
  for (const Message& message : messagesOfEveryShape()) {
    EXPECT_EQ(message.text.find(serverDescription) != std::string::npos, message.isDescribedByServer) << message.text;
    EXPECT_EQ(isQuotedIn(message.text, serverDescription, GetParam()), message.isDescribedByServer) << message.text;
  }
}

TEST_P(ConsentMessages, NameTheAccountThatIsAskedFor) {
  for (const Message& message : allMessages()) EXPECT_THAT(message.text, HasSubstr("Facebook"));
}

std::vector<std::string> languages() {
  std::istringstream list(PALISADE_LANGUAGES);
  std::vector<std::string> names;
  for (std::string name; list >> name;) names.push_back(name);
  return names;
}

INSTANTIATE_TEST_SUITE_P(In, ConsentMessages, testing::ValuesIn(languages()),
                         [](const auto& language) { return language.param; });

class EnglishConsentMessages : public ConsentMessages {};

TEST_P(EnglishConsentMessages, BeginWithTheApplicationInQuotes) {
  for (const Message& message : allMessages()) EXPECT_THAT(message.text, StartsWith("“Photo Wall” would like to "));
}

INSTANTIATE_TEST_SUITE_P(In, EnglishConsentMessages, testing::Values("en"),
                         [](const auto& language) { return language.param; });

TEST(TheSentenceCheck, AcceptsAGoodSentence) {
  const struct {
    const char* language;
    const char* message;
  } sentences[] = {
      {"en", "“Photo Wall” would like to see your photos on Facebook."},
      {"en", "May “Photo Wall” see your photos?"},
      {"de", "„Photo Wall“ möchte Ihre Fotos auf Facebook sehen."},
      {"fr", "«\u00A0Photo Wall\u00A0» souhaite voir vos photos sur Facebook."},
      {"ja", "「Photo Wall」がFacebookの写真、動画を見ることを求めています。"},
      {"he", "היישום ”\u2068Photo Wall\u2069” מבקש לראות את התמונות שלך."},
      {"ar", "هل تسمح لـ «\u2068Photo Wall\u2069» برؤية صورك؟"},
  };
  for (const auto& [language, message] : sentences) EXPECT_THAT(flawsOf(message, appName, language), IsEmpty()) << message;
}

TEST(TheSentenceCheck, FindsWhatReadsBadly) {
  const struct {
    const char* language;
    const char* message;
    const char* flaw;
  } cases[] = {
      {"en", "“Photo Wall” would like to %@.", "a placeholder that nothing was put into"},
      {"en", "“Photo Wall” would  like to post.", "two blanks in a row"},
      {"en", "“Photo Wall” would like to see your photos .", "a blank before a full stop"},
      {"en", "“Photo Wall” would like to see your photos , videos and likes.", "a blank before a comma"},
      {"en", "“Photo Wall” would like to see photos,, videos and likes.", "two commas in a row"},
      {"en", "“Photo Wall” would like to see photos,.", "a comma before a full stop"},
      {"en", "“Photo Wall” would like to see photos..", "two full stops in a row"},
      {"en", "“Photo Wall” would like to to post.", "a word twice in a row"},
      {"en", "“Photo Wall” would like to see your friend's photos.", "a straight apostrophe"},
      {"en", "“Photo Wall” would like to see “likes ”.", "a blank before a closing quotation mark"},
      {"fr", "«\u00A0Photo Wall\u00A0» souhaite voir vos «\u00A0J’aime ».", "a breaking blank before a closing quotation mark"},
      {"fr", "«\u00A0Photo Wall\u00A0» souhaite ceci : voir vos photos.", "a breaking blank before a colon"},
      {"ja", "「Photo Wall」が写真、、動画を見ることを求めています。", "two commas in a row"},
      {"ar", "يريد «Photo Wall» رؤية صورك ، وفيديوهاتك.", "a blank before a comma"},
      {"he", "”\u2068Photo Wall” מבקש לראות את התמונות שלך.", "a run of another direction that does not end"},
      {"en", " “Photo Wall” would like to post.", "a blank at the edge"},
      {"en", "“Photo Wall” would like to post", "no full stop or question mark at the end"},
      {"en", "It would like to post.", "the application's name 0 times"},
      {"en", "“Photo Wall” would like Photo Wall to post.", "the application's name 2 times"},
      {"en", "Photo Wall would like to post.", "the application's name without the language's quotation marks"},
      {"de", "“Photo Wall” möchte etwas posten.", "the application's name without the language's quotation marks"},
      {"fr", "«Photo Wall» souhaite publier.", "the application's name without the language's quotation marks"},
  };
  for (const auto& [language, message, flaw] : cases) {
    EXPECT_THAT(flawsOf(message, appName, language), ElementsAre(flaw)) << message;
  }
}

}  // namespace
}  // namespace palisade
