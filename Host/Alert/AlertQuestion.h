#pragma once

/// What the desktop helper is asked to show: one frame, its length and a JSON object.
///
/// Threads: plain values and pure functions. Errors: a text that is no such question is none. All texts are data: they hold no
/// line breaks, no controls and no marks of direction but the isolates that `isolated` puts around a name.

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "Host/Alert/AlertAnswer.h"

namespace palisade {

/// How much is known about the application that asks.
enum class AlertCertainty {
  certain,           ///< a sandbox vouches for it, and no other program of the user can pretend to be it
  likely,            ///< a sandbox says so, but a program of the user outside sandboxes could build one that says the same
  claimedInSandbox,  ///< it is in a sandbox that does not say who is inside
  claimed            ///< it runs as the user, like any other program that may pretend to be it
};

/// Whether nobody but the application says who it is.
inline bool isOnlyClaimed(AlertCertainty certainty) {
  return certainty == AlertCertainty::claimedInSandbox || certainty == AlertCertainty::claimed;
}

/// Who asks, and for what account, as the person should see it.
struct AlertSubject {
  std::string applicationName;
  /// The application's identifier, or the path of a program that has none.
  std::string applicationID;
  AlertCertainty certainty = AlertCertainty::claimed;
  std::string account = {};
};

struct AlertQuestion {
  std::string title;
  std::string message;
  std::string refuseTitle;
  std::string allowTitle;
  std::optional<AlertSubject> subject = std::nullopt;
  /// Catalogue names of the user's languages, best first, separated by colons.
  std::string languages;
  bool topMost = false;
  /// The display that may be reached over the network; empty for none.
  std::string networkDisplay = {};
  AlertNonce nonce{};
};

/// The longest JSON text of a question.
inline constexpr std::size_t longestAlertQuestion = 64 * 1024;

/// Its length in four bytes, the lowest first, and the JSON text. None when the question is too long.
std::optional<std::string> alertQuestionFrame(const AlertQuestion& question);

/// How long the JSON text is of which these four bytes are the length; none for one that is too long.
std::optional<std::uint32_t> lengthOfAlertQuestion(std::string_view fourBytes);
std::optional<AlertQuestion> alertQuestionFromJson(std::string_view json);

/// `text` on one line: controls and line breaks become spaces, what turns the direction of writing is left out.
std::string oneLine(std::string_view text);

/// `message` with `name` between U+2068 and U+2069 wherever it stands between quotation marks, so that the letters of a name do
/// not move the words around it. A name can be a word or a letter of the sentence, which stay as they are.
std::string isolated(const std::string& message, const std::string& name);

}  // namespace palisade
