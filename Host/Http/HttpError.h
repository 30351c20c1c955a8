#pragma once

/// What can go wrong between this machine and a server, as errors in `HttpErrorDomain`.
///
/// Every error carries one sentence for people that names the server and never holds a byte of what was sent or received.
/// Threads and ownership: values.

#include <string>
#include <string_view>

#include "Platform/Error.h"

namespace palisade {

inline constexpr std::string_view HttpErrorDomain = "HttpErrorDomain";

/// Codes in `HttpErrorDomain`.
enum HttpErrorCode : int {
  HttpErrorUnreachable = 1,     ///< the name has no address, or nobody accepts connections at it
  HttpErrorTimedOut = 2,        ///< connecting, waiting for the next byte or the whole exchange took too long
  HttpErrorTls = 3,             ///< no secure connection: the server's certificate, or the list of authorities, is no good
  HttpErrorTooLarge = 4,        ///< the answer's head or body exceeds what a client is willing to read
  HttpErrorRedirect = 5,        ///< the server points elsewhere (any 3xx); nobody goes there
  HttpErrorReset = 6,           ///< the connection ended before the answer did
  HttpErrorCancelled = 7,       ///< whoever sent the request gave it up, or the client is shutting down
  HttpErrorMalformed = 8,       ///< the answer is not HTTP, or is encoded in a way that nobody asked for
  HttpErrorInvalidRequest = 9,  ///< the address is no HTTPS address, or the token cannot stand in a header
  HttpErrorUnavailable = 10,    ///< this machine cannot send requests: no HTTP library, no server configured, or no memory
  HttpErrorStatus = 11,         ///< the server answered that it will not or cannot do it
};

inline Error httpError(HttpErrorCode code, std::string sentence) {
  return {.domain = std::string(HttpErrorDomain), .code = code, .description = std::move(sentence)};
}

}  // namespace palisade
