// A desktop helper that does what the question's title tells it, for tests of how it may end.
//
// The title is a list of orders: "allow", "refuse", "close" write that answer; "prefix N" the first N bytes of consent;
// "foreign" consent to another question; "text WORD"; "signal N"; "exit N"; "linger" ends only with the host; "environment"
// writes its environment to the file that the message names.

#include <sys/resource.h>
#include <sys/socket.h>
#include <unistd.h>

#include <csignal>
#include <fstream>
#include <sstream>

#include "Host/Alert/AlertQuestion.h"

namespace {

using palisade::AlertQuestion;
using palisade::AlertWord;

constexpr int host = 3;

std::string receiveExactly(std::size_t size) {
  std::string bytes(size, '\0');
  if (recv(host, bytes.data(), size, MSG_WAITALL) != static_cast<ssize_t>(size)) _exit(70);
  return bytes;
}

AlertQuestion receiveQuestion() {
  const auto length = palisade::lengthOfAlertQuestion(receiveExactly(4));
  const auto question = length ? palisade::alertQuestionFromJson(receiveExactly(*length)) : std::nullopt;
  if (!question) _exit(71);
  return *question;
}

void say(const std::string& bytes) {
  if (send(host, bytes.data(), bytes.size(), MSG_NOSIGNAL) < 0) _exit(72);
}

void obey(const std::string& order, std::istringstream& rest, const AlertQuestion& question) {
  const auto frame = [&](AlertWord word) { return palisade::alertAnswerFrame(question.nonce, word); };
  int number = 0;
  if (order == "allow") {
    say(frame(AlertWord::allowed));
  } else if (order == "refuse") {
    say(frame(AlertWord::refused));
  } else if (order == "close") {
    say(frame(AlertWord::closed));
  } else if (order == "prefix" && rest >> number) {
    say(frame(AlertWord::allowed).substr(0, static_cast<std::size_t>(number)));
  } else if (order == "foreign") {
    say(palisade::alertAnswerFrame(palisade::freshNonce(), AlertWord::allowed));
  } else if (order == "text") {
    std::string text;
    rest >> text;
    say(text);
  } else if (order == "signal" && rest >> number) {
    raise(number);
  } else if (order == "exit" && rest >> number) {
    _exit(number);
  } else if (order == "linger") {
    receiveExactly(1);
  } else if (order == "environment") {
    std::ofstream out(question.message);
    for (char** entry = environ; *entry != nullptr; ++entry) out << *entry << '\n';
  } else {
    _exit(73);
  }
}

}  // namespace

int main() {
  const rlimit noCoreFiles{.rlim_cur = 0, .rlim_max = 0};
  setrlimit(RLIMIT_CORE, &noCoreFiles);
  const AlertQuestion question = receiveQuestion();
  std::istringstream orders(question.title);
  for (std::string order; orders >> order;) obey(order, orders, question);
  return 0;
}
