#pragma once

/// A running palisade-sandbox of the test's own, and shorthands for asking servers.

#include <chrono>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include "Host/Http/FormEncoding.h"
#include "Host/Http/HttpClient.h"
#include "Platform/Value.h"
#include "Tests/Host/Social/ChildProcess.h"
#include "Tests/Host/TemporaryFolder.h"

class Sandbox {
 public:
  explicit Sandbox(std::vector<std::string> options = {});

  const std::string& address() const { return _address; }
  std::string url(const std::string& path) const { return _address + path; }
  std::string port() const { return _address.substr(_address.rfind(':') + 1); }
  const std::filesystem::path& folder() const { return _folder.path(); }
  std::filesystem::path authorities() const { return _folder.path() / "ca.pem"; }
  std::filesystem::path log() const { return _folder.path() / "log"; }
  const std::string& controlAddress() const { return _controlAddress; }
  const std::string& masterToken() const { return _masterToken; }

  /// Trusts this sandbox; the other options are the caller's.
  palisade::HttpClientOptions trusted(palisade::HttpClientOptions options = {}) const;

  void arm(const std::vector<palisade::FormField>& fault);
  void calm();
  palisade::Array requests();
  palisade::Array tokens();

  /// Ends it, and starts it again at the same address.
  void stop();
  void restart();

 private:
  void start(std::vector<std::string> options);
  palisade::Value control(const std::string& path, std::optional<std::string> form = std::nullopt);

  TemporaryFolder _folder;
  std::optional<ChildProcess> _process;
  std::string _address;
  std::string _controlAddress;
  std::string _controlSecret;
  std::string _masterToken;
};

/// Sends the request and waits for what comes of it.
palisade::HttpResult ask(palisade::HttpClient& client, palisade::HttpRequest request);

/// The request that an application makes with its token.
palisade::HttpRequest meRequest(const Sandbox& sandbox, std::optional<std::string> token = "nobody's");

/// The answer, or the error's code; `codeOf` answers 0 for an answer.
palisade::HttpAnswer answerOf(palisade::HttpResult result);
int codeOf(const palisade::HttpResult& result);
std::string sentenceOf(const palisade::HttpResult& result);
