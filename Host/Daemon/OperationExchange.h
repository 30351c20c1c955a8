#pragma once

/// Ties an exchange with the server to the operation that waits for it.
///
/// A withdrawal cancels an exchange for words: nobody wants them any more. An exchange for a token goes on then, since the user
/// has allowed it, and is cancelled only when the access is taken back. Threads: called by the thread that carries the
/// operation; an exchange of a thread that carries none is nobody's. Ownership: the result keeps the operation. Errors: an
/// operation that has failed already begins no exchange; its failure is thrown.

#include <memory>

#include "Host/Social/HttpSocialFramework.h"

namespace palisade {

std::shared_ptr<const void> watchExchange(Exchange exchange);

}  // namespace palisade
