// People type at a real terminal while alerts come: nothing is granted by it, and nothing is refused without keys that choose.
//
// All times are a twenty-fifth of what they are for people.

#include <gmock/gmock.h>

#include <future>
#include <map>
#include <string>
#include <vector>

#include "Host/Alert/TerminalAlert.h"
#include "Tests/Host/Alert/PseudoTerminal.h"
#include "Tests/Host/Alert/RandomTyping.h"

namespace palisade {
namespace {

using Kind = TypedKey::Kind;
using std::chrono::milliseconds;

constexpr int hastened = 25;
constexpr std::uint32_t typings = 200;

std::string bytesOf(const TypedKey& key) {
  switch (key.kind) {
    case Kind::character: return std::string(1, key.character == '\n' ? '\r' : key.character);
    case Kind::forward: return "\t";
    case Kind::back: return "\x1b[Z";
    case Kind::left: return "\x1b[D";
    case Kind::right: return "\x1b[C";
    case Kind::up: return "\x1b[A";
    case Kind::down: return "\x1b[B";
    case Kind::alt: break;
  }
  return std::string("\x1b") + key.character;
}

// What becomes of an alert during which somebody types.
AlertResponse responseDuring(const Typing& typing) {
  const PseudoTerminal terminal;
  TerminalAlert alert({.terminal = terminal.path(),
                       .subject = [] { return AlertSubject{.applicationName = "Photos", .applicationID = "photos"}; },
                       .timing = {.wait = milliseconds(500 / hastened), .quiet = milliseconds(3000 / hastened)}});
  const AlertDescription description{
      .header = "Facebook", .message = "“Photos” asks.", .alternateButtonTitle = "Don’t Allow", .defaultButtonTitle = "Allow"};
  const auto handle = alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, description);
  auto answer = std::async(std::launch::async, [&] {
    AlertResponse response = 42;
    alert.receiveResponse(handle, 0, response);
    return response;
  });
  for (const TypedKey& key : typing) {
    if (answer.wait_for(std::chrono::microseconds(key.pause) / hastened) == std::future_status::ready) break;
    terminal.type(bytesOf(key));
  }
  TerminalAlert::takeDown(handle);
  return answer.get();
}

// They wait for the most part, so that many can type beside one another.
std::map<AlertResponse, int> responsesDuringTyping(bool withMoves) {
  constexpr std::uint32_t people = 20;
  std::vector<std::future<std::vector<AlertResponse>>> typists;
  for (std::uint32_t person = 0; person < people; ++person) {
    typists.push_back(std::async(std::launch::async, [=] {
      std::vector<AlertResponse> responses;
      for (std::uint32_t seed = person; seed < typings; seed += people) {
        responses.push_back(responseDuring(randomTyping(seed, withMoves)));
      }
      return responses;
    }));
  }
  std::map<AlertResponse, int> responses;
  for (auto& typist : typists) {
    for (const AlertResponse response : typist.get()) ++responses[response];
  }
  return responses;
}

TEST(TypingAtATerminal, AnswersNothing) {
  const auto responses = responsesDuringTyping(false);
  EXPECT_THAT(responses, testing::ElementsAre(testing::Pair(AlertResponseNobody, typings)));
}

TEST(TypingAtATerminal, WithTabsArrowsAndAltAllowsNothing) {
  auto responses = responsesDuringTyping(true);
  EXPECT_EQ(responses[AlertResponseDefaultButton], 0);
  RecordProperty("refused", responses[AlertResponseAlternateButton]);
}

}  // namespace
}  // namespace palisade
