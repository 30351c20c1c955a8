// How values, errors, permission sets and log arguments are rendered for people.

#include <gmock/gmock.h>

#include "Platform/Account.h"
#include "Platform/Client.h"
#include "Platform/Format.h"

namespace palisade {
namespace {

struct NamedClient final : Client {
  std::optional<std::string> bundleID() const override { return "not the description"; }
  std::string localizedAppName() const override { return "not the description"; }
  bool hasEntitlement(std::string_view) const override { return false; }
  std::string description() const override { return "org.example.photos (pid 7)"; }
};

struct NamedAccount final : Account {
  std::string description() const override { return "me@example.org"; }
  void setAccountType(std::shared_ptr<const AccountType>) override {}
  std::shared_ptr<const AccountCredential> credential() const override { return nullptr; }
  void setCredential(std::shared_ptr<const AccountCredential>) override {}
};

TEST(ADescribedValue, IsAStringAsItStandsAndCompactJsonOtherwise) {
  const std::pair<Value, std::string> cases[] = {
      {"a \"b\" %@\n", "a \"b\" %@\n"},
      {"", ""},
      {nullptr, "null"},
      {true, "true"},
      {1.5, "1.5"},
      {Array{"a", 1}, R"(["a",1])"},
      {Dictionary{{"a", "b"}}, R"({"a":"b"})"},
  };
  for (const auto& [value, text] : cases) EXPECT_EQ(describe(value), text);
}

TEST(ADescribedError, NamesItsDomainItsCodeAndWhatItSays) {
  EXPECT_EQ(describe(Error{.domain = "AccountsErrorDomain", .code = 8}), "AccountsErrorDomain 8");
  EXPECT_EQ(describe(Error{.domain = "org.example", .code = -3, .description = "No route to host"}),
            "org.example -3: No route to host");
  EXPECT_EQ(describe(Error{.domain = "", .code = 0, .description = ""}), " 0: ");
}

TEST(ADescribedPermissionSet, ListsItsNamesInAlphabeticalOrder) {
  EXPECT_EQ(describe(PermissionSet{}), "{}");
  EXPECT_EQ(describe(PermissionSet{"email"}), "{email}");
  EXPECT_EQ(describe(PermissionSet{"user_likes", "email", "publish"}), "{email, publish, user_likes}");
  EXPECT_EQ(describe(PermissionSet{"", "b", "B"}), "{, B, b}");
}

TEST(ALogArgument, IsRenderedByItsKind) {
  const std::shared_ptr<const Client> client = std::make_shared<NamedClient>();
  const std::shared_ptr<Account> account = std::make_shared<NamedAccount>();
  const std::optional<std::string> text = "text";
  const Value value = Array{1, "two"};
  const std::optional<Error> error = Error{.domain = "D", .code = 1};
  const PermissionSetRef permissions = std::make_shared<const PermissionSet>(PermissionSet{"email"});

  EXPECT_EQ(describe(LogArgument(std::string_view("view %@"))), "view %@");
  EXPECT_EQ(describe(LogArgument(text)), "text");
  EXPECT_EQ(describe(LogArgument(std::size_t{42})), "42");
  EXPECT_EQ(describe(LogArgument(client)), "org.example.photos (pid 7)");
  EXPECT_EQ(describe(LogArgument(account)), "me@example.org");
  EXPECT_EQ(describe(LogArgument(value)), R"([1,"two"])");
  EXPECT_EQ(describe(LogArgument(&value)), R"([1,"two"])");
  EXPECT_EQ(describe(LogArgument(error)), "D 1");
  EXPECT_EQ(describe(LogArgument(permissions)), "{email}");
  EXPECT_EQ(describe(LogArgument(*permissions)), "{email}");
}

TEST(ALogArgumentThatIsNone, IsRenderedAsANullObjectWhateverItsKind) {
  const std::optional<std::string> text;
  const Value* value = nullptr;
  const std::optional<Error> error;
  const std::shared_ptr<const Client> client;
  const std::shared_ptr<Account> account;
  const PermissionSetRef permissions;

  for (const LogArgument& none : {LogArgument(text), LogArgument(value), LogArgument(error), LogArgument(client),
                                  LogArgument(account), LogArgument(permissions)}) {
    EXPECT_EQ(describe(none), "(null)");
  }
}

TEST(ALogArgumentOfANullValue, IsNotRenderedAsNone) { EXPECT_EQ(describe(LogArgument(Value())), "null"); }

}  // namespace
}  // namespace palisade
