#include "Host/Daemon/OperationExchange.h"

#include <utility>

#include "Host/Daemon/Operation.h"

namespace palisade {

std::shared_ptr<const void> watchExchange(Exchange exchange) {
  Operation* const operation = Operation::current();
  if (operation == nullptr) return nullptr;
  const bool isForToken = exchange.appID.has_value();
  if (isForToken) operation->tokenIsAskedFor(*exchange.appID);
  auto registration = operation->interruptWith(
      std::move(exchange.cancel), isForToken ? Operation::Interruption::revocation : Operation::Interruption::withdrawal);
  // Whoever revokes from here on knows of the exchange and cancels it.
  if (const auto failure = operation->failure()) throw BusFailure(*failure);
  if (!isForToken) operation->keepsServicesBusy();
  operation->aboutToWait();
  return registration;
}

}  // namespace palisade
