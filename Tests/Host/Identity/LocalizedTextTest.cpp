#include "Host/Identity/LocalizedText.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "Tests/Host/Identity/EnvironmentVariable.h"

namespace palisade {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

const LocalizedText photosInLanguages = {
    .untranslated = "Photos",
    .translations = {
        {"de", "Fotos"}, {"de_AT", "Fotos (AT)"}, {"pt_BR", "Fotos (BR)"}, {"sr", "Фотографије"}, {"sr@latin", "Fotografije"}}};

TEST(ALocalizedText, IsTheOneOfTheFirstLocaleThatHasOne) {
  struct Case {
    std::vector<std::string> locales;
    std::string text;
  };
  const std::vector<Case> cases = {
      {{}, "Photos"},
      {{"de"}, "Fotos"},
      {{"de_DE.UTF-8"}, "Fotos"},
      {{"de_AT.UTF-8@euro"}, "Fotos (AT)"},
      {{"de-AT"}, "Fotos (AT)"},
      {{"pt_BR"}, "Fotos (BR)"},
      {{"pt_PT"}, "Photos"},
      {{"sr_RS"}, "Фотографије"},
      {{"sr_RS.UTF-8@latin"}, "Fotografije"},
      {{"fr", "de"}, "Fotos"},
      {{"en_GB", "de"}, "Photos"},
      {{"C", "de"}, "Photos"},
      {{"POSIX"}, "Photos"},
      {{"", "..", "@", "_"}, "Photos"},
  };
  for (const auto& [locales, text] : cases) EXPECT_EQ(textForLocales(photosInLanguages, locales), text);
}

TEST(TheUsersLocales, AreThoseOfTheFirstVariableThatSaysSomething) {
  const NoLanguage environment;
  EXPECT_THAT(userLocales(), IsEmpty());
  environment.lang.set("de_DE.UTF-8");
  EXPECT_THAT(userLocales(), ElementsAre("de_DE.UTF-8"));
  environment.messages.set("fr_FR");
  EXPECT_THAT(userLocales(), ElementsAre("fr_FR"));
  environment.all.set("it_IT");
  EXPECT_THAT(userLocales(), ElementsAre("it_IT"));
  environment.language.set("");
  EXPECT_THAT(userLocales(), ElementsAre("it_IT"));
  environment.language.set(":sr@latin::de:");
  EXPECT_THAT(userLocales(), ElementsAre("sr@latin", "de"));
}

}  // namespace
}  // namespace palisade
