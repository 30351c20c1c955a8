#include "Sandbox/TlsServer.h"

#include <arpa/inet.h>
#include <openssl/ssl.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <memory>
#include <string>
#include <string_view>

namespace palisade::sandbox {
namespace {

constexpr std::size_t largestRecord = 16 * 1024;

struct CloseConnection {
  void operator()(SSL* connection) const {
    const int socket = SSL_get_fd(connection);
    SSL_shutdown(connection);
    SSL_free(connection);
    shutdown(socket, SHUT_RDWR);
    close(socket);
  }
};
using Connection = std::unique_ptr<SSL, CloseConnection>;

// One end of a connection.
struct End {
  std::string address;
  int port = 0;

  End(int (*ask)(int, sockaddr*, socklen_t*), int socket) {
    sockaddr_in name{};
    socklen_t size = sizeof name;
    if (ask(socket, reinterpret_cast<sockaddr*>(&name), &size) != 0) return;
    std::array<char, INET_ADDRSTRLEN> text{};
    address = inet_ntop(AF_INET, &name.sin_addr, text.data(), text.size());
    port = ntohs(name.sin_port);
  }

  void tell(std::string& toAddress, int& toPort) const {
    toAddress = address;
    toPort = port;
  }
};

// What is written waits for the end of the answer, or for a record's worth of it.
class TlsStream final : public httplib::Stream {
 public:
  explicit TlsStream(SSL& connection) : _connection(connection) {}

  /// Whether a client that has been answered says something more within `seconds`.
  bool waitForRequest(time_t seconds) const {
    if (is_readable()) return true;
    pollfd heard = {.fd = socket(), .events = POLLIN, .revents = 0};
    return poll(&heard, 1, static_cast<int>(seconds * 1000)) > 0;
  }

  bool flush() {
    std::string_view left = _unsent;
    while (!left.empty()) {
      const int written = SSL_write(&_connection, left.data(), static_cast<int>(left.size()));
      if (written <= 0) return false;
      left.remove_prefix(static_cast<std::size_t>(written));
    }
    _unsent.clear();
    return true;
  }

  bool is_readable() const override { return !_unread.empty() || SSL_has_pending(&_connection) == 1; }
  bool is_writable() const override { return true; }

  ssize_t read(char* bytes, std::size_t size) override {
    if (_unread.empty()) {
      const int length = SSL_read(&_connection, _record.data(), static_cast<int>(_record.size()));
      if (length <= 0) return SSL_get_error(&_connection, length) == SSL_ERROR_ZERO_RETURN ? 0 : -1;
      _unread = {_record.data(), static_cast<std::size_t>(length)};
    }
    const std::size_t taken = _unread.copy(bytes, size);
    _unread.remove_prefix(taken);
    return static_cast<ssize_t>(taken);
  }

  ssize_t write(const char* bytes, std::size_t size) override {
    _unsent.append(bytes, size);
    return _unsent.size() < largestRecord || flush() ? static_cast<ssize_t>(size) : -1;
  }

  void get_remote_ip_and_port(std::string& address, int& port) const override { _remote.tell(address, port); }
  void get_local_ip_and_port(std::string& address, int& port) const override { _local.tell(address, port); }
  socket_t socket() const override { return SSL_get_fd(&_connection); }

 private:
  SSL& _connection;
  const End _remote{getpeername, SSL_get_fd(&_connection)};
  const End _local{getsockname, SSL_get_fd(&_connection)};
  std::array<char, largestRecord> _record;
  std::string_view _unread;
  std::string _unsent;
};

}  // namespace

bool TlsServer::process_and_close_socket(socket_t socket) {
  const timeval patience = {.tv_sec = read_timeout_sec_, .tv_usec = read_timeout_usec_};
  setsockopt(socket, SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof patience);
  setsockopt(socket, SOL_SOCKET, SO_SNDTIMEO, &patience, sizeof patience);
  const Connection connection(SSL_new(ssl_context()));
  SSL_set_fd(connection.get(), socket);
  SSL_set_read_ahead(connection.get(), 1);
  if (SSL_accept(connection.get()) != 1) return false;

  TlsStream stream(*connection);
  bool isClosed = false;
  for (std::size_t left = keep_alive_max_count_; left > 0 && !isClosed; --left) {
    if (!stream.waitForRequest(keep_alive_timeout_sec_)) break;
    const bool isAnswered =
        process_request(stream, left == 1, isClosed, [&](httplib::Request& request) { request.ssl = connection.get(); });
    if (!stream.flush() || !isAnswered) return false;
  }
  return true;
}

}  // namespace palisade::sandbox
