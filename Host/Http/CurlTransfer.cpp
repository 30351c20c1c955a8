#include "Host/Http/CurlTransfer.h"

/// Everything that a transfer may and may not do is said to libcurl here, also where its default would do: what a default
/// leaves open, the environment decides.

#include <poll.h>
#include <sys/socket.h>

#include <algorithm>
#include <cctype>
#include <new>
#include <stdexcept>
#include <string_view>
#include <utility>

namespace palisade {
namespace {

constexpr long smallestUploadBuffer = 16 * 1024;  // the library takes no less
constexpr long receiveBuffer = 4 * 1024;

constexpr auto authoritiesAreKept = std::chrono::hours(1);

// No socket is inherited by the programs that a daemon starts.
curl_socket_t openSocket(void*, curlsocktype, curl_sockaddr* address) {
  return socket(address->family, address->socktype | SOCK_CLOEXEC, address->protocol);
}

CURLcode forgetKeyLog(CURL*, void* sslContext, void* library) {
  static_cast<const CurlLibrary*>(library)->setKeyLogCallback(sslContext, nullptr);
  return CURLE_OK;
}

bool isPrintable(std::string_view text) {
  return std::none_of(text.begin(), text.end(), [](unsigned char byte) { return byte < 0x20 || byte == 0x7F; });
}

char lowerCase(char character) {
  return character >= 'A' && character <= 'Z' ? static_cast<char>(character - 'A' + 'a') : character;
}

std::string inLowerCase(std::string_view text) {
  std::string lowered(text);
  std::transform(lowered.begin(), lowered.end(), lowered.begin(), lowerCase);
  return lowered;
}

// `word` is in lower case. It takes no memory: the library's callbacks must not throw.
bool isSameWord(std::string_view text, std::string_view word) {
  return std::equal(text.begin(), text.end(), word.begin(), word.end(),
                    [](char one, char other) { return lowerCase(one) == other; });
}

std::string_view withoutBlanks(std::string_view text) {
  const std::size_t first = text.find_first_not_of(" \t\r\n");
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(" \t\r\n") - first + 1);
}

}  // namespace

CurlTransfer::CurlTransfer(const CurlLibrary& curl, const HttpClientOptions& options, HttpRequest request)
    : _curl(curl),
      _options(options),
      _request(std::move(request)),
      _handle(curl.easyInit(), curl.easyCleanup),
      _headers(nullptr, curl.listFree) {
  if (_handle == nullptr) throw std::bad_alloc();
  set(CURLOPT_ERRORBUFFER, _message.data());
  setRequest();
  setLimits();
  setSecurity();
  setHeaders();
}

template <typename Setting>
void CurlTransfer::set(CURLoption option, Setting setting) {
  const CURLcode code = _curl.easySet(_handle.get(), option, setting);
  if (code == CURLE_OUT_OF_MEMORY) throw std::bad_alloc();
  if (code != CURLE_OK) throw std::runtime_error(std::string("The HTTP library is unfit: ") + _curl.easyMessage(code) + ".");
}

void CurlTransfer::setRequest() {
  if (_request.url.empty()) throw std::runtime_error("No server is configured: its address is missing.");
  set(CURLOPT_URL, _request.url.c_str());
  set(CURLOPT_USERAGENT, "palisade");
  set(CURLOPT_HTTP_VERSION, long{CURL_HTTP_VERSION_1_1});
  if (_request.form) {
    set(CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(_request.form->size()));
    set(CURLOPT_POSTFIELDS, _request.form->c_str());
  }
  set(CURLOPT_WRITEFUNCTION, &CurlTransfer::takeBody);
  set(CURLOPT_WRITEDATA, this);
  set(CURLOPT_HEADERFUNCTION, &CurlTransfer::takeHeader);
  set(CURLOPT_HEADERDATA, this);
  set(CURLOPT_PREREQFUNCTION, &CurlTransfer::beforeRequest);
  set(CURLOPT_PREREQDATA, this);
}

void CurlTransfer::setLimits() {
  set(CURLOPT_CONNECTTIMEOUT_MS, static_cast<long>(_options.connectLimit.count()));
  set(CURLOPT_LOW_SPEED_LIMIT, 1L);
  set(CURLOPT_LOW_SPEED_TIME, static_cast<long>(_options.stallLimit.count()));
  set(CURLOPT_TIMEOUT_MS, static_cast<long>(_options.totalLimit.count()));
  // The library holds this against what a server announces only; `takeBody` counts what comes.
  set(CURLOPT_MAXFILESIZE_LARGE, static_cast<curl_off_t>(_options.bodyLimit));
  set(CURLOPT_NOSIGNAL, 1L);
  // What is sent and what comes are small, and every buffer is wiped when it is freed.
  set(CURLOPT_UPLOAD_BUFFERSIZE, smallestUploadBuffer);
  set(CURLOPT_BUFFERSIZE, receiveBuffer);
  // A name server that stays silent must not hold up the other transfers when this one ends.
  set(CURLOPT_QUICK_EXIT, 1L);
}

