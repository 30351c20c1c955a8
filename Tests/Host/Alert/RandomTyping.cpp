#include "Tests/Host/Alert/RandomTyping.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstddef>
#include <string_view>

namespace palisade {
namespace {

using Kind = TypedKey::Kind;
using std::chrono::milliseconds;

// A generator whose numbers do not depend on the standard library: splitmix64.
class Random {
 public:
  explicit Random(std::uint64_t seed) : _state(seed) {}

  double share() { return static_cast<double>(next() >> 11) * 0x1.0p-53; }
  bool happens(double probability) { return share() < probability; }
  std::size_t below(std::size_t bound) { return static_cast<std::size_t>(share() * static_cast<double>(bound)); }
  double between(double low, double high) { return low + share() * (high - low); }
  template <typename List>
  const auto& oneOf(const List& list) {
    return list[below(std::size(list))];
  }

 private:
  std::uint64_t next() {
    std::uint64_t mixed = _state += 0x9e3779b97f4a7c15;
    mixed = (mixed ^ mixed >> 30) * 0xbf58476d1ce4e5b9;
    mixed = (mixed ^ mixed >> 27) * 0x94d049bb133111eb;
    return mixed ^ mixed >> 31;
  }

  std::uint64_t _state;
};

constexpr std::array<std::string_view, 24> words = {
    "the", "a",      "and",    "report", "tomorrow", "please", "because", "I",     "think", "so",   "Hello", "meeting",
    "of",  "before", "lunch?", "yes,",   "no.",      "it's",   "done!",   "Ada's", "on",    "Mars", "all",   "day"};
constexpr std::array<std::string_view, 18> commands = {"ls",
                                                       "cd src",
                                                       "git commit -m 'Allow it'",
                                                       "git status",
                                                       "make -j 4",
                                                       "sudo apt install a",
                                                       "cat /etc/hosts | grep a",
                                                       "y",
                                                       "yes",
                                                       "rm -i *.o",
                                                       "ssh ada@example.org",
                                                       "vim Makefile",
                                                       "./run && ./test",
                                                       "",
                                                       "q",
                                                       "tail -f log",
                                                       "python3 -c 'print(1)'",
                                                       "exit"};
constexpr std::array<std::string_view, 12> lines = {"int main() {",
                                                    "return a + b;",
                                                    "}",
                                                    "for (auto& x : list) {",
                                                    "def ask(self):",
                                                    "if not allowed:",
                                                    "x = 1",
                                                    "// a comment about Allow",
                                                    "else {",
                                                    "",
                                                    "#include <string>",
                                                    "raise Error(\"no\")"};

class Typist {
 public:
  Typist(std::uint32_t seed, bool withMoves) : _random(seed), _withMoves(withMoves) {
    // From thirty strokes a second, which is a hand that slides over the keys, to one finger that looks for each.
    _pace = 33 * std::pow(12.0, _random.share());
    _thinks = _random.between(0, 0.08);
  }

  Typing type() {
    const std::size_t length = 20 + _random.below(180);
    using Manner = void (Typist::*)();
    const Manner manner =
        _random.oneOf(std::array<Manner, 4>{&Typist::prose, &Typist::shell, &Typist::code, &Typist::nonsense});
    while (_typing.size() < length) (this->*manner)();
    // The alert comes somewhere in the text, and some time before its next key.
    _typing.erase(_typing.begin(), _typing.begin() + static_cast<std::ptrdiff_t>(_random.below(length / 2)));
    _typing.front().pause = milliseconds(_random.below(1500));
    return std::move(_typing);
  }

 private:
  void key(Kind kind, char character = 0) {
    double pause = _pace * std::exp(0.8 * (_random.share() + _random.share() - 1));
    if (_random.happens(_thinks)) pause += 5000 * std::pow(_random.share(), 2);
    _typing.push_back({.kind = kind,
                       .character = character,
                       .pause = milliseconds(static_cast<int>(pause)),
                       .heldFor = milliseconds(10 + _random.below(140))});
  }
  void text(std::string_view characters) {
    for (const char character : characters) key(Kind::character, character);
  }
  // Once, and each further time with that probability.
  void repeated(Kind kind, double again) {
    do key(kind);
    while (_random.happens(again));
  }
  bool moves(double probability) { return _withMoves && _random.happens(probability); }

  void edit() {
    switch (_random.below(4)) {
      case 0: repeated(Kind::left, 0.7); break;
      case 1: repeated(Kind::right, 0.7); break;
      case 2: key(Kind::alt, _random.oneOf(std::string_view("bfdaqun."))); break;
      default: text("\b\b"); break;
    }
  }

  void prose() {
    text(_random.oneOf(words));
    if (moves(0.04)) edit();
    // From one field of a form to the next, and back.
    if (moves(0.06)) repeated(_random.happens(0.2) ? Kind::back : Kind::forward, 0.4);
    if (moves(0.02)) repeated(_random.happens(0.5) ? Kind::up : Kind::down, 0.6);
    text(_random.happens(0.06) ? "\n" : " ");
  }

  void shell() {
    if (moves(0.25)) {
      repeated(Kind::up, 0.6);
      if (_random.happens(0.3)) edit();
    } else {
      const std::string_view command = _random.oneOf(commands);
      const std::size_t typed = moves(0.4) ? command.size() / 2 : command.size();
      text(command.substr(0, typed));
      if (typed < command.size()) {
        // Completes a name, and lists what there is.
        repeated(Kind::forward, 0.3);
        if (_random.happens(0.5)) text(command.substr(typed));
      }
      if (moves(0.1)) edit();
    }
    text("\n");
  }

  void code() {
    if (moves(0.7)) repeated(Kind::forward, 0.5);
    text(_random.oneOf(lines));
    if (moves(0.1)) edit();
    if (moves(0.1)) repeated(Kind::down, 0.6);
    text("\n");
  }

  void nonsense() {
    if (moves(0.2)) {
      const Kind kind = _random.oneOf(
          std::array{Kind::forward, Kind::forward, Kind::back, Kind::left, Kind::right, Kind::up, Kind::down, Kind::alt});
      key(kind, static_cast<char>('a' + _random.below(26)));
    } else {
      constexpr std::string_view characters = "  \n\nabcdeionrst.,;()'\"-0123";
      key(Kind::character, _random.oneOf(characters));
    }
  }

  Random _random;
  bool _withMoves;
  double _pace;
  double _thinks;
  Typing _typing;
};

}  // namespace

Typing randomTyping(std::uint32_t seed, bool withMoves) { return Typist(seed, withMoves).type(); }

}  // namespace palisade
