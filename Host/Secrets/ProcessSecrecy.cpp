#include "Host/Secrets/ProcessSecrecy.h"

#include <sys/prctl.h>
#include <sys/resource.h>

#include <cerrno>
#include <system_error>

namespace palisade {

void dropDumpable() {
  if (::prctl(PR_SET_DUMPABLE, 0, 0, 0, 0) != 0) {
    throw std::system_error(errno, std::generic_category(), "cannot keep other processes out of this one's memory");
  }
  const rlimit none{.rlim_cur = 0, .rlim_max = 0};
  if (::setrlimit(RLIMIT_CORE, &none) != 0) {
    throw std::system_error(errno, std::generic_category(), "cannot turn core dumps off");
  }
}

}  // namespace palisade
