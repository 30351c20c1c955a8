#pragma once

/// Whether the process that has a connection's number now is the one that made the connection.
///
/// A connection can outlive its process: another one inherits the socket, the process ends, and the kernel gives its number to
/// a third. A bus that pins the process when the connection is made leaves no doubt. Otherwise two things are compared. The
/// process must not have started after the connection is known to have existed. And it must hold as many sockets to the bus as
/// the bus counts connections for its number; a connection that is waited with until the process has started is found so.
///
/// A process that closes a connection has a socket less at once. The bus counts the connection until it has noticed, and as
/// long as a child holds the socket too, which every child does between its fork and its program. So a shortage is given two
/// seconds to pass. What is compared stays what was there at the first look: connections that have ended since are counted no
/// more, sockets that were closed since neither, and what is new counts on neither side. A socket that the process gains while
/// it is waited for therefore helps nobody, and connections that it goes on to open and close do it no harm. One case is
/// refused: an application that closes a connection which another process keeps. Threads: plain functions; they wait for the
/// bus, and `requireOwnConnection` must not run on the thread that reads the bus. Errors: `IdentityError`; `NotItsConnection`
/// is the last word about a connection, since who asks often enough may meet a moment at which the process has a socket too
/// many.

#include <string_view>

#include "Host/Identity/CallingConnection.h"
#include "Host/Identity/IdentityError.h"
#include "Host/Identity/PinnedProcess.h"

namespace palisade {

class NotItsConnection : public IdentityError {
 public:
  using IdentityError::IdentityError;
};

/// The process that made the connection.
PinnedProcess processBehind(const CallingConnection& connection);

/// Whether both name one context: behind a label may stand a NUL, a line's end, and the mode in which it is enforced.
bool isSameSecurityLabel(std::string_view one, std::string_view other);

/// Throws unless the connection is this process's own, and its user and its security label those of the connection.
void requireOwnConnection(const PinnedProcess& caller, const CallingConnection& connection);

}  // namespace palisade
