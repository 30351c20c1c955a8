#pragma once

/// The loopback interface of a network of the test's own.
///
/// Threads: one. Errors: `isOwn` says whether this machine lets a test have a network; the others throw nothing and change
/// nothing where it does not.

#include <arpa/inet.h>
#include <net/if.h>
#include <netinet/in.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstring>
#include <string>

class Loopback {
 public:
  /// Moves the process into a network in which there is nothing but this.
  Loopback() : _isOwn(unshare(CLONE_NEWNET) == 0), _socket(socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0)) { raise(); }
  ~Loopback() {
    raise();
    close(_socket);
  }
  Loopback(const Loopback&) = delete;
  Loopback& operator=(const Loopback&) = delete;

  bool isOwn() const { return _isOwn; }

  void raise() { setFlags(IFF_UP | IFF_RUNNING); }
  void lower() { setFlags(0); }

  /// Gives the interface one more address, whether it is up or not.
  void addAddress(int number) {
    ifreq request = named("lo:" + std::to_string(number));
    sockaddr_in address = {};
    address.sin_family = AF_INET;
    inet_pton(AF_INET, ("192.0.2." + std::to_string(number)).c_str(), &address.sin_addr);
    std::memcpy(&request.ifr_addr, &address, sizeof address);
    if (_isOwn) ioctl(_socket, SIOCSIFADDR, &request);
  }

 private:
  static ifreq named(const std::string& name) {
    ifreq request = {};
    name.copy(request.ifr_name, IFNAMSIZ - 1);
    return request;
  }

  void setFlags(short flags) {
    ifreq request = named("lo");
    request.ifr_flags = flags;
    if (_isOwn) ioctl(_socket, SIOCSIFFLAGS, &request);
  }

  bool _isOwn;
  int _socket;
};
