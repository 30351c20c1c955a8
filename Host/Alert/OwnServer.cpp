#include "Host/Alert/OwnServer.h"

#include <sys/socket.h>
#include <unistd.h>

namespace palisade {

// A socket of the network has a user at its other end that there is not.
bool isOwnServer(int connection) {
  ucred server{};
  socklen_t size = sizeof server;
  return getsockopt(connection, SOL_SOCKET, SO_PEERCRED, &server, &size) == 0 && size == sizeof server &&
         (server.uid == getuid() || server.uid == 0);
}

}  // namespace palisade
