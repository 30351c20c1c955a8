#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

#include "Host/Accounts/StoredAccount.h"
#include "Tests/Host/Store/AccountStoreFixture.h"

namespace palisade {

void PrintTo(const StoreChange& change, std::ostream* stream) {
  *stream << (change.kind == StoreChange::Kind::accounts ? "accounts of " : "authorizations of ")
          << change.accountTypeIdentifier << ", client " << change.clientID.value_or("none");
}

namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::Eq;
using testing::Field;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Ne;
using testing::Optional;
using testing::SizeIs;

auto isChange(StoreChange::Kind kind, const std::string& type, const std::optional<std::string>& client) {
  return AllOf(Field(&StoreChange::kind, kind), Field(&StoreChange::accountTypeIdentifier, type),
               Field(&StoreChange::clientID, client));
}

class Accounts : public AccountStoreFixture {
 protected:
  std::vector<std::string> usernames() {
    std::vector<std::string> names;
    for (const AccountRecord& account : store->accounts()) names.push_back(account.username);
    return names;
  }
};

TEST_F(Accounts, AreThereAfterARestartInTheOrderInWhichTheyWereAdded) {
  store->addAccount(facebookType.identifier(), "zoe", "Zoë’s account");
  store->addAccount(otherType.identifier(), "bob", "Bob");
  store->addAccount(facebookType.identifier(), "alice", "Alice");
  restart();

  const auto accounts = store->accountsWithAccountTypeIdentifier(facebookType.identifier());
  ASSERT_THAT(accounts, SizeIs(2));
  EXPECT_EQ(accounts[0]->description(), "Zoë’s account");
  EXPECT_EQ(accounts[1]->description(), "Alice");
  EXPECT_EQ(dynamic_cast<const StoredAccount&>(*accounts[0]).username(), "zoe");
  EXPECT_THAT(usernames(), ElementsAre("zoe", "bob", "alice"));
}

TEST_F(Accounts, HaveAnIdentityThatNoLaterAccountGets) {
  const AccountRecord first = store->addAccount(facebookType.identifier(), "alice", "Alice");
  EXPECT_THAT(first.id, SizeIs(32));
  EXPECT_TRUE(store->removeAccount(first.id));
  EXPECT_THAT(store->addAccount(facebookType.identifier(), "alice", "Alice").id, Ne(first.id));
}

TEST_F(Accounts, OfOneTypeHaveUnlikeUserNames) {
  store->addAccount(facebookType.identifier(), "alice", "Alice");
  EXPECT_THROW(store->addAccount(facebookType.identifier(), "alice", "Alice again"), SqliteError);
  EXPECT_NO_THROW(store->addAccount(otherType.identifier(), "alice", "Alice elsewhere"));
}

TEST_F(Accounts, AreRemovedOnce) {
  const AccountRecord account = store->addAccount(facebookType.identifier(), "alice", "Alice");
  EXPECT_TRUE(store->removeAccount(account.id));
  EXPECT_FALSE(store->removeAccount(account.id));
  restart();
  EXPECT_THAT(usernames(), IsEmpty());
}

TEST_F(Accounts, TellTheListenerWhatHasChanged) {
  const AccountRecord account = store->addAccount(facebookType.identifier(), "alice", "Alice");
  store->removeAccount(account.id);
  store->removeAccount(account.id);
  const auto changed = isChange(StoreChange::Kind::accounts, facebookType.identifier(), std::nullopt);
  EXPECT_THAT(changes, ElementsAre(changed, changed));
}

class Authorizations : public AccountStoreFixture {};

TEST_F(Authorizations, AreThereAfterARestart) {
  ASSERT_EQ(set("one", grantNumber(1)), std::nullopt);
  ASSERT_EQ(set("two", refusal), std::nullopt);
  restart();
  EXPECT_THAT(get("one"), Optional(grantNumber(1)));
  EXPECT_THAT(get("two"), Optional(refusal));
}

TEST_F(Authorizations, SayWhenTheyWereStored) {
  const auto before = std::chrono::floor<std::chrono::seconds>(std::chrono::system_clock::now());
  set("one", grantNumber(1));
  const auto stored = store->storedAuthorizations(facebookType.identifier());
  ASSERT_THAT(stored, SizeIs(1));
  EXPECT_GE(stored[0].updatedAt, before);
  EXPECT_LE(stored[0].updatedAt, std::chrono::system_clock::now());
}

TEST_F(Authorizations, OfAKnownClientNameTheObjectOfTheDirectory) {
  const auto known = makeClient("known");
  directory.introduce(known);
  set("known", refusal);
  EXPECT_EQ(store->storedAuthorizations(facebookType.identifier()).at(0).record->client(), known);
}

TEST_F(Authorizations, OfAClientThatIsGoneRememberWhatItWasCalled) {
  set("gone", refusal);
  restart();
  const auto client = store->allAuthorizationsForAccountType(facebookType).at(0)->client();
  ASSERT_NE(client, nullptr);
  EXPECT_EQ(client->bundleID(), "bundle.gone");
  EXPECT_EQ(client->localizedAppName(), "App gone");
  EXPECT_EQ(client->description(), "gone");
  EXPECT_FALSE(client->hasEntitlement("com.veltran.accounts.all-access"));
}

TEST_F(Authorizations, TellTheListenerWhoseHaveChanged) {
  set("one", grantNumber(1));
  store->removeAllClientAuthorizationsForAccountType(facebookType);
  const std::string type = facebookType.identifier();
  EXPECT_THAT(changes, ElementsAre(isChange(StoreChange::Kind::authorizations, type, "one"),
                                   isChange(StoreChange::Kind::authorizations, type, std::nullopt)));
}

TEST_F(Authorizations, AreReadFromTheDiskOnceAndSayWhenTheyAre) {
  int announced = 0;
  store = nullptr;
  store =
      std::make_unique<SqliteAccountStore>(AccountStoreOptions{.path = path, .beforeDisk = [&] { ++announced; }}, directory);
  set("one", grantNumber(1));
  EXPECT_EQ(announced, 1);
  for (int read = 0; read < 3; ++read) EXPECT_THAT(get("one"), Optional(grantNumber(1)));
  EXPECT_EQ(announced, 2);
  for (int read = 0; read < 3; ++read) store->accountsWithAccountTypeIdentifier(facebookType.identifier());
  EXPECT_EQ(announced, 3);
  get("nobody");
  EXPECT_EQ(announced, 4);
}

TEST_F(Authorizations, MayBeReadByTheListener) {
  std::optional<RecordContent> seen;
  store.reset();
  store = std::make_unique<SqliteAccountStore>(
      AccountStoreOptions{.path = path, .onChange = [&](const StoreChange& change) { seen = get(*change.clientID); }},
      directory);
  set("one", grantNumber(1));
  EXPECT_THAT(seen, Optional(grantNumber(1)));
}

TEST_F(Authorizations, ThatNobodyGaveCountUntilTheyAreRemoved) {
  ASSERT_EQ(setByNobody("one"), std::nullopt);
  EXPECT_THAT(get("one"), Optional(refusal));
  EXPECT_TRUE(store->storedAuthorizations(facebookType.identifier()).at(0).isAnsweredByNobody);
  EXPECT_EQ(store->removeAnswersByNobodyForClient(*makeClient("one")), std::nullopt);
  EXPECT_EQ(get("one"), std::nullopt);
}

TEST_F(Authorizations, ThatNobodyGaveAreRemovedForTheAskedClientOnly) {
  setByNobody("one");
  setByNobody("two");
  store->removeAnswersByNobodyForClient(*makeClient("one"));
  EXPECT_EQ(get("one"), std::nullopt);
  EXPECT_THAT(get("two"), Optional(refusal));
}

TEST_F(Authorizations, ThatNobodyGaveAreRemovedForAllAtTheNextStart) {
  setByNobody("one");
  setByNobody("two");
  set("refused by the user", refusal);
  set("granted", grantNumber(1));
  restart();
  EXPECT_EQ(store->removeAllAnswersByNobody(), std::nullopt);
  EXPECT_EQ(get("one"), std::nullopt);
  EXPECT_EQ(get("two"), std::nullopt);
  EXPECT_THAT(get("refused by the user"), Optional(refusal));
  EXPECT_THAT(get("granted"), Optional(grantNumber(1)));
}

TEST_F(Authorizations, ThatSomebodyGaveAfterwardsStay) {
  setByNobody("one");
  set("one", refusal);
  store->removeAllAnswersByNobody();
  EXPECT_THAT(get("one"), Optional(refusal));
}

TEST_F(Authorizations, AreNeverGrantsByNobody) {
  const std::optional<Error> error = setByNobody("one", grantNumber(1));
  ASSERT_TRUE(error);
  EXPECT_EQ(error->domain, StoreErrorDomain);
  EXPECT_EQ(get("one"), std::nullopt);
}

struct OptionValue {
  const char* name;
  Value value;
};

void PrintTo(const OptionValue& option, std::ostream* stream) { *stream << option.name; }

class AnOption : public AccountStoreFixture, public testing::WithParamInterface<OptionValue> {
 protected:
  RecordContent content() const { return {.isGranted = true, .options = Dictionary{{"key", GetParam().value}}}; }
};

class AnOptionThatCanBeKept : public AnOption {};
class AnOptionThatCannotBeKept : public AnOption {};

TEST_P(AnOptionThatCanBeKept, KeepsItsTypeThroughARestart) {
  ASSERT_EQ(set("one", content()), std::nullopt);
  restart();
  EXPECT_THAT(get("one"), Optional(content()));
}

Value nested(int levels) {
  Value value("innermost");
  for (int level = 0; level < levels; ++level) value = Array{value};
  return value;
}

INSTANTIATE_TEST_SUITE_P(
    Kinds, AnOptionThatCanBeKept,
    testing::Values(OptionValue{"null", nullptr}, OptionValue{"true", true}, OptionValue{"false", false},
                    OptionValue{"zero", 0}, OptionValue{"negative", -1},
                    OptionValue{"least", std::numeric_limits<std::int64_t>::min()},
                    OptionValue{"greatest", std::numeric_limits<std::int64_t>::max()},
                    OptionValue{"aboveTheSignedRange", std::uint64_t{1} << 63U},
                    OptionValue{"greatestUnsigned", std::numeric_limits<std::uint64_t>::max()}, OptionValue{"wholeReal", 1.0},
                    OptionValue{"zeroReal", 0.0}, OptionValue{"real", 0.1}, OptionValue{"largeReal", 1e300},
                    OptionValue{"smallestReal", std::numeric_limits<double>::denorm_min()},
                    OptionValue{"realLikeAnInteger", 9007199254740993.0}, OptionValue{"emptyString", ""},
                    OptionValue{"stringLikeANumber", "1"}, OptionValue{"stringLikeNull", "null"},
                    OptionValue{"oddString", "quote \" backslash \\ newline \n tab \t \x7f ä 😀 \xe2\x80\xa8"},
                    OptionValue{"emptyArray", Array{}}, OptionValue{"emptyDictionary", Dictionary{}},
                    OptionValue{"mixedArray", Array{1, 1.0, "1", true, nullptr, Array{}, Dictionary{{"a", -0.5}}}},
                    OptionValue{"nestedDictionary", Dictionary{{"z", Dictionary{{"", nullptr}}}, {"a", Array{nullptr}}}},
                    OptionValue{"deepArray", nested(400)}),
    [](const auto& each) { return each.param.name; });

TEST_P(AnOptionThatCannotBeKept, IsRefusedAndChangesNothing) {
  set("one", grantNumber(1));
  const std::optional<Error> error = set("one", content());
  ASSERT_TRUE(error);
  EXPECT_EQ(error->code, StoreErrorNotRepresentable);
  EXPECT_THAT(error->description, Optional(HasSubstr("options")));
  EXPECT_THAT(get("one"), Optional(grantNumber(1)));
}

INSTANTIATE_TEST_SUITE_P(Kinds, AnOptionThatCannotBeKept,
                         testing::Values(OptionValue{"notANumber", std::numeric_limits<double>::quiet_NaN()},
                                         OptionValue{"infinite", std::numeric_limits<double>::infinity()},
                                         OptionValue{"notUtf8", "\xff"}, OptionValue{"nullCharacter", std::string(1, '\0')},
                                         OptionValue{"tooDeep", nested(600)}),
                         [](const auto& each) { return each.param.name; });

class History : InMemory, public AccountStoreFixture {
 protected:
  enum Reason { askedNobody, askedAPerson };

