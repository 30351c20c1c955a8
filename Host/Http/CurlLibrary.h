#pragma once

/// libcurl, loaded when the first request is sent.
///
/// Loading it with the two dozen libraries behind it takes longer than everything else that a daemon does at its start, and
/// more memory than the rest of a daemon at rest; most sessions never send a request. So nothing is linked against libcurl: its
/// functions are looked up by name, once, with their types from its header.
/// Threads: `loaded` may be called from any thread; which thread may call what afterwards is libcurl's rule. Ownership: the
/// library stays until the process ends. Errors: throws `std::runtime_error` with a sentence when the library is missing or
/// refuses to start, and tries again the next time.

#define CURL_DISABLE_TYPECHECK
#include <curl/curl.h>

namespace palisade {

struct CurlLibrary {
  decltype(&curl_easy_init) easyInit;
  decltype(&curl_easy_cleanup) easyCleanup;
  decltype(&curl_easy_setopt) easySet;
  decltype(&curl_easy_getinfo) easyGetInfo;
  decltype(&curl_easy_strerror) easyMessage;
  decltype(&curl_multi_init) multiInit;
  decltype(&curl_multi_cleanup) multiCleanup;
  decltype(&curl_multi_setopt) multiSet;
  decltype(&curl_multi_add_handle) multiAdd;
  decltype(&curl_multi_remove_handle) multiRemove;
  decltype(&curl_multi_perform) multiPerform;
  decltype(&curl_multi_poll) multiPoll;
  decltype(&curl_multi_wakeup) multiWakeUp;
  decltype(&curl_multi_info_read) multiReadInfo;
  decltype(&curl_slist_append) listAppend;
  decltype(&curl_slist_free_all) listFree;

  /// OpenSSL's SSL_CTX_set_keylog_callback and SSL_has_pending.
  void (*setKeyLogCallback)(void* sslContext, void (*callback)(const void*, const char*));
  int (*tlsHasPending)(const void* connection);

  static const CurlLibrary& loaded();
};

}  // namespace palisade
