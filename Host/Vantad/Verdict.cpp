#include "Host/Vantad/Verdict.h"

#include "Platform/JsonParser.h"

namespace palisade {
namespace {

enum Status : int {
  ok = 200,
  noContent = 204,
  unauthorized = 401,
  notFound = 404,
  requestTimeout = 408,
  tooEarly = 425,
  tooManyRequests = 429,
};

// The contract's word for an app that holds no token. Without it a 404 is any server's answer to a wrong path.
constexpr std::string_view unknownToken = "unknown_token";

bool saysUnknownToken(const HttpAnswer& answer, const JsonParser& json) {
  const JsonParseResult parsed = json.parse(answer.body, JsonFragments::refused);
  if (!parsed.value || parsed.value->dictionary() == nullptr) return false;
  const Value* const error = parsed.value->dictionary()->find("error");
  return error != nullptr && error->string() != nullptr && *error->string() == unknownToken;
}

bool isBusy(int status) { return status >= 500 || status == requestTimeout || status == tooEarly || status == tooManyRequests; }

Verdict judgeError(const Error& error) {
  if (error.code == HttpErrorCancelled) return {.kind = Verdict::Kind::untried};
  return {.concernsServer = true, .sentence = error.description.value_or("The server could not be asked.")};
}

}  // namespace

Verdict judge(const HttpResult& result, const JsonParser& json) {
  if (const Error* const error = std::get_if<Error>(&result)) return judgeError(*error);
  const auto& answer = std::get<HttpAnswer>(result);
  const std::string status = "status " + std::to_string(answer.statusCode);

  if (answer.statusCode == ok || answer.statusCode == noContent) return {.kind = Verdict::Kind::confirmed};
  if (answer.statusCode == notFound) {
    if (saysUnknownToken(answer, json)) return {.kind = Verdict::Kind::confirmed};
    return {
        .concernsServer = true,
        .sentence = "The server does not know what is asked of it (" + status + "). Check paths.invalidation in server.toml."};
  }
  if (answer.statusCode == unauthorized) {
    return {.sentence = "The server does not accept the account's own token (" + status + "). Add the account's new token."};
  }
  if (isBusy(answer.statusCode)) {
    return {.concernsServer = true, .retryAfter = answer.retryAfter, .sentence = "The server is busy (" + status + ")."};
  }
  if (answer.statusCode / 100 == 4) return {.kind = Verdict::Kind::refused, .sentence = "The server refused (" + status + ")."};
  return {.concernsServer = true, .sentence = "The server gave an answer that nobody expected (" + status + ")."};
}

}  // namespace palisade
