// Where a session's user is asked: what was configured first, then a window, then the terminal, then nobody.

#include "Host/Alert/SessionAlert.h"

#include <gmock/gmock.h>
#include <netinet/in.h>
#include <stdlib.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstddef>
#include <cstring>
#include <filesystem>
#include <optional>

#include "Tests/Host/Alert/PseudoTerminal.h"
#include "Tests/Host/Identity/EnvironmentVariable.h"
#include "Tests/Host/OwnRoot.h"
#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using FrontEnd = AlertFrontEnd;

struct Situation {
  const char* name;
  std::optional<FrontEnd> choice;
  bool hasDisplay;
  bool hasTerminal;
  FrontEnd expected;
  bool isTrouble;
  bool hasPortal = false;
  bool keepsWindowsOnTop = true;
  const char* desktops = "";
};

class ASession : public testing::TestWithParam<Situation> {};

TEST_P(ASession, AsksWhereItCan) {
  const Situation& situation = GetParam();
  const PseudoTerminal terminal;
  const EnvironmentVariable desktops("XDG_CURRENT_DESKTOP", situation.desktops);
  SessionAlert::Options options{.choice = situation.choice, .desktop = {.helper = SCRIPTED_HELPER}};
  options.hasUsableDisplay = [&] { return situation.hasDisplay; };
  options.keepsWindowsOnTop = [&] { return situation.keepsWindowsOnTop; };
  options.portal.backend = [] { return "org.example.Backend"; };
  options.portal.isReachable = [&](const auto&) { return situation.hasPortal; };
  if (situation.hasTerminal) options.terminal = terminal.path();
  const SessionAlert alert(options);
  EXPECT_EQ(alert.frontEnd(), situation.expected);
  EXPECT_EQ(alert.description(),
            situation.expected == FrontEnd::portal ? "portal (org.example.Backend)" : nameOf(situation.expected));
  EXPECT_EQ(alert.trouble().has_value(), situation.isTrouble) << alert.trouble().value_or("");
}

INSTANTIATE_TEST_SUITE_P(
    InAnySituation, ASession,
    testing::Values(
        Situation{"NothingThere", std::nullopt, false, false, FrontEnd::nobody, true},
        Situation{"ADisplay", std::nullopt, true, false, FrontEnd::desktop, false},
        Situation{"ATerminal", std::nullopt, false, true, FrontEnd::terminal, false},
        Situation{"ANamedTerminalBesideADisplay", std::nullopt, true, true, FrontEnd::terminal, false},
        Situation{"TheDesktopChosen", FrontEnd::desktop, true, true, FrontEnd::desktop, false},
        Situation{"TheDesktopChosenWithoutADisplay", FrontEnd::desktop, false, true, FrontEnd::terminal, true},
        Situation{"TheDesktopChosenWithNothingThere", FrontEnd::desktop, false, false, FrontEnd::nobody, true},
        Situation{"TheTerminalChosenWithoutOne", FrontEnd::terminal, true, false, FrontEnd::desktop, true},
        Situation{"NobodyChosen", FrontEnd::nobody, true, true, FrontEnd::nobody, false},
        Situation{"APortalBesideADisplay", std::nullopt, true, false, FrontEnd::desktop, false, true},
        Situation{"APortalOnGnome", std::nullopt, true, false, FrontEnd::desktop, false, true, true, "ubuntu:GNOME"},
        Situation{"APortalOnGnomeWithoutLayers", std::nullopt, true, false, FrontEnd::portal, false, true, false,
                  "ubuntu:GNOME"},
        Situation{"APortalWhereNothingStaysOnTop", std::nullopt, true, false, FrontEnd::portal, false, true, false},
        Situation{"NoPortalWhereNothingStaysOnTop", std::nullopt, true, false, FrontEnd::desktop, false, false, false},
        Situation{"NoPortalOnGnome", std::nullopt, true, false, FrontEnd::desktop, false, false, true, "GNOME"},
        Situation{"APortalWithoutADisplay", std::nullopt, false, false, FrontEnd::nobody, true, true, false},
        Situation{"ANamedTerminalBesideAPortal", std::nullopt, true, true, FrontEnd::terminal, false, true, false},
        Situation{"ThePortalChosen", FrontEnd::portal, true, true, FrontEnd::portal, false, true},
        Situation{"ThePortalChosenWithoutABackend", FrontEnd::portal, true, true, FrontEnd::desktop, true},
        Situation{"ThePortalChosenWithoutADisplay", FrontEnd::portal, false, true, FrontEnd::terminal, true, true},
        Situation{"TheDesktopChosenOnGnome", FrontEnd::desktop, true, false, FrontEnd::desktop, false, true, false, "GNOME"}),
    [](const auto& instance) { return instance.param.name; });

