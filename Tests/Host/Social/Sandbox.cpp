#include "Tests/Host/Social/Sandbox.h"

#include <gtest/gtest.h>

#include <csignal>
#include <fstream>
#include <future>
#include <sstream>
#include <utility>

#include "Host/Json/Json.h"

using namespace palisade;

Sandbox::Sandbox(std::vector<std::string> options) { start(std::move(options)); }

void Sandbox::start(std::vector<std::string> options) {
  options.insert(options.end(), {"--directory", _folder.path().string()});
  _process.emplace(ChildProcess::Command{.program = SANDBOX_PROGRAM, .arguments = options, .log = log()});
  std::istringstream line(_process->readLine().value_or(""));
  line >> _address >> _controlAddress;
  if (_controlAddress.empty()) throw std::runtime_error("the sandbox did not start");
  std::ifstream(_folder.path() / "master-token") >> _masterToken;
  std::ifstream(_folder.path() / "control-secret") >> _controlSecret;
}

void Sandbox::stop() {
  _process->signal(SIGTERM);
  EXPECT_EQ(_process->wait(), 0);
  _process.reset();
}

void Sandbox::restart() { start({"--port", port()}); }

HttpClientOptions Sandbox::trusted(HttpClientOptions options) const {
  options.certificateAuthorities = authorities();
  return options;
}

Value Sandbox::control(const std::string& path, std::optional<std::string> form) {
  HttpClient client(trusted({.bodyLimit = 10'000'000}));
  const HttpAnswer answer =
      answerOf(ask(client, {.url = _controlAddress + path, .bearerToken = _controlSecret, .form = std::move(form)}));
  EXPECT_EQ(answer.statusCode, 200) << answer.body;
  return NlohmannJsonParser().parse(answer.body, JsonFragments::refused).value.value();
}

void Sandbox::arm(const std::vector<FormField>& fault) { control("/faults", formEncoded(fault)); }
void Sandbox::calm() { control("/calm", ""); }
Array Sandbox::requests() { return *control("/requests").array(); }
Array Sandbox::tokens() { return *control("/tokens").array(); }

HttpResult ask(HttpClient& client, HttpRequest request) {
  // The handler may still be on its way out when its result is here.
  const auto promise = std::make_shared<std::promise<HttpResult>>();
  const auto transfer =
      client.send(std::move(request), [promise](HttpResult result) { promise->set_value(std::move(result)); });
  return promise->get_future().get();
}

HttpRequest meRequest(const Sandbox& sandbox, std::optional<std::string> token) {
  return {.url = sandbox.url("/me"), .bearerToken = std::move(token)};
}

HttpAnswer answerOf(HttpResult result) {
  EXPECT_EQ(codeOf(result), 0) << sentenceOf(result);
  return std::holds_alternative<HttpAnswer>(result) ? std::get<HttpAnswer>(std::move(result)) : HttpAnswer{};
}

int codeOf(const HttpResult& result) {
  const Error* error = std::get_if<Error>(&result);
  return error == nullptr ? 0 : error->code;
}

std::string sentenceOf(const HttpResult& result) {
  const Error* error = std::get_if<Error>(&result);
  return error == nullptr ? "no error" : error->description.value_or("no description");
}
