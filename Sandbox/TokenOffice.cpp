#include "Sandbox/TokenOffice.h"

#include <openssl/rand.h>

#include <algorithm>
#include <array>
#include <stdexcept>
#include <utility>

namespace palisade::sandbox {
namespace {

// The contract's answer for permissions that the server cannot put into words.
constexpr std::string_view cannotDescribe = "API_EC_PARAM";

Answer unsignedRequest() {
  return errorAnswer(401, "invalid_token", "The request is not signed with a token that this server knows.");
}

Array asArray(const Permissions& permissions) { return {permissions.begin(), permissions.end()}; }

}  // namespace

std::string randomText(std::size_t bytes) {
  std::vector<unsigned char> random(bytes);
  if (RAND_bytes(random.data(), static_cast<int>(bytes)) != 1) throw std::runtime_error("There are no random numbers.");
  static constexpr std::string_view digits = "0123456789abcdef";
  std::string text;
  for (const unsigned char byte : random) {
    text += digits[byte >> 4U];
    text += digits[byte & 0x0FU];
  }
  return text;
}

TokenOffice::TokenOffice(std::string masterToken, PermissionList permissions)
    : _masterToken(std::move(masterToken)),
      _permissions(std::move(permissions)) {}

Answer TokenOffice::authorize(const std::optional<std::string>& masterToken, const AuthorizationForm& form) {
  if (masterToken != _masterToken) return unsignedRequest();
  if (form.appID.empty()) return errorAnswer(400, "invalid_request", "The app ID is missing.");
  if (form.bundleID.empty()) return errorAnswer(400, "invalid_request", "The bundle ID is missing.");
  for (const std::string& name : form.permissions) {
    if (!_permissions.knows(name)) {
      return errorAnswer(400, "unknown_permission", "There is no permission called \"" + name + "\".");
    }
  }

  const std::lock_guard lock(_mutex);
  Token token = {.text = "sandbox-" + randomText(24), .form = form, .issuedAt = std::chrono::steady_clock::now()};
  for (const Token& earlier : _tokens) {
    if (earlier.isValid && earlier.form.appID == form.appID && earlier.form.bundleID == form.bundleID) {
      token.form.permissions.insert(earlier.form.permissions.begin(), earlier.form.permissions.end());
    }
  }
  _tokens.push_back(token);
  return {.body = Dictionary{{"access_token", token.text}, {"permissions", asArray(token.form.permissions)}}};
}

Answer TokenOffice::describe(const std::optional<std::string>& masterToken, const Permissions& permissions) const {
  if (masterToken != _masterToken) return unsignedRequest();
  std::string description;
  for (const std::string& name : permissions) {
    const std::optional<std::string> words = _permissions.wordsFor(name);
    if (!words) return {.body = cannotDescribe};
    if (!description.empty()) description += ", ";
    description += *words;
  }
  if (description.empty()) return {.body = cannotDescribe};
  return {.body = description};
}

Answer TokenOffice::invalidate(const std::optional<std::string>& masterToken, const std::string& appID,
                               std::chrono::milliseconds age) {
  if (masterToken != _masterToken) return unsignedRequest();
  if (appID.empty()) return errorAnswer(400, "invalid_request", "The app ID is missing.");

  const std::lock_guard lock(_mutex);
  const auto until = std::chrono::steady_clock::now() - age;
  bool isKnown = false;
  for (Token& token : _tokens) {
    if (token.form.appID != appID || token.issuedAt > until) continue;
    isKnown = true;
    token.isValid = false;
  }
  return isKnown ? Answer{.status = 204} : errorAnswer(404, "unknown_token", "The app holds no token.");
}

Answer TokenOffice::me(const std::optional<std::string>& token) const {
  const std::lock_guard lock(_mutex);
  for (const Token& issued : _tokens) {
    if (token != issued.text || !issued.isValid) continue;
    return {.body = Dictionary{{"app_id", issued.form.appID},
                               {"bundle_id", issued.form.bundleID},
                               {"permissions", asArray(issued.form.permissions)},
                               {"audience", issued.form.audience.empty() ? Value() : Value(issued.form.audience)}}};
  }
  return errorAnswer(401, "invalid_token", "The token is not valid, or not any more.");
}

Answer TokenOffice::issued() const {
  const std::lock_guard lock(_mutex);
  Array tokens;
  for (const Token& token : _tokens) {
    tokens.push_back(Dictionary{{"access_token", token.text},
                                {"app_id", token.form.appID},
                                {"bundle_id", token.form.bundleID},
                                {"permissions", asArray(token.form.permissions)},
                                {"audience", token.form.audience.empty() ? Value() : Value(token.form.audience)},
                                {"valid", token.isValid}});
  }
  return {.body = std::move(tokens)};
}

}  // namespace palisade::sandbox
