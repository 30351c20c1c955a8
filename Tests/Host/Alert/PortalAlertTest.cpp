// The portal's alert: what its dialog is made of, and what the backend's reply means. The bus and real backends are tested from
// outside, by portal_test.py here and in Tests/Desktop.

#include "Host/Alert/PortalAlert.h"

#include <gmock/gmock.h>

namespace palisade {
namespace {

using std::chrono::milliseconds;

TEST(AReply, IsConsentOnlyIfItIsZeroAndAPersonCouldHaveReadTheQuestion) {
  struct Row {
    std::uint32_t response;
    milliseconds after;
    AlertResponse expected;
  };
  for (const Row& row :
       {Row{0, milliseconds(500), AlertResponseDefaultButton}, Row{0, milliseconds(499), AlertResponseNobody},
        Row{0, milliseconds(0), AlertResponseNobody}, Row{0, milliseconds(-1), AlertResponseNobody},
        Row{0, std::chrono::hours(24), AlertResponseDefaultButton}, Row{1, milliseconds(0), AlertResponseNobody},
        Row{1, milliseconds(5000), AlertResponseNobody}, Row{2, milliseconds(5000), AlertResponseNobody},
        Row{3, milliseconds(5000), AlertResponseNobody}, Row{256, milliseconds(5000), AlertResponseNobody},
        Row{UINT32_MAX, milliseconds(5000), AlertResponseNobody}}) {
    const AccessReply reply{.response = row.response, .after = row.after};
    EXPECT_EQ(responseOfReply(reply), row.expected) << row.response << " after " << row.after.count() << " ms";
  }
  EXPECT_EQ(responseOfReply(std::nullopt), AlertResponseNobody);
}

/// What became of a dialog, which says what it is told to say.
struct Conversation {
  std::string backend;
  AccessQuestion question;
  std::optional<AccessReply> reply = std::nullopt;
  Deadline deadline;
  bool isOpen = false;
  bool isTakenDown = false;
};

class RecordedDialog final : public AccessDialog {
 public:
  explicit RecordedDialog(Conversation& conversation) : _conversation(conversation) { _conversation.isOpen = true; }
  ~RecordedDialog() override { _conversation.isOpen = false; }

  std::optional<AccessReply> waitForReply(Deadline deadline) override {
    _conversation.deadline = deadline;
    return _conversation.reply;
  }
  void takeDown() override { _conversation.isTakenDown = true; }

 private:
  Conversation& _conversation;
};

class APortalAlert : public testing::Test {
 protected:
  PortalAlert::Options options() {
    return {.backend = [this] { return _backend; },
            .isReachable = [this](const std::string&) { return _isReachable; },
            .open = [this](const std::string& backend, const AccessQuestion& question) -> std::unique_ptr<AccessDialog> {
              _conversation.backend = backend;
              _conversation.question = question;
              return _hasBus ? std::make_unique<RecordedDialog>(_conversation) : nullptr;
            },
            .subject = [this] { return _subject; },
            .languages = [this] { return _languages; }};
  }

  std::shared_ptr<AlertHandle> show(int* error = nullptr) {
    return _alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, error, _description);
  }

  AccessQuestion questionAsked() {
    show();
    return _conversation.question;
  }