class ADesktopSession : public testing::Test {
 protected:
  SessionAlert::Options options() {
    SessionAlert::Options options{.desktop = {.helper = SCRIPTED_HELPER}};
    options.hasUsableDisplay = [] { return true; };
    options.watchLock = [this](auto onLock) {
      _onLock = std::move(onLock);
      return std::shared_ptr<const void>(this, [this](const void*) { _onLock = nullptr; });
    };
    return options;
  }

  static std::shared_ptr<AlertHandle> show(SessionAlert& alert, const std::string& orders, bool dismissOnLock = true) {
    const AlertDescription description{.header = orders,
                                       .message = "“Photos” asks.",
                                       .alternateButtonTitle = "Don’t Allow",
                                       .defaultButtonTitle = "Allow",
                                       .dismissOnLock = dismissOnLock};
    return alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, description);
  }

  static AlertResponse responseTo(SessionAlert& alert, const std::shared_ptr<AlertHandle>& handle) {
    AlertResponse response = 42;
    EXPECT_EQ(alert.receiveResponse(handle, 0, response), 0);
    return response;
  }

  std::function<void()> _onLock;
};

TEST_F(ADesktopSession, PassesTheAnswerOn) {
  SessionAlert alert(options());
  EXPECT_EQ(responseTo(alert, show(alert, "allow")), AlertResponseDefaultButton);
  EXPECT_EQ(responseTo(alert, show(alert, "refuse")), AlertResponseAlternateButton);
}

TEST_F(ADesktopSession, TakesItsAlertDownWhenItLocks) {
  SessionAlert alert(options());
  const auto handle = show(alert, "linger");
  ASSERT_NE(_onLock, nullptr);
  _onLock();
  AlertResponse response = 42;
  EXPECT_EQ(alert.receiveResponse(handle, 0, response), ECANCELED);
  EXPECT_EQ(response, AlertResponseNobody);
}

TEST_F(ADesktopSession, ListensToLocksOnlyWhileAnAlertStandsThatIsToGo) {
  SessionAlert alert(options());
  auto handle = show(alert, "linger", false);
  EXPECT_EQ(_onLock, nullptr);
  alert.releaseAlert(std::move(handle));
  handle = show(alert, "linger");
  EXPECT_NE(_onLock, nullptr);
  alert.releaseAlert(std::move(handle));
  EXPECT_EQ(_onLock, nullptr);
}

TEST_F(ADesktopSession, AsksEvenIfItCannotHearOfLocks) {
  SessionAlert::Options deaf = options();
  deaf.watchLock = [](const auto&) -> std::shared_ptr<const void> { throw std::runtime_error("no bus"); };
  SessionAlert alert(deaf);
  EXPECT_EQ(responseTo(alert, show(alert, "allow")), AlertResponseDefaultButton);
}

TEST_F(ADesktopSession, TakesAnAlertDownOnDemand) {
  SessionAlert alert(options());
  const auto handle = show(alert, "linger");
  SessionAlert::takeDown(handle);
  EXPECT_EQ(responseTo(alert, handle), AlertResponseNobody);
}

