#include "Tests/Host/OwnRoot.h"

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <filesystem>
#include <string>

namespace palisade {
namespace {

const std::string inNamespace = "unshare --user --map-root-user --map-auto --mount ";

struct Ending {
  int status = -1;
  std::string output;
};

Ending endingOf(const std::string& command) {
  Ending ending;
  FILE* pipe = popen((command + " 2>&1").c_str(), "r");
  if (pipe == nullptr) return ending;
  std::array<char, 4096> buffer{};
  for (std::size_t count = 0; (count = fread(buffer.data(), 1, buffer.size(), pipe)) > 0;) {
    ending.output.append(buffer.data(), count);
  }
  ending.status = pclose(pipe);
  return ending;
}

void skip(const std::string& reason) { GTEST_SKIP() << reason; }

// Without the frame that the framework puts around it.
std::string reasonOfSkipped(const std::string& output) {
  const std::size_t begin = output.find("Skipped\n");
  if (begin == std::string::npos) return output;
  return output.substr(begin + 8, output.find("\n\n", begin) - begin - 8);
}

}  // namespace

bool ranWithItsOwnRoot() {
  if (geteuid() == 0) return false;
  const Ending trial = endingOf(inNamespace + "true");
  if (trial.status != 0) {
    skip("This takes root, or a user namespace with users of /etc/subuid: " + trial.output);
    return true;
  }
  const testing::TestInfo& test = *testing::UnitTest::GetInstance()->current_test_info();
  const std::string program = std::filesystem::read_symlink("/proc/self/exe");
  const std::string filter = std::string(test.test_suite_name()) + "." + test.name();
  const Ending ending = endingOf(inNamespace + "'" + program + "' '--gtest_filter=" + filter + "'");
  if (ending.status != 0) {
    ADD_FAILURE() << ending.output;
  } else if (ending.output.find("[  SKIPPED ]") != std::string::npos) {
    skip(reasonOfSkipped(ending.output));
  }
  return true;
}

}  // namespace palisade
