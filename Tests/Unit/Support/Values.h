#pragma once

/// Short ways to write the values of a test, to compare them, and to show them when a test fails.

#include <initializer_list>
#include <optional>
#include <ostream>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <gmock/gmock.h>

#include "Platform/AccountConstants.h"
#include "Platform/Format.h"
#include "Testing/FakePlatform.h"

namespace palisade {

inline const std::string photosAppID = "1234567890";

/// Options as a well-behaved client passes them.
inline Dictionary optionsAskingFor(Array permissions, std::optional<std::string_view> audience = std::nullopt,
                                   std::string appID = photosAppID) {
  Dictionary options{{std::string(FacebookAppIdKey), std::move(appID)},
                     {std::string(FacebookPermissionsKey), std::move(permissions)}};
  if (audience) options.set(std::string(FacebookAudienceKey), *audience);
  return options;
}

/// What a grant keeps of such options.
inline Dictionary persistentOptions(std::optional<std::string_view> audience = std::nullopt, std::string appID = photosAppID) {
  Dictionary options{{std::string(FacebookAppIdKey), std::move(appID)}};
  if (audience) options.set(std::string(FacebookAudienceKey), *audience);
  return options;
}

inline PermissionSetRef permissionSet(std::initializer_list<std::string> names) {
  return std::make_shared<const PermissionSet>(names);
}

inline Error accountsError(int code, std::optional<std::string> description = std::nullopt) {
  return {.domain = std::string(AccountsErrorDomain), .code = code, .description = std::move(description)};
}

// What a completion was called with.

inline auto isGrant() { return ::testing::FieldsAre(true, ::testing::Eq(std::nullopt)); }
inline auto isRefusalWithoutError() { return ::testing::FieldsAre(false, ::testing::Eq(std::nullopt)); }
inline auto isRefusalWith(Error error) { return ::testing::FieldsAre(false, ::testing::Optional(std::move(error))); }
inline auto isUnexpectedFailureAnswer() {
  return ::testing::FieldsAre(false, ::testing::Optional(::testing::FieldsAre(
                                         std::string(AccountsErrorDomain), int{AccountsErrorUnexpectedFailure},
                                         ::testing::Optional(::testing::Not(::testing::IsEmpty())), ::testing::IsEmpty())));
}

/// A log record without its source file and line.
struct LogLine {
  int level = 0;
  std::string operation;
  std::string format;
  std::vector<std::string> arguments = {};
  std::string argumentNames = {};

  friend bool operator==(const LogLine&, const LogLine&) = default;
};

inline std::vector<LogLine> logLines(const Trace& trace) {
  std::vector<LogLine> lines;
  for (const Event& event : trace.named("log")) {
    LogLine line{.level = static_cast<int>(*event["level"].integer()),
                 .operation = *event["operationName"].string(),
                 .format = *event["format"].string(),
                 .argumentNames = *event["argumentNames"].string()};
    for (const Value& argument : *event["args"].array()) line.arguments.push_back(*argument.string());
    lines.push_back(std::move(line));
  }
  return lines;
}

/// What the plug-in asked of its platform, in order: the events' names, log records as their format in quotes. The set-up that
/// is made once a process is left out, because it happens in whichever test comes first.
inline std::vector<std::string> stepsOf(const Trace& trace) {
  std::vector<std::string> steps;
  for (const Event& event : trace.events()) {
    if (event.name == "Queue.create" || event.name == "NotificationBus.register") continue;
    steps.push_back(event.name == "log" ? '"' + *event["format"].string() + '"' : event.name);
  }
  return steps;
}

/// The permissions of every consent message that was made, as the log names them: "{email, user_likes}".
inline std::vector<std::string> consentAskedFor(const Trace& trace) {
  std::vector<std::string> asked;
  for (const LogLine& line : logLines(trace)) {
    if (line.format == "Generating user message for permission: %@.") asked.push_back(line.arguments.at(0));
  }
  return asked;
}

/// A trace's form of a set.
inline Value tracedSet(Array sortedNames) { return Dictionary{{"$set", std::move(sortedNames)}}; }

// What the server answers.

inline ServerAnswer serverGrants(Array permissions, Delivery delivery = Delivery::onThread) {
  return {.data = compactJson(Dictionary{{"access_token", "client token"}, {"permissions", std::move(permissions)}}),
          .delivery = delivery};
}

inline const Error networkDown{
    .domain = "org.example.network", .code = 7, .description = "No route to host", .furtherInfo = {{"attempts", 3}}};
inline ServerAnswer serverCannotBeReached() { return {.error = networkDown}; }

/// The name of a row of a table test.
template <typename Case>
std::string nameOfCase(const ::testing::TestParamInfo<Case>& row) {
  return row.param.name;
}

// How values look in the output of a failing test.

inline void PrintTo(const Value& value, std::ostream* stream) { *stream << compactJson(value); }
inline void PrintTo(const Dictionary& dictionary, std::ostream* stream) { *stream << compactJson(Value(dictionary)); }
inline void PrintTo(const Error& error, std::ostream* stream) { *stream << describe(error); }
inline void PrintTo(const CompletionCall& call, std::ostream* stream) {
  *stream << (call.granted ? "granted" : "refused") << ", " << (call.error ? describe(*call.error) : "no error");
}
inline void PrintTo(const LogLine& line, std::ostream* stream) {
  *stream << '(' << line.level << ") " << line.operation << ": \"" << line.format << "\" [" << line.argumentNames
          << "] =" << ::testing::PrintToString(line.arguments);
}

}  // namespace palisade