TEST(ASessionWhosePortalWasChosen, SaysWhyAnotherAsksInItsPlace) {
  SessionAlert::Options options{.choice = FrontEnd::portal, .desktop = {.helper = SCRIPTED_HELPER}};
  options.hasUsableDisplay = [] { return true; };
  options.portal.backend = [] { return std::nullopt; };
  EXPECT_THAT(SessionAlert(options).trouble(), testing::Optional(testing::AllOf(testing::HasSubstr("the desktop shows them"),
                                                                                testing::HasSubstr("Install one"))));
  options.desktop.helper.clear();
  EXPECT_THAT(SessionAlert(options).trouble(),
              testing::Optional(testing::AllOf(testing::HasSubstr("Nobody can be asked"), testing::HasSubstr("Install one"))));
}

TEST(ASessionWithAPortal, ShowsItsAlertsThereAndTakesThemDown) {
  struct Dialog final : AccessDialog {
    explicit Dialog(bool& flag) : isTakenDown(flag) {}
    std::optional<AccessReply> waitForReply(Deadline) override {
      return isTakenDown ? std::nullopt : std::optional(AccessReply{.response = 0, .after = std::chrono::seconds(1)});
    }
    void takeDown() override { isTakenDown = true; }
    bool& isTakenDown;
  };
  bool isTakenDown = false;
  SessionAlert::Options options{.choice = FrontEnd::portal, .desktop = {}};
  options.hasUsableDisplay = [] { return true; };
  options.portal = {.backend = [] { return "org.example.Backend"; },
                    .isReachable = [](const auto&) { return true; },
                    .open = [&](const auto&, const auto&) { return std::make_unique<Dialog>(isTakenDown); }};
  SessionAlert alert(options);
  const auto handle = alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, {});
  AlertResponse response = 42;
  EXPECT_EQ(alert.receiveResponse(handle, 0, response), 0);
  EXPECT_EQ(response, AlertResponseDefaultButton);
  SessionAlert::takeDown(handle);
  EXPECT_EQ(alert.receiveResponse(handle, 0, response), 0);
  EXPECT_EQ(response, AlertResponseNobody);
}

TEST(ASessionWithoutAnybody, ShowsNothingAndGetsNobodysAnswer) {
  SessionAlert alert({.choice = FrontEnd::nobody, .desktop = {.helper = SCRIPTED_HELPER}});
  int error = 0;
  EXPECT_EQ(alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, &error, {}), nullptr);
  EXPECT_NE(error, 0);
  AlertResponse response = 0;
  EXPECT_NE(alert.receiveResponse(nullptr, 0, response), 0);
  EXPECT_EQ(response, AlertResponseNobody);
}

TEST(FrontEnds, HaveNames) {
  for (const FrontEnd frontEnd : {FrontEnd::desktop, FrontEnd::portal, FrontEnd::terminal, FrontEnd::nobody}) {
    EXPECT_EQ(alertFrontEndNamed(nameOf(frontEnd)), frontEnd);
  }
  EXPECT_EQ(alertFrontEndNamed("window"), std::nullopt);
}

