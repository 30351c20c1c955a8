#include "AlertHelper/HostConnection.h"

#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>

namespace palisade {

HostConnection::~HostConnection() { close(_socket); }

std::optional<AlertQuestion> HostConnection::receiveQuestion() const {
  const auto fourBytes = receive(4);
  const auto length = fourBytes ? lengthOfAlertQuestion(*fourBytes) : std::nullopt;
  const auto json = length ? receive(*length) : std::nullopt;
  return json ? alertQuestionFromJson(*json) : std::nullopt;
}

bool HostConnection::answer(const AlertNonce& nonce, AlertWord word) const {
  const std::string frame = alertAnswerFrame(nonce, word);
  return send(_socket, frame.data(), frame.size(), MSG_NOSIGNAL) == static_cast<ssize_t>(frame.size());
}

std::optional<std::string> HostConnection::receive(std::size_t size) const {
  std::string bytes(size, '\0');
  ssize_t received = 0;
  do {
    received = recv(_socket, bytes.data(), size, MSG_WAITALL);
  } while (received < 0 && errno == EINTR);
  if (received != static_cast<ssize_t>(size)) return std::nullopt;
  return bytes;
}

}  // namespace palisade
