// Looks at every consent message in every language, and writes them to files for people to look at.

#include <gmock/gmock.h>

#include <filesystem>
#include <fstream>
#include <map>
#include <sstream>

#include "Tests/Strings/ConsentMessages.h"
#include "Tests/Strings/ReviewPage.h"
#include "Tests/Strings/SentenceCheck.h"

namespace palisade {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

/// The messages in the language that is the test's parameter.
class ConsentMessagesIn : public testing::TestWithParam<std::string> {
 protected:
  const ConsentMessages messages{PALISADE_RESOURCES, GetParam()};
};

TEST_P(ConsentMessagesIn, AreWrittenToFilesForPeopleToRead) {
  const std::filesystem::path folder = PALISADE_SENTENCES;
  std::filesystem::create_directories(folder);
  std::ofstream list(folder / (GetParam() + ".txt"));
  for (const ConsentMessage& message : messages.all()) list << "# " << message.title << '\n' << message.text << "\n\n";
  std::ofstream page(folder / (GetParam() + ".md"));
  page << reviewPage(GetParam(), messages);
  list.close();
  page.close();
  ASSERT_TRUE(list && page) << "Cannot write to " << folder;
}

TEST_P(ConsentMessagesIn, AreShownToReviewersAsTheyAre) {
  const std::filesystem::path file = std::filesystem::path(PALISADE_REVIEW_PAGES) / (GetParam() + ".md");
  std::ifstream stream(file);
  const std::string page{std::istreambuf_iterator<char>(stream), {}};
  EXPECT_TRUE(page == reviewPage(GetParam(), messages)) << file << " is out of date. Build the target sentence-pages.";
}

TEST_P(ConsentMessagesIn, ReadLikeSentences) {
  for (const ConsentMessage& message : messages.all()) {
    EXPECT_THAT(flawsOf(message.text, appName, GetParam()), IsEmpty()) << message.title << '\n' << message.text;
  }
}

TEST_P(ConsentMessagesIn, HideNoDifferenceBetweenRequests) {
  for (const auto& group : {messages.ofOnePermission(), messages.ofEveryShape()}) {
    std::map<std::string, std::string> titles;
    for (const ConsentMessage& message : group) {
      const auto [earlier, isNew] = titles.emplace(message.text, message.title);
      EXPECT_TRUE(isNew) << message.text << "\nis said of: " << earlier->second << "\nand of: " << message.title;
    }
  }
}

TEST_P(ConsentMessagesIn, QuoteWhatOnlyFacebookCanDescribe) {
  for (const ConsentMessage& message : messages.ofEveryShape()) {
    EXPECT_EQ(message.text.find(serverDescription) != std::string::npos, message.isDescribedByServer) << message.text;
    EXPECT_EQ(isQuotedIn(message.text, serverDescription, GetParam()), message.isDescribedByServer) << message.text;
  }
}

TEST_P(ConsentMessagesIn, NameTheAccountThatIsAskedFor) {
  for (const ConsentMessage& message : messages.all()) EXPECT_THAT(message.text, HasSubstr("Facebook"));
}

std::vector<std::string> languages() {
  std::istringstream list(PALISADE_LANGUAGES);
  std::vector<std::string> names;
  for (std::string name; list >> name;) names.push_back(name);
  return names;
}

INSTANTIATE_TEST_SUITE_P(The, ConsentMessagesIn, testing::ValuesIn(languages()),
                         [](const auto& language) { return language.param; });

class EnglishConsentMessages : public ConsentMessagesIn {};

TEST_P(EnglishConsentMessages, BeginWithTheApplicationInQuotes) {
  for (const ConsentMessage& message : messages.all()) EXPECT_THAT(message.text, StartsWith("“Photo Wall” would like to "));
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