TEST(ADisplay, IsUsableWhenItsServerTakesConnections) {
  const TemporaryFolder folder;
  setenv("XDG_RUNTIME_DIR", folder.path().c_str(), 1);
  unsetenv("DISPLAY");
  unsetenv("WAYLAND_DISPLAY");
  EXPECT_FALSE(hasUsableDisplay());
  for (const char* name : {"localhost:10.0", ":", ":x", ":4711", ":0/../x", ""}) {
    setenv("DISPLAY", name, 1);
    EXPECT_FALSE(hasUsableDisplay()) << name;
  }
  setenv("WAYLAND_DISPLAY", "wayland-7", 1);
  EXPECT_FALSE(hasUsableDisplay());

  const int server = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, (folder.path() / "wayland-7").c_str(), sizeof address.sun_path - 1);
  ASSERT_EQ(bind(server, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  EXPECT_FALSE(hasUsableDisplay()) << "nobody listens yet";
  ASSERT_EQ(listen(server, 4), 0);
  EXPECT_TRUE(hasUsableDisplay());
  setenv("WAYLAND_DISPLAY", (folder.path() / "wayland-7").c_str(), 1);
  EXPECT_TRUE(hasUsableDisplay());
  EXPECT_FALSE(keepsWindowsOnTop()) << "its compositor says nothing";
  close(server);
}

// A socket on which somebody takes connections: of this user, or of whoever `user` is.
class Listener {
 public:
  Listener(const std::string& path, uid_t user) : _socket(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, path.data(), path.size());
    const auto size = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + path.size());
    const bool isBound = bind(_socket, reinterpret_cast<const sockaddr*>(&address), size) == 0;
    // Whoever listens is the one whom the kernel names.
    const uid_t self = geteuid();
    if (seteuid(user) == 0) _listens = isBound && listen(_socket, 4) == 0;
    _listens = seteuid(self) == 0 && _listens;
  }
  Listener(const Listener&) = delete;
  Listener& operator=(const Listener&) = delete;
  ~Listener() { close(_socket); }

  bool listens() const { return _listens; }

 private:
  int _socket;
  bool _listens = false;
};

constexpr uid_t root = 0;
constexpr uid_t somebodyElse = 1;

TEST(ADisplayOfAnotherUser, IsNotUsable) {
  if (ranWithItsOwnRoot()) return;
  const TemporaryFolder folder;
  const std::string number = std::to_string(20'000 + getpid() % 40'000);
  const std::string abstract = std::string(1, '\0') + "/tmp/.X11-unix/X" + number;
  const std::string wayland = folder.path() / "wayland-7";
  unsetenv("WAYLAND_DISPLAY");
  setenv("DISPLAY", (":" + number).c_str(), 1);
  EXPECT_FALSE(hasUsableDisplay());
  {
    const Listener own(abstract, root);
    ASSERT_TRUE(own.listens());
    EXPECT_TRUE(hasUsableDisplay());
  }
  {
    const Listener foreign(abstract, somebodyElse);
    ASSERT_TRUE(foreign.listens());
    EXPECT_FALSE(hasUsableDisplay()) << "a stale DISPLAY, and whoever waits there now";
    const Listener compositor(wayland, root);
    setenv("WAYLAND_DISPLAY", wayland.c_str(), 1);
    EXPECT_FALSE(hasUsableDisplay()) << "a window could still be shown on the other one";
  }
  EXPECT_FALSE(hasUsableDisplay()) << "nobody listens any more";
  std::filesystem::remove(wayland);
  const Listener compositor(wayland, somebodyElse);
  ASSERT_TRUE(compositor.listens());
  EXPECT_FALSE(hasUsableDisplay());
}

TEST(ADisplayOnTheNetwork, IsUsableIfItIsTheOneThatWasNamed) {
  unsetenv("WAYLAND_DISPLAY");
  const int server = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  int number = 4000;
  do {
    address.sin_port = htons(static_cast<std::uint16_t>(6000 + ++number));
  } while (bind(server, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 && number < 5000);
  ASSERT_EQ(listen(server, 4), 0);
  const std::string name = "127.0.0.1:" + std::to_string(number) + ".0";
  setenv("DISPLAY", name.c_str(), 1);
  EXPECT_FALSE(hasUsableDisplay());
  EXPECT_FALSE(hasUsableDisplay("127.0.0.1:1.0"));
  EXPECT_TRUE(hasUsableDisplay(name));
  close(server);
  EXPECT_FALSE(hasUsableDisplay(name)) << "nobody listens any more";
  for (const char* broken : {"127.0.0.1", "127.0.0.1:", "127.0.0.1:x", "127.0.0.1:99999", ":", ""}) {
    setenv("DISPLAY", broken, 1);
    EXPECT_FALSE(hasUsableDisplay(broken)) << broken;
  }
}

}  // namespace
}  // namespace palisade
