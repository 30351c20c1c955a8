#pragma once

/// Sends requests over HTTPS.
///
/// What it never does: speak anything but HTTPS, follow a redirect, take a proxy or a key log from the environment, ask for
/// compression, or keep more of an answer than `bodyLimit`. A server that cannot prove who it is sees no byte of a request.
/// Threads: every operation may be called from any thread. One thread, started with the first request, carries all transfers;
/// the HTTP library is loaded with it. Handlers run on threads of their own, so a handler that takes its time delays neither
/// the transfers nor, up to eight of them, other handlers.
/// Ownership: a request belongs to the `HttpTransfer` that `send` returns; destroying that cancels the request, unless its
/// handler has been called or is about to be. Handlers own what they use. The client must not be destroyed by a handler.
/// Errors: all that goes wrong reaches the handler as an error in `HttpErrorDomain`. `send` throws only when no thread can be
/// started; the handler is then dropped.

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <variant>

#include "Host/Http/HttpError.h"

namespace palisade {

class TransferThread;

struct HttpClientOptions {
  /// A file of PEM certificates to trust instead of the system's; none trusts the system's.
  std::optional<std::filesystem::path> certificateAuthorities = std::nullopt;
  /// The address of a proxy; none connects directly.
  std::optional<std::string> proxy = std::nullopt;
  std::chrono::milliseconds connectLimit = std::chrono::seconds(30);
  /// How long a transfer may stand still.
  std::chrono::seconds stallLimit = std::chrono::seconds(60);
  std::chrono::milliseconds totalLimit = std::chrono::seconds(300);
  /// The most bytes, after all decoding, that an answer's body may have; its head may have as many.
  std::size_t bodyLimit = 64 * 1024;
};

struct HttpRequest {
  std::string url;
  /// Sent in the Authorization header; none sends no such header.
  std::optional<std::string> bearerToken = std::nullopt;
  /// Makes the request a POST of this form-encoded text; none makes it a GET.
  std::optional<std::string> form = std::nullopt;
};

/// What the server answered, with any status but 3xx.
struct HttpAnswer {
  int statusCode = 0;
  /// The media type in lower case without its parameters, "application/json" say; empty when the server named none.
  std::string mediaType;
  std::string body;
  /// How long the server asks to be left alone.
  std::optional<std::chrono::seconds> retryAfter;
};

using HttpResult = std::variant<HttpAnswer, Error>;

/// Called exactly once for each request, also when it is cancelled and when the client is destroyed. Must not throw.
using HttpHandler = std::function<void(HttpResult result)>;

/// A request under way.
class HttpTransfer {
 public:
  HttpTransfer(std::weak_ptr<TransferThread> thread, std::uint64_t number);
  HttpTransfer(const HttpTransfer&) = delete;
  HttpTransfer& operator=(const HttpTransfer&) = delete;

  /// Cancels; does not wait for the handler.
  ~HttpTransfer();

  /// Lets the request go on without an owner: it ends with its answer, or with the client.
  void letGo() { _thread.reset(); }

 private:
  std::weak_ptr<TransferThread> _thread;
  std::uint64_t _number;
};

class HttpClient {
 public:
  explicit HttpClient(HttpClientOptions options = {});
  HttpClient(const HttpClient&) = delete;
  HttpClient& operator=(const HttpClient&) = delete;

  /// Cancels what is under way and returns when every handler has returned.
  ~HttpClient();

  [[nodiscard]] std::unique_ptr<HttpTransfer> send(HttpRequest request, HttpHandler handler);

 private:
  std::shared_ptr<TransferThread> _thread;
};

}  // namespace palisade
