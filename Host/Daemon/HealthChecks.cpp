#include "Host/Daemon/HealthChecks.h"

#include <algorithm>
#include <future>
#include <memory>

#include "Host/Http/HttpClient.h"

namespace palisade {
namespace {

constexpr std::chrono::seconds longestWaitForConnection(5);

std::optional<std::string> troubleIn(const HttpResult& result) {
  const Error* error = std::get_if<Error>(&result);
  // Whoever points elsewhere has answered.
  if (error == nullptr || error->code == HttpErrorRedirect) return std::nullopt;
  const std::string sentence = error->description.value_or("The server cannot be reached.");
  if (error->code == HttpErrorTls) {
    return sentence + " If it has a certificate authority of its own, name that as certificate_authorities in server.toml.";
  }
  return sentence + " Check the address in server.toml and this machine's network.";
}

}  // namespace

std::optional<std::string> troubleWithServer(const ServerConfiguration& server) {
  HttpClientOptions options = server.httpOptions();
  options.connectLimit = std::min<std::chrono::milliseconds>(options.connectLimit, longestWaitForConnection);
  options.totalLimit = std::min<std::chrono::milliseconds>(options.totalLimit, longestWaitForServer);
  const auto trouble = std::make_shared<std::promise<std::optional<std::string>>>();
  HttpClient http(options);
  const auto transfer =
      http.send({.url = server.address + "/"}, [trouble](const HttpResult& result) { trouble->set_value(troubleIn(result)); });
  return trouble->get_future().get();
}

}  // namespace palisade