  void append(const std::optional<std::string>& client, int second, bool granted = true, Reason reason = askedNobody) {
    const HistoryEntry entry{.last = Date(std::chrono::seconds(second)),
                             .accountTypeIdentifier = facebookType.identifier(),
                             .bundleID = client,
                             .granted = granted,
                             .userPrompted = reason == askedAPerson,
                             .elapsedSeconds = 0.5};
    ASSERT_EQ(store->appendToHistory({&entry, 1}), std::nullopt);
  }

  // Rows that do not repeat each other.
  void appendMany(const std::string& client, int count, int second = 0) {
    for (int number = 0; number < count; ++number) append(client, second + number, number % 2 == 0);
  }

  std::vector<int> seconds(const HistoryFilter& filter) {
    std::vector<int> result;
    for (const HistoryEntry& entry : store->history(filter)) {
      result.push_back(static_cast<int>(entry.last.time_since_epoch().count()));
    }
    return result;
  }
};

TEST_F(History, KeepsEveryField) {
  const HistoryEntry entry{.last = Date(std::chrono::seconds(-5)),
                           .accountTypeIdentifier = "type",
                           .bundleID = std::nullopt,
                           .granted = false,
                           .userPrompted = true,
                           .elapsedSeconds = 1.25};
  store->appendToHistory({&entry, 1});
  restart();
  const auto entries = store->history({});
  ASSERT_THAT(entries, SizeIs(1));
  EXPECT_EQ(entries[0].first, Date(std::chrono::seconds(-5)));
  EXPECT_EQ(entries[0].last, Date(std::chrono::seconds(-5)));
  EXPECT_EQ(entries[0].count, 1);
  EXPECT_EQ(entries[0].accountTypeIdentifier, "type");
  EXPECT_EQ(entries[0].bundleID, std::nullopt);
  EXPECT_FALSE(entries[0].granted);
  EXPECT_TRUE(entries[0].userPrompted);
  EXPECT_EQ(entries[0].elapsedSeconds, 1.25);
}

TEST_F(History, IsListedNewestFirstWhateverTheClockSaid) {
  bool granted = false;
  for (const int second : {10, 30, 20}) append("a", second, granted = !granted);
  EXPECT_THAT(seconds({}), ElementsAre(20, 30, 10));
}

TEST_F(History, IsListedForOneClientAndUpToALimit) {
  for (int second = 1; second <= 6; ++second) append(second % 2 == 0 ? "even" : "odd", second, second % 4 < 2);
  EXPECT_THAT(seconds({.limit = 2}), ElementsAre(6, 5));
  EXPECT_THAT(seconds({.limit = 2, .bundleID = "odd"}), ElementsAre(5, 3));
  EXPECT_THAT(seconds({.bundleID = "nobody"}), IsEmpty());
  EXPECT_THAT(seconds({.limit = 0}), IsEmpty());
}

TEST_F(History, CountsWhatRepeatsInOneRow) {
  for (int second = 0; second < 1'000; ++second) append("a", second, false);
  const auto entries = store->history({});
  ASSERT_THAT(entries, SizeIs(1));
  EXPECT_EQ(entries[0].count, 1'000);
  EXPECT_EQ(entries[0].first, Date(std::chrono::seconds(0)));
  EXPECT_EQ(entries[0].last, Date(std::chrono::seconds(999)));
}

TEST_F(History, HasARowOfItsOwnForEveryOtherAnswerReasonClientAndOrder) {
  append("a", 1);
  append("a", 2, false);
  append("a", 3, false, askedAPerson);
  append("a", 4);
  append("b", 5);
  append("a", 6);
  append(std::nullopt, 7);
  append(std::nullopt, 8);
  EXPECT_THAT(seconds({}), ElementsAre(8, 6, 5, 3, 2, 1)) << "4 and 6 are equal and follow each other, and so are 7 and 8";
}

TEST_F(History, GivesAClientAShareAndTakesNothingFromOthers) {
  append("quiet", 1);
  appendMany("loud", 3 * SqliteAccountStore::historyShareOfClient, 10);
  EXPECT_THAT(store->history({.limit = 10'000, .bundleID = "loud"}),
              SizeIs(static_cast<std::size_t>(SqliteAccountStore::historyShareOfClient)));
  EXPECT_EQ(seconds({.limit = 1}), std::vector{10 + 3 * static_cast<int>(SqliteAccountStore::historyShareOfClient) - 1});
  EXPECT_THAT(seconds({.bundleID = "quiet"}), ElementsAre(1));
}

TEST_F(History, KeepsLongestWhatAPersonDecided) {
  append("a", 1, true, askedAPerson);
  append("a", 2, false, askedAPerson);
  appendMany("a", 3 * SqliteAccountStore::historyShareOfClient, 10);
  const auto kept = seconds({.limit = 10'000});
  ASSERT_THAT(kept, SizeIs(static_cast<std::size_t>(SqliteAccountStore::historyShareOfClient)));
  EXPECT_EQ(kept.back(), 1);
  EXPECT_EQ(kept[kept.size() - 2], 2);
}

TEST_F(History, ShowsTheNewestAnswerBesideAnyNumberOfDecisions) {
  for (int number = 0; number < SqliteAccountStore::historyShareOfClient; ++number) {
    append("a", number, number % 2 == 0, askedAPerson);
  }
  append("a", 1'000);
  const auto kept = seconds({.limit = 10'000});
  EXPECT_THAT(kept, SizeIs(static_cast<std::size_t>(SqliteAccountStore::historyShareOfClient)));
  EXPECT_EQ(kept.front(), 1'000);
  EXPECT_EQ(kept.back(), 1);
}

TEST_F(History, IsBoundedForAnyNumberOfClients) {
  append("decided", 1, true, askedAPerson);
  for (int client = 0; client < 30; ++client) appendMany("client " + std::to_string(client), 100, 10);
  EXPECT_THAT(store->history({.limit = 10'000}), SizeIs(static_cast<std::size_t>(SqliteAccountStore::historyCapacity)));
  EXPECT_THAT(seconds({.bundleID = "decided"}), ElementsAre(1));
}

}  // namespace
}  // namespace palisade
