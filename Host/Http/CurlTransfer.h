#pragma once

/// One request and its answer, as libcurl carries it.
///
/// Threads: made, carried and destroyed on the transfer thread. Ownership: its handle must have been taken out of the multi
/// handle before it is destroyed. Errors: a request that cannot be prepared throws `std::runtime_error` or `std::bad_alloc`
/// from the constructor.

#include <array>
#include <memory>
#include <string>

#include "Host/Http/CurlLibrary.h"
#include "Host/Http/HttpClient.h"

namespace palisade {

class CurlTransfer {
 public:
  CurlTransfer(const CurlLibrary& curl, const HttpClientOptions& options, HttpRequest request);
  CurlTransfer(const CurlTransfer&) = delete;
  CurlTransfer& operator=(const CurlTransfer&) = delete;

  CURL* handle() const { return _handle.get(); }

  /// Whether nothing has been sent, because the connection that was to be used again had been spoilt. The transfer is then
  /// ready to be carried on a fresh one.
  bool mustStartAfresh();

  /// What came of it. To be asked once, when libcurl has said how the transfer ended.
  HttpResult result(CURLcode code);

 private:
  template <typename Setting>
  void set(CURLoption option, Setting setting);
  void setRequest();
  void setLimits();
  void setSecurity();
  void setHeaders();

  static std::size_t takeBody(char* bytes, std::size_t size, std::size_t count, void* transfer) noexcept;
  static std::size_t takeHeader(char* bytes, std::size_t size, std::size_t count, void* transfer) noexcept;

  static int beforeRequest(void* transfer, char*, char*, int, int) noexcept;
  bool isSpoilt() const;

  Error failure(CURLcode code) const;
  std::string server() const;

  const CurlLibrary& _curl;
  const HttpClientOptions& _options;
  const HttpRequest _request;
  std::unique_ptr<CURL, decltype(&curl_easy_cleanup)> _handle;
  std::unique_ptr<curl_slist, decltype(&curl_slist_free_all)> _headers;
  std::array<char, CURL_ERROR_SIZE> _message = {};
  std::string _body;
  std::size_t _headSize = 0;
  bool _mustStartAfresh = false;
  bool _headIsComplete = false;
  bool _tooLarge = false;
  bool _outOfMemory = false;
  bool _encoded = false;
};

}  // namespace palisade
