#pragma once

/// A port of this machine that accepts connections and, left alone, says nothing.

#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <string>

class ListeningSocket {
 public:
  ListeningSocket() : _socket(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    _address.sin_family = AF_INET;
    _address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    bind(_socket, reinterpret_cast<sockaddr*>(&_address), sizeof _address);
    listen(_socket, 16);
    socklen_t size = sizeof _address;
    getsockname(_socket, reinterpret_cast<sockaddr*>(&_address), &size);
  }
  ~ListeningSocket() { close(_socket); }
  ListeningSocket(const ListeningSocket&) = delete;
  ListeningSocket& operator=(const ListeningSocket&) = delete;

  std::string name() const { return "127.0.0.1:" + std::to_string(ntohs(_address.sin_port)); }

  bool hasVisitor() const {
    pollfd incoming = {.fd = _socket, .events = POLLIN, .revents = 0};
    return poll(&incoming, 1, 0) == 1;
  }

  /// Accepts a connection, reads the head of what it says, and ends it.
  std::string hearVisitor() const {
    const int visitor = accept4(_socket, nullptr, nullptr, SOCK_CLOEXEC);
    std::string heard;
    char character = 0;
    while (!heard.ends_with("\r\n\r\n") && read(visitor, &character, 1) == 1) heard += character;
    close(visitor);
    return heard;
  }

 private:
  int _socket;
  sockaddr_in _address = {};
};
