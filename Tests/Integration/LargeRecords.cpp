// Writes a grant of each of COUNT clients into the account store at PATH, with an audience of MEBIBYTES: what a daemon without
// bounds would have kept.

#include <cstdio>
#include <cstdlib>
#include <exception>

#include "Host/Accounts/SqliteAccountStore.h"
#include "Platform/AccountConstants.h"
#include "Tests/Host/Store/Records.h"

int main(int count, char** words) {
  using namespace palisade;
  try {
    if (count != 4) throw std::runtime_error("PATH MEBIBYTES COUNT");
    const TestDirectory clients;
    SqliteAccountStore store({.path = words[1]}, clients);
    const std::string audience(std::strtoul(words[2], nullptr, 10) << 20U, 'x');
    for (unsigned long number = 0; number < std::strtoul(words[3], nullptr, 10); ++number) {
      const auto client = makeClient("large" + std::to_string(number));
      const RecordContent content{
          .isGranted = true,
          .options = Dictionary{{std::string(FacebookAppIdKey), "1"}, {std::string(FacebookAudienceKey), audience}},
          .permissions = std::vector<std::string>{"email"}};
      const auto error = store.setAuthorization(makeRecord(client, content), client, facebookType);
      if (error) throw std::runtime_error(error->description.value_or("The store refused."));
    }
    return EXIT_SUCCESS;
  } catch (const std::exception& failure) {
    std::fprintf(stderr, "%s\n", failure.what());
    return EXIT_FAILURE;
  }
}
