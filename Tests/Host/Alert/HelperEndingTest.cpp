// What the end of a helper means: ten thousand endings, of which only the flawless ones are anybody's answer.

#include "Host/Alert/HelperEnding.h"

#include <gmock/gmock.h>

#include <csignal>
#include <random>
#include <vector>

namespace palisade {
namespace {

// As wait(2) encodes them on Linux.
constexpr int exitedWith(int code) { return code << 8; }
constexpr int endedBySignal(int signal) { return signal; }

AlertNonce nonceOf(std::uint8_t byte) {
  AlertNonce nonce{};
  nonce.fill(byte);
  return nonce;
}

TEST(AFlawlessAnswer, PressesTheButtonThatItNames) {
  const AlertNonce nonce = nonceOf(7);
  const auto responseTo = [&](AlertWord word) { return responseOfEnding(alertAnswerFrame(nonce, word), exitedWith(0), nonce); };
  EXPECT_EQ(responseTo(AlertWord::allowed), AlertResponseDefaultButton);
  EXPECT_EQ(responseTo(AlertWord::refused), AlertResponseAlternateButton);
  EXPECT_EQ(responseTo(AlertWord::closed), AlertResponseNobody);
  EXPECT_EQ(responseTo(AlertWord{3}), AlertResponseNobody);
}

TEST(AFlawlessAnswer, IsNobodysBesideAnyEndButACleanOne) {
  const AlertNonce nonce = nonceOf(7);
  const std::string consent = alertAnswerFrame(nonce, AlertWord::allowed);
  EXPECT_EQ(responseOfEnding(consent, std::nullopt, nonce), AlertResponseNobody);
  for (int status = 1; status < 0x10000; ++status) EXPECT_EQ(responseOfEnding(consent, status, nonce), AlertResponseNobody);
}

TEST(AnAnswerThatDiffersInOneBit, IsNobodys) {
  const AlertNonce nonce = nonceOf(0xA5);
  for (const AlertWord word : {AlertWord::allowed, AlertWord::refused}) {
    std::string frame = alertAnswerFrame(nonce, word);
    for (std::size_t bit = 0; bit < 8 * frame.size(); ++bit) {
      frame[bit / 8] = static_cast<char>(frame[bit / 8] ^ (1 << bit % 8));
      EXPECT_EQ(responseOfEnding(frame, exitedWith(0), nonce), AlertResponseNobody) << "bit " << bit;
      frame[bit / 8] = static_cast<char>(frame[bit / 8] ^ (1 << bit % 8));
    }
  }
}

class Endings {
 public:
  std::string bytes() {
    std::string bytes = frame();
    switch (below(8)) {
      case 0: return bytes;
      case 1: bytes.resize(below(bytes.size())); break;
      case 2: bytes += frame(); break;
      case 3: bytes += std::string(1 + below(4), static_cast<char>(below(256))); break;
      case 4: bytes.erase(0, 1 + below(8)); break;
      case 5: bytes = std::string(below(2 * bytes.size()), static_cast<char>(below(256))); break;
      case 6: bytes = bytes.substr(0, below(bytes.size())) + frame(); break;
      default:
        for (std::size_t count = 1 + below(6); count > 0; --count) bytes[below(bytes.size())] = static_cast<char>(below(256));
    }
    return bytes;
  }

  std::optional<int> status() {
    switch (below(4)) {
      case 0: return exitedWith(static_cast<int>(below(256)));
      case 1: return endedBySignal(1 + static_cast<int>(below(31)));
      case 2: return below(8) == 0 ? std::nullopt : std::optional(exitedWith(0));
      default: return exitedWith(0);
    }
  }

 private:
  std::string frame() {
    const AlertNonce nonce = nonceOf(below(3) == 0 ? 8 : 7);
    return alertAnswerFrame(nonce, static_cast<AlertWord>(below(4)));
  }
  std::size_t below(std::size_t limit) { return std::uniform_int_distribution<std::size_t>(0, limit - 1)(_random); }

  std::mt19937 _random{20261121};
};

TEST(TenThousandEndings, HoldNoConsentThatWasNotGiven) {
  const AlertNonce nonce = nonceOf(7);
  const std::string consent = alertAnswerFrame(nonce, AlertWord::allowed);
  Endings endings;
  int consents = 0;
  for (int count = 0; count < 10'000; ++count) {
    const std::string bytes = endings.bytes();
    const std::optional<int> status = endings.status();
    const bool isGiven = bytes == consent && status == exitedWith(0);
    consents += isGiven ? 1 : 0;
    ASSERT_EQ(responseOfEnding(bytes, status, nonce) == AlertResponseDefaultButton, isGiven) << "ending " << count;
  }
  EXPECT_GT(consents, 50) << "an ending that is consent is to be found among them, or nothing was tested";
}

}  // namespace
}  // namespace palisade
