#include "Tools/PluginReplay/AnswerReader.h"

#include <charconv>
#include <cstdint>
#include <limits>
#include <string>
#include <string_view>

#include "Tools/PluginReplay/ConstantNames.h"

namespace palisade {
namespace {

constexpr std::string_view neverWord = "never";

std::variant<std::monostate, AlertResponse, NeverAnswered> readWord(const JsonPlace& place) {
  if (place.isNull()) return {};
  if (place.value().string() != nullptr && place.text() == neverWord) return NeverAnswered{};
  if (const std::uint64_t* large = place.value().largeInteger(); large != nullptr) {
    if (*large <= std::numeric_limits<AlertResponse>::max()) return static_cast<AlertResponse>(*large);
  }
  const std::int64_t* number = place.value().integer();
  if (number == nullptr || *number < 0) place.fail("has to be an unsigned machine word, null or \"never\"");
  return static_cast<AlertResponse>(*number);
}

AlertAnswer readAlertAnswer(const JsonPlace& place) {
  const JsonObject object = place.object({"handle", "status", "word"});
  AlertAnswer answer;
  if (const auto handle = object.find("handle")) answer.handle = handle->boolean();
  if (const auto status = object.find("status")) answer.status = status->integer();
  if (const auto word = object.find("word")) answer.word = readWord(*word);
  return answer;
}

std::string readHex(const JsonPlace& place) {
  const std::string_view digits = place.text();
  if (digits.size() % 2 != 0) place.fail("has to be two hexadecimal digits a byte, but their number is odd");
  std::string bytes;
  for (std::size_t position = 0; position < digits.size(); position += 2) {
    const char* const first = digits.data() + position;
    std::uint8_t byte = 0;
    if (std::from_chars(first, first + 2, byte, 16).ptr != first + 2) {
      place.fail("has to be hexadecimal digits, but \"" + std::string(first, 2) + "\" at character " +
                 std::to_string(position + 1) + " is not");
    }
    bytes += static_cast<char>(byte);
  }
  return bytes;
}

Delivery readDelivery(const JsonPlace& place) {
  if (place.text() == "thread") return Delivery::onThread;
  if (place.text() == "inline") return Delivery::inLine;
  place.fail("has to be \"thread\" or \"inline\", is \"" + place.text() + "\"");
}

ServerAnswer readServerAnswer(const JsonPlace& place) {
  const JsonObject object = place.object({"body", "bodyHex", "error", "never", "delivery"});
  ServerAnswer answer;
  const auto body = object.find("body");
  const auto bodyHex = object.find("bodyHex");
  if (body && bodyHex) bodyHex->fail("an answer has either \"body\" or \"bodyHex\"");
  if (body) answer.data = body->text();
  if (bodyHex) answer.data = readHex(*bodyHex);
  if (const auto error = object.find("error")) answer.error = readErrorOrNull(*error);
  if (const auto delivery = object.find("delivery")) answer.delivery = readDelivery(*delivery);
  if (const auto never = object.find("never"); never && never->boolean()) answer.delivery = Delivery::never;
  return answer;
}

}  // namespace

std::optional<Error> readErrorOrNull(const JsonPlace& place) {
  if (place.isNull()) return std::nullopt;
  const JsonObject object = place.object({"domain", "code"});
  return Error{.domain = constantValue(object.require("domain").text()), .code = object.require("code").integer()};
}

std::vector<AlertAnswer> readAlertAnswers(const JsonPlace& place) {
  if (place.value().dictionary() != nullptr) return {readAlertAnswer(place)};
  if (place.value().array() == nullptr) place.failAsNo("an array or an object");
  std::vector<AlertAnswer> answers;
  for (const JsonPlace& element : place.elements()) answers.push_back(readAlertAnswer(element));
  return answers;
}

std::vector<ServerAnswer> readServerAnswers(const JsonPlace& place) {
  std::vector<ServerAnswer> answers;
  for (const JsonPlace& element : place.elements()) answers.push_back(readServerAnswer(element));
  return answers;
}

}  // namespace palisade