void CurlTransfer::setSecurity() {
  set(CURLOPT_PROTOCOLS_STR, "https");
  set(CURLOPT_DISALLOW_USERNAME_IN_URL, 1L);
  set(CURLOPT_FOLLOWLOCATION, 0L);
  set(CURLOPT_HTTP09_ALLOWED, 0L);
  set(CURLOPT_PROXY, _options.proxy ? _options.proxy->c_str() : "");
  set(CURLOPT_NOPROXY, "");
  set(CURLOPT_SUPPRESS_CONNECT_HEADERS, 1L);
  set(CURLOPT_NETRC, long{CURL_NETRC_IGNORED});
  set(CURLOPT_SSLVERSION, long{CURL_SSLVERSION_TLSv1_2});
  set(CURLOPT_SSL_VERIFYPEER, 1L);
  set(CURLOPT_SSL_VERIFYHOST, 2L);
  // Without a folder of authorities the library reads the file of authorities once and keeps it for later connections. It
  // looks again after a while, since an authority may have lost its trust.
  set(CURLOPT_CAPATH, static_cast<const char*>(nullptr));
  set(CURLOPT_CA_CACHE_TIMEOUT, static_cast<long>(std::chrono::seconds(authoritiesAreKept).count()));
  if (_options.certificateAuthorities) set(CURLOPT_CAINFO, _options.certificateAuthorities->c_str());
  set(CURLOPT_SSL_CTX_FUNCTION, &forgetKeyLog);
  set(CURLOPT_SSL_CTX_DATA, &_curl);
  set(CURLOPT_OPENSOCKETFUNCTION, &openSocket);
}

void CurlTransfer::setHeaders() {
  const auto add = [this](const std::string& line) {
    curl_slist* const longer = _curl.listAppend(_headers.get(), line.c_str());
    if (longer == nullptr) throw std::bad_alloc();
    static_cast<void>(_headers.release());  // it is the end of the longer one now
    _headers.reset(longer);
  };
  add("Accept: application/json");
  add("Expect:");  // a body is sent at once, without asking whether it is welcome
  if (_request.bearerToken) {
    if (!isPrintable(*_request.bearerToken)) throw std::invalid_argument("A token holds a control character.");
    add("Authorization: Bearer " + *_request.bearerToken);
  }
  set(CURLOPT_HTTPHEADER, _headers.get());
}

std::size_t CurlTransfer::takeBody(char* bytes, std::size_t size, std::size_t count, void* transfer) noexcept {
  auto& self = *static_cast<CurlTransfer*>(transfer);
  const std::size_t length = size * count;
  self._tooLarge = length > self._options.bodyLimit - self._body.size();
  if (self._tooLarge) return 0;
  // An exception must not pass through the library, which is written in C.
  try {
    self._body.append(bytes, length);
  } catch (const std::bad_alloc&) {
    self._outOfMemory = true;
    return 0;
  }
  return length;
}

std::size_t CurlTransfer::takeHeader(char* bytes, std::size_t size, std::size_t count, void* transfer) noexcept {
  auto& self = *static_cast<CurlTransfer*>(transfer);
  const std::size_t length = size * count;
  self._tooLarge = length > self._options.bodyLimit - self._headSize;
  if (self._tooLarge) return 0;
  self._headSize += length;

  const std::string_view line(bytes, length);
  if (line.starts_with("HTTP/")) self._headIsComplete = false;
  if (line == "\r\n" || line == "\n") self._headIsComplete = true;
  const std::size_t colon = line.find(':');
  if (colon != std::string_view::npos && isSameWord(line.substr(0, colon), "content-encoding")) {
    self._encoded = !isSameWord(withoutBlanks(line.substr(colon + 1)), "identity");
    if (self._encoded) return 0;
  }
  return length;
}

int CurlTransfer::beforeRequest(void* transfer, char*, char*, int, int) noexcept {
  auto& self = *static_cast<CurlTransfer*>(transfer);
  self._mustStartAfresh = self.isSpoilt();
  return self._mustStartAfresh ? CURL_PREREQFUNC_ABORT : CURL_PREREQFUNC_OK;
}

// A server that has said something on a kept connection before it was asked, an answer twice say, would have that taken for the
// answer to this request: for another client's token, perhaps.
bool CurlTransfer::isSpoilt() const {
  long newConnections = 0;
  _curl.easyGetInfo(_handle.get(), CURLINFO_NUM_CONNECTS, &newConnections);
  if (newConnections > 0) return false;
  pollfd connection = {.fd = -1, .events = POLLIN, .revents = 0};
  _curl.easyGetInfo(_handle.get(), CURLINFO_ACTIVESOCKET, &connection.fd);
  if (poll(&connection, 1, 0) != 0) return true;
  const curl_tlssessioninfo* tls = nullptr;
  _curl.easyGetInfo(_handle.get(), CURLINFO_TLS_SSL_PTR, &tls);
  return tls != nullptr && tls->internals != nullptr && _curl.tlsHasPending(tls->internals) != 0;
}

