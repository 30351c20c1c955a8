// Sends every request that the contract knows, in the form in which the daemons send it and in each way in which it can be
// refused, so that the sandbox's log can be compared with the contract. With BUSY, the server is expected to do nothing.
//
// Usage: contract-exchange ADDRESS CA-FILE MASTER-TOKEN [BUSY]

#include <cstdio>
#include <cstdlib>
#include <future>
#include <string>

#include "Host/Http/HttpClient.h"
#include "Host/Json/Json.h"
#include "Host/Social/FacebookServer.h"

using namespace palisade;

namespace {

HttpAnswer ask(HttpClient& http, HttpRequest request) {
  const auto promise = std::make_shared<std::promise<HttpResult>>();
  const auto transfer = http.send(std::move(request), [promise](HttpResult result) { promise->set_value(std::move(result)); });
  HttpResult result = promise->get_future().get();
  if (const Error* error = std::get_if<Error>(&result)) {
    std::fprintf(stderr, "%s\n", error->description.value_or("no description").c_str());
    std::exit(EXIT_FAILURE);
  }
  return std::get<HttpAnswer>(std::move(result));
}

PermissionSetRef permissions(PermissionSet names) { return std::make_shared<const PermissionSet>(std::move(names)); }

std::string tokenIn(const HttpAnswer& answer) {
  const JsonParseResult parsed = NlohmannJsonParser().parse(answer.body, JsonFragments::refused);
  return *parsed.value.value().dictionary()->find("access_token")->string();
}

}  // namespace

int main(int count, char** words) {
  ServerConfiguration configuration;
  configuration.address = words[1];
  configuration.certificateAuthorities = words[2];
  const std::string token = words[3];
  const bool isBusy = count > 4;
  const FacebookServer server(configuration);
  HttpClient http(configuration.httpOptions());
  const auto none = std::nullopt;
  using namespace std::chrono_literals;

  const HttpAnswer issued = ask(http, server.authorization("app", "org.example.App", permissions({"email"}), "SELF", token));
  const std::string clientToken = isBusy ? "none" : tokenIn(issued);
  ask(http, server.authorization("app", "org.example.App", permissions({"nonsense"}), none, token));
  ask(http, server.authorization("app", "org.example.App", nullptr, none, none));
  ask(http, server.description(permissions({"user_runs"}), "EVERYONE", token));
  ask(http, server.description(permissions({"nonsense"}), none, token));
  ask(http, server.description(permissions({"user_runs"}), none, none));
  ask(http, {.url = configuration.address + "/me", .bearerToken = clientToken});
  ask(http, server.invalidation("app", 0ms, token));
  ask(http, server.invalidation("another app", 0ms, token));
  ask(http, server.invalidation("", 0ms, token));
  ask(http, server.invalidation("app", 0ms, none));
  ask(http, {.url = configuration.address + "/me", .bearerToken = clientToken});
  return EXIT_SUCCESS;
}