  std::optional<std::string> _backend = "org.example.Backend";
  bool _isReachable = true;
  bool _hasBus = true;
  std::optional<AlertSubject> _subject = AlertSubject{.applicationName = "Photos",
                                                      .applicationID = "org.example.photos",
                                                      .certainty = AlertCertainty::certain,
                                                      .account = "ada@example.org"};
  std::string _languages = "en";
  AlertDescription _description{.header = "Allow Access?",
                                .message = "“Photos” asks.",
                                .alternateButtonTitle = "Don’t Allow",
                                .defaultButtonTitle = "Allow"};
  Conversation _conversation;
  PortalAlert _alert{options()};
};

TEST_F(APortalAlert, SaysWhoAsksAndForWhatAccount) {
  const AccessQuestion question = questionAsked();
  EXPECT_EQ(_conversation.backend, "org.example.Backend");
  EXPECT_EQ(question.title, "Allow Access?");
  EXPECT_EQ(question.subtitle, "“\u2068Photos\u2069” asks.");
  EXPECT_EQ(question.body,
            "Application: \u2068Photos\u2069\n\u2068org.example.photos\u2069\nIdentity: Certain (sandboxed)\n"
            "Account: \u2068ada@example.org\u2069");
  EXPECT_EQ(question.denyLabel, "Don’t Allow");
  EXPECT_EQ(question.grantLabel, "Allow");
}

TEST_F(APortalAlert, SaysWhatIsOnlyClaimedInTheUsersLanguage) {
  _subject->certainty = AlertCertainty::claimed;
  _subject->applicationID = "Photos";
  _subject->account = "";
  _languages = "de_AT:de:en";
  EXPECT_EQ(questionAsked().body, "Anwendung: \u2068Photos\u2069\nIdentität: Nur behauptet (nicht in einer Sandbox)");
}

TEST_F(APortalAlert, SaysNothingOfWhoAsksWhenThatIsNotKnown) {
  _subject.reset();
  EXPECT_EQ(questionAsked().body, "");
}

TEST_F(APortalAlert, HasNoMarkupFormatsKeysOrLinesButItsOwn) {
  _description = {.header = "<b>100 %s</b>\n%n",
                  .message = "“<i>Snap & Share</i>” asks: &lt;yes&gt;",
                  .alternateButtonTitle = "_No_",
                  .defaultButtonTitle = "<u>Yes</u>"};
  _subject = AlertSubject{.applicationName = "<i>Snap & Share</i>",
                          .applicationID = "a\nIdentity: Certain (sandboxed)",
                          .account = "&amp;\u202Etxet"};
  const AccessQuestion question = questionAsked();
  EXPECT_EQ(question.title, "‹b›100 ٪s‹/b› ٪n");
  EXPECT_EQ(question.subtitle, "“\u2068‹i›Snap &\u2060 Share‹/i›\u2069” asks: &\u2060lt;yes&\u2060gt;");
  EXPECT_EQ(question.body,
            "Application: \u2068‹i›Snap &\u2060 Share‹/i›\u2069\n\u2068a Identity: Certain (sandboxed)\u2069\n"
            "Identity: Only claimed (not sandboxed)\nAccount: \u2068&\u2060amp;txet\u2069");
  EXPECT_EQ(question.denyLabel, "__No__");
  EXPECT_EQ(question.grantLabel, "‹u›Yes‹/u›");
}

TEST_F(APortalAlert, PassesOnWhatTheReplyMeans) {
  for (const auto& [word, expected] : {std::pair<std::uint32_t, AlertResponse>{0, AlertResponseDefaultButton},
                                       {1, AlertResponseNobody},
                                       {2, AlertResponseNobody}}) {
    _conversation.reply = AccessReply{.response = word, .after = std::chrono::seconds(1)};
    AlertResponse response = 42;
    EXPECT_EQ(_alert.receiveResponse(show(), 0, response), 0);
    EXPECT_EQ(response, expected);
    EXPECT_EQ(_conversation.deadline, Deadline::max());
  }
}

TEST_F(APortalAlert, IsNobodysAnswerWithoutAReply) {
  AlertResponse response = AlertResponseDefaultButton;
  EXPECT_EQ(_alert.receiveResponse(show(), 3600, response), 0);
  EXPECT_EQ(response, AlertResponseNobody);
  EXPECT_LT(_conversation.deadline, std::chrono::steady_clock::now() + std::chrono::hours(2));
}

TEST_F(APortalAlert, TakesItsDialogDownAndClosesItWhenItIsReleased) {
  auto handle = show();
  EXPECT_TRUE(_conversation.isOpen);
  PortalAlert::takeDown(handle);
  EXPECT_TRUE(_conversation.isTakenDown);
  _alert.releaseAlert(std::move(handle));
  EXPECT_FALSE(_conversation.isOpen);
}

TEST_F(APortalAlert, IsNotCreatedWithoutABus) {
  _hasBus = false;
  int error = 0;
  EXPECT_EQ(show(&error), nullptr);
  EXPECT_NE(error, 0);
  EXPECT_EQ(show(), nullptr);
}

TEST_F(APortalAlert, IsNotCreatedWithoutABackendAndIsNobodysAnswer) {
  _backend.reset();
  int error = 0;
  EXPECT_EQ(show(&error), nullptr);
  EXPECT_NE(error, 0);
  AlertResponse response = AlertResponseDefaultButton;
  EXPECT_NE(_alert.receiveResponse(nullptr, 0, response), 0);
  EXPECT_EQ(response, AlertResponseNobody);
  PortalAlert::takeDown(nullptr);
}

TEST_F(APortalAlert, SaysWhatToDoWhereNoBackendCanBeAsked) {
  EXPECT_EQ(_alert.backend(), "org.example.Backend");
  EXPECT_EQ(_alert.trouble(), std::nullopt);
  _isReachable = false;
  EXPECT_EQ(_alert.backend(), std::nullopt);
  EXPECT_THAT(_alert.trouble(),
              testing::Optional(testing::AllOf(testing::HasSubstr("org.example.Backend"), testing::HasSubstr("portals.conf"))));
  _backend.reset();
  EXPECT_EQ(_alert.backend(), std::nullopt);
  EXPECT_THAT(_alert.trouble(), testing::Optional(testing::HasSubstr("xdg-desktop-portal-gtk")));
}

}  // namespace
}  // namespace palisade
