// Texts and log messages are filled in one pass, and an argument is copied as it stands.

#include <gmock/gmock.h>

#include <array>

#include "Platform/Format.h"

namespace palisade {
namespace {

struct FilledText {
  std::string_view format;
  std::initializer_list<std::string_view> arguments;
  std::string_view result;
};

TEST(ATextFormat, TakesItsArgumentsInOrder) {
  const FilledText cases[] = {
      {"", {}, ""},
      {"no placeholder", {}, "no placeholder"},
      {"%@", {"whole"}, "whole"},
      {"%@ would like to %@.", {"Mail", "see your photos"}, "Mail would like to see your photos."},
      {"%@%@", {"a", "b"}, "ab"},
      {"“%@” ’n’ %@", {"ä", "ö"}, "“ä” ’n’ ö"},
  };
  for (const auto& [format, arguments, result] : cases) EXPECT_EQ(formatText(format, arguments), result) << format;
}

TEST(AnArgument, IsCopiedVerbatimAlsoWhenItLooksLikeAFormat) {
  const FilledText cases[] = {
      {"%@ and %@", {"%@", "b"}, "%@ and b"},
      {"%@ and %@", {"%@%@%@", "%d %% %s %n"}, "%@%@%@ and %d %% %s %n"},
      {"%%@", {"@"}, "%@"},
      {"%@@", {"%"}, "%@"},
      {"%@", {std::string_view("a\0b", 3)}, std::string_view("a\0b", 3)},
      {"%@", {"\xff\xfe"}, "\xff\xfe"},
      {"%@", {"a\nb"}, "a\nb"},
  };
  for (const auto& [format, arguments, result] : cases) EXPECT_EQ(formatText(format, arguments), result) << format;
}

TEST(ASurplusArgument, IsIgnored) {
  EXPECT_EQ(formatText("%@", {"a", "b"}), "a");
  EXPECT_EQ(formatText("none", {"a"}), "none");
  EXPECT_EQ(formatText("", {"a"}), "");
}

TEST(AMissingArgument, LeavesNothing) {
  EXPECT_EQ(formatText("[%@][%@]", {"a"}), "[a][]");
  EXPECT_EQ(formatText("[%@]", {}), "[]");
}

TEST(APercentSignInAText, StandsForItselfUnlessAnAtSignFollows) {
  const FilledText cases[] = {
      {"%d of %@", {"a"}, "%d of a"}, {"100%", {"a"}, "100%"}, {"%% %s %n %1$@", {"a"}, "%% %s %n %1$@"}, {"%", {}, "%"},
      {"%%@", {"a"}, "%a"},           {"%@%", {"a"}, "a%"},
  };
  for (const auto& [format, arguments, result] : cases) EXPECT_EQ(formatText(format, arguments), result) << format;
}

std::string logMessage(std::string_view format, std::span<const LogArgument> arguments) {
  return formatLogMessage(
      {.place = "operation:", .level = LogLevel::debug, .format = format, .argumentNames = "", .arguments = arguments});
}

TEST(ALogFormat, TakesANumberForItsOtherPlaceholderFromTheSameArguments) {
  const std::array<LogArgument, 3> arguments{LogArgument(std::string_view("a")), LogArgument(std::size_t{3}),
                                             LogArgument(std::string_view("%d%@"))};

  EXPECT_EQ(logMessage("%@ has %d of %@.", arguments), "a has 3 of %d%@.");
}

TEST(ALogFormat, BearsTooFewAndTooManyArguments) {
  const std::array<LogArgument, 2> arguments{LogArgument(std::size_t{1}), LogArgument(std::size_t{2})};

  EXPECT_EQ(logMessage("Found %d.", arguments), "Found 1.");
  EXPECT_EQ(logMessage("%d %@ [%d][%@] 5%", arguments), "1 2 [][] 5%");
}

}  // namespace
}  // namespace palisade
