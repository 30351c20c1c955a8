#include "Benchmarks/Daemon/ServerExchange.h"

#include <future>
#include <stdexcept>
#include <variant>

#include "Host/Daemon/Paths.h"
#include "Host/Preferences/TomlFile.h"

namespace palisade {
namespace {

ServerConfiguration configuredServer() {
  const auto table = readTomlFile(configurationFile("server.toml"));
  if (!table) throw std::runtime_error("There is no server.toml.");
  return ServerConfiguration(*table);
}

}  // namespace

ServerExchange::ServerExchange() : _server(configuredServer()), _http(_server.httpOptions()) {}

void ServerExchange::run() {
  std::promise<HttpResult> result;
  const auto transfer = _http.send({.url = _server.address + _server.paths.authorization, .form = ""},
                                   [&result](HttpResult answer) { result.set_value(std::move(answer)); });
  const HttpResult answer = result.get_future().get();
  if (const Error* error = std::get_if<Error>(&answer)) throw std::runtime_error(error->description.value_or("No answer."));
}

}  // namespace palisade
