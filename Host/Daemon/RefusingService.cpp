#include "Host/Daemon/RefusingService.h"

namespace palisade {

Dictionary RefusingService::status(const BusCaller&) {
  const auto trouble = _trouble();
  if (!trouble) refuse();
  return {{"configuration", "refused"}, {"configuration_trouble", *trouble}};
}

void RefusingService::refuse() {
  if (const auto trouble = _trouble()) throw BusFailure(BusFailureKind::failed, *trouble);
  _end();
  throw BusFailure(BusFailureKind::failed, "The configuration has been mended, and the account daemon starts anew. Ask again.");
}

}  // namespace palisade
