// A program with the defect that its argument names, for the tests of what watches for them.

#include <limits>
#include <map>
#include <string>
#include <thread>
#include <vector>

namespace {

volatile int number = std::numeric_limits<int>::max();
int shared = 0;

void leak() { new std::vector<int>(100); }

void overflow() {
  const volatile char* block = new char[100];
  number = block[number == 0 ? 0 : 100];
  delete[] block;
}

void undefined() { number = number + 1; }

void race() {
  std::thread other([] { ++shared; });
  ++shared;
  other.join();
}

}  // namespace

int main(int count, char** words) {
  const std::map<std::string, void (*)()> defects{
      {"leak", leak}, {"overflow", overflow}, {"undefined", undefined}, {"race", race}};
  const auto asked = defects.find(count > 1 ? words[1] : "");
  if (asked != defects.end()) asked->second();
  return 0;
}
