#include "Host/Http/CurlLibrary.h"

#include <dlfcn.h>

#include <stdexcept>
#include <string>

#include "Host/Secrets/WipingMemory.h"

namespace palisade {
namespace {

constexpr const char* libraryName = "libcurl.so.4";

// Looks in the library and in the libraries that it brought along.
template <typename Function>
void find(void* library, const char* name, Function& function) {
  void* const address = dlsym(library, name);
  if (address == nullptr) throw std::runtime_error(std::string(libraryName) + " lacks the function " + name + ".");
  function = reinterpret_cast<Function>(address);
}

CurlLibrary load() {
  void* const library = dlopen(libraryName, RTLD_NOW | RTLD_LOCAL);
  if (library == nullptr) {
    throw std::runtime_error(std::string("The HTTP library cannot be loaded: ") + dlerror() +
                             ". Install the package libcurl4.");
  }

  // Tokens pass through buffers of both libraries, and neither clears what it frees. OpenSSL takes the functions only before it
  // is first used: in a process that uses it otherwise too, it keeps its own.
  int (*setCryptoMemory)(decltype(&wipingMallocAt), decltype(&wipingReallocAt), decltype(&wipingFreeAt)) = nullptr;
  find(library, "CRYPTO_set_mem_functions", setCryptoMemory);
  setCryptoMemory(wipingMallocAt, wipingReallocAt, wipingFreeAt);
  decltype(&curl_global_init_mem) initialize = nullptr;
  find(library, "curl_global_init_mem", initialize);
  if (initialize(CURL_GLOBAL_DEFAULT, wipingMalloc, wipingFree, wipingRealloc, wipingStrdup, wipingCalloc) != CURLE_OK) {
    throw std::runtime_error("The HTTP library refuses to start.");
  }

  CurlLibrary curl;
  find(library, "curl_easy_init", curl.easyInit);
  find(library, "curl_easy_cleanup", curl.easyCleanup);
  find(library, "curl_easy_setopt", curl.easySet);
  find(library, "curl_easy_getinfo", curl.easyGetInfo);
  find(library, "curl_easy_strerror", curl.easyMessage);
  find(library, "curl_multi_init", curl.multiInit);
  find(library, "curl_multi_cleanup", curl.multiCleanup);
  find(library, "curl_multi_setopt", curl.multiSet);
  find(library, "curl_multi_add_handle", curl.multiAdd);
  find(library, "curl_multi_remove_handle", curl.multiRemove);
  find(library, "curl_multi_perform", curl.multiPerform);
  find(library, "curl_multi_poll", curl.multiPoll);
  find(library, "curl_multi_wakeup", curl.multiWakeUp);
  find(library, "curl_multi_info_read", curl.multiReadInfo);
  find(library, "curl_slist_append", curl.listAppend);
  find(library, "curl_slist_free_all", curl.listFree);
  find(library, "SSL_CTX_set_keylog_callback", curl.setKeyLogCallback);
  find(library, "SSL_has_pending", curl.tlsHasPending);
  return curl;
}

}  // namespace

const CurlLibrary& CurlLibrary::loaded() {
  static const CurlLibrary library = load();
  return library;
}

}  // namespace palisade
