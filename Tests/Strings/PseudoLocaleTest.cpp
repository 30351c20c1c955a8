// Renders the consent messages in a language that marks its texts, and takes them apart again.
//
// Each text of that language is ⟦…⟧, and what is put into it stands in ⟨…⟩. A message that the plug-in makes from table texts
// alone follows this grammar; a word, a comma or a blank that the code adds does not.

#include <gtest/gtest.h>

#include "Tests/Strings/ConsentMessages.h"

namespace palisade {
namespace {

class MarkedMessage {
 public:
  explicit MarkedMessage(std::string_view text) : _rest(text) {}

  /// One text, or two with a blank between them: two sentences.
  bool isMadeOfTexts() { return takeText() && (_rest.empty() || (take(" ") && takeText() && _rest.empty())); }

 private:
  bool take(std::string_view part) {
    if (!_rest.starts_with(part)) return false;
    _rest.remove_prefix(part.size());
    return true;
  }

  bool takeText() {
    if (!take("⟦")) return false;
    while (!take("⟧")) {
      if (take("⟨")) {
        if (!takeArgument()) return false;
      } else if (_rest.empty() || _rest.starts_with("⟦") || _rest.starts_with("⟩")) {
        return false;
      } else {
        _rest.remove_prefix(1);
      }
    }
    return true;
  }

  /// Texts one after another, or data.
  bool takeArgument() {
    if (take(appName) || take(serverDescription)) return take("⟩");
    while (takeText()) {
      if (take("⟩")) return true;
    }
    return false;
  }

  std::string_view _rest;
};

bool isMadeOfTexts(std::string_view message) { return MarkedMessage(message).isMadeOfTexts(); }

TEST(EveryConsentMessage, IsMadeOfTableTextsOnly) {
  const ConsentMessages messages(PALISADE_PSEUDO_RESOURCES, "en_XA");
  for (const ConsentMessage& message : messages.all()) {
    EXPECT_TRUE(isMadeOfTexts(message.text)) << message.title << '\n' << message.text;
  }
}

TEST(AMarkedMessage, ShowsWhatIsNotFromATable) {
  EXPECT_TRUE(isMadeOfTexts("⟦“⟨Photo Wall⟩” ŵöûļð ļîķé ţö ⟨⟦šéé ⟨⟦þĥöţöš·⟧⟦,·⟧⟦ļîķéš·⟧⟩·⟧⟩.·⟧"));
  EXPECT_TRUE(isMadeOfTexts("⟦“⟨Photo Wall⟩” ŵöûļð ļîķé ţö ⟨⟦þöšţ·⟧⟩.·⟧ ⟦Åļšö: ⟨Play games with your friends⟩.··⟧"));

  EXPECT_FALSE(isMadeOfTexts("")) << "no text";
  EXPECT_FALSE(isMadeOfTexts("“⟨Photo Wall⟩” ⟦þöšţ·⟧")) << "words before the text";
  EXPECT_FALSE(isMadeOfTexts("⟦þöšţ·⟧.")) << "a full stop after the text";
  EXPECT_FALSE(isMadeOfTexts("⟦šéé ⟨⟦þĥöţöš·⟧, ⟦ļîķéš·⟧⟩·⟧")) << "a comma between texts";
  EXPECT_FALSE(isMadeOfTexts("⟦šéé ⟨user_photos⟩·⟧")) << "a permission's name instead of a text";
  EXPECT_FALSE(isMadeOfTexts("⟦šéé ⟨⟩·⟧")) << "nothing where a text should be";
  EXPECT_FALSE(isMadeOfTexts("⟦šéé ⟦þĥöţöš·⟧·⟧")) << "a text within a text";
  EXPECT_FALSE(isMadeOfTexts("⟦þöšţ·")) << "half a text";
}

}  // namespace
}  // namespace palisade