bool CurlTransfer::mustStartAfresh() {
  if (!std::exchange(_mustStartAfresh, false)) return false;
  set(CURLOPT_FRESH_CONNECT, 1L);
  return true;
}

HttpResult CurlTransfer::result(CURLcode code) {
  if (code != CURLE_OK) return failure(code);
  // The library is content with a head that breaks off, and takes it for an answer without a body.
  if (!_headIsComplete) return failure(CURLE_PARTIAL_FILE);
  long status = 0;
  _curl.easyGetInfo(_handle.get(), CURLINFO_RESPONSE_CODE, &status);
  if (status >= 300 && status < 400) {
    return httpError(HttpErrorRedirect, server() + " answered with a redirect (status " + std::to_string(status) +
                                            "), and redirects are not followed. Check the configured address and paths.");
  }

  HttpAnswer answer = {.statusCode = static_cast<int>(status), .mediaType = {}, .body = std::move(_body), .retryAfter = {}};
  const char* type = nullptr;
  _curl.easyGetInfo(_handle.get(), CURLINFO_CONTENT_TYPE, &type);
  if (type != nullptr) {
    const std::string_view value = type;
    answer.mediaType = inLowerCase(withoutBlanks(value.substr(0, value.find(';'))));
  }
  curl_off_t seconds = 0;
  _curl.easyGetInfo(_handle.get(), CURLINFO_RETRY_AFTER, &seconds);
  if (seconds > 0) answer.retryAfter = std::chrono::seconds(seconds);
  return answer;
}

Error CurlTransfer::failure(CURLcode code) const {
  // The library's own words say which limit was reached, or what is wrong with a certificate. They hold nothing of the body.
  const std::string reason = _message.front() != '\0' ? _message.data() : _curl.easyMessage(code);
  if (_tooLarge || code == CURLE_FILESIZE_EXCEEDED) {
    return httpError(HttpErrorTooLarge,
                     server() + " sent more than " + std::to_string(_options.bodyLimit) + " bytes; the answer was dropped.");
  }
  if (_outOfMemory || code == CURLE_OUT_OF_MEMORY) {
    return httpError(HttpErrorUnavailable, "There is no memory left for the server's answer.");
  }
  if (_encoded) return httpError(HttpErrorMalformed, server() + " sent a compressed answer, which nobody asked for.");
  switch (code) {
    case CURLE_COULDNT_RESOLVE_HOST:
    case CURLE_COULDNT_RESOLVE_PROXY:
    case CURLE_COULDNT_CONNECT:
    case CURLE_PROXY: return httpError(HttpErrorUnreachable, server() + " cannot be reached: " + reason + ".");
    case CURLE_OPERATION_TIMEDOUT: return httpError(HttpErrorTimedOut, server() + " took too long: " + reason + ".");
    case CURLE_SSL_CONNECT_ERROR:
    case CURLE_PEER_FAILED_VERIFICATION:
    case CURLE_SSL_CERTPROBLEM:
    case CURLE_SSL_CIPHER:
    case CURLE_SSL_CACERT_BADFILE:
    case CURLE_SSL_ISSUER_ERROR:
    case CURLE_SSL_INVALIDCERTSTATUS:
      return httpError(HttpErrorTls, "There is no secure connection to " + server() + ": " + reason + ".");
    case CURLE_SEND_ERROR:
    case CURLE_RECV_ERROR:
    case CURLE_PARTIAL_FILE:
    case CURLE_GOT_NOTHING:
      return httpError(HttpErrorReset, "The connection to " + server() + " ended before the answer did: " + reason + ".");
    case CURLE_UNSUPPORTED_PROTOCOL:
      // Of an HTTPS server this says that its answer is older than any protocol that is spoken today.
      if (_request.url.starts_with("https://")) break;
      [[fallthrough]];
    case CURLE_URL_MALFORMAT:
    case CURLE_LOGIN_DENIED:
      return httpError(HttpErrorInvalidRequest, "The server's address is no HTTPS address: " + reason + ".");
    default: break;
  }
  return httpError(HttpErrorMalformed, server() + " sent no proper answer: " + reason + ".");
}

std::string CurlTransfer::server() const {
  std::string_view name = _request.url;
  if (const std::size_t scheme = name.find("://"); scheme != std::string_view::npos) name.remove_prefix(scheme + 3);
  name = name.substr(0, name.find_first_of("/?#"));
  return "The server at " + std::string(name.substr(name.rfind('@') + 1));  // npos + 1 is 0: no user stands before it
}

}  // namespace palisade
