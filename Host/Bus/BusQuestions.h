#pragma once

/// Asks the session bus about its connections.
///
/// On a connection of its own: a call that waits for its reply must not take messages from under the loop that reads the bus,
/// nor pile up those of a flood with all the descriptors that they carry. Threads: every operation may be called from any
/// thread, and waits for the bus. Ownership: owns its connection. Errors: `sdbus::Error`, and `BusFailure` for an answer that
/// lacks what every bus says.

#include <sys/types.h>

#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "Host/Files/FileDescriptor.h"

namespace sdbus {
class IConnection;
}

namespace palisade {

/// What the bus knows about the process that made a connection, from the moment at which it did.
struct BusCredentials {
  pid_t process = 0;
  uid_t user = 0;
  /// The process itself; null where the bus does not hand it out.
  std::shared_ptr<const FileDescriptor> pin;
  std::optional<std::string> securityLabel;
};

class BusQuestions {
 public:
  BusQuestions();
  ~BusQuestions();
  BusQuestions(const BusQuestions&) = delete;
  BusQuestions& operator=(const BusQuestions&) = delete;

  /// The bus has credentials of its own, under the name org.freedesktop.DBus.
  BusCredentials credentialsOf(const std::string& name);

  /// The number of the process that has made the connection; none when there is no such connection.
  std::optional<pid_t> processOf(const std::string& uniqueName);

  std::vector<std::string> names();

 private:
  template <typename Answer, typename... Arguments>
  Answer ask(const char* question, const Arguments&... arguments);

  std::mutex _mutex;
  std::unique_ptr<sdbus::IConnection> _connection;
};

/// The bus's end of a connection, as getpeername(2) tells it: a path, or a name behind a NUL.
std::string addressOfBus(const sdbus::IConnection& connection);

}  // namespace palisade
