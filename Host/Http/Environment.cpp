#include "Host/Http/Environment.h"

#include <cstdlib>

namespace palisade {

void forgetNetworkEnvironment() {
  static constexpr const char* names[] = {
      "http_proxy",      "https_proxy",     "HTTPS_PROXY",      "all_proxy",    "ALL_PROXY",        "no_proxy",
      "NO_PROXY",        "SSLKEYLOGFILE",   "SSL_CERT_FILE",    "SSL_CERT_DIR", "OPENSSL_CONF",     "OPENSSL_CONF_INCLUDE",
      "OPENSSL_MODULES", "OPENSSL_ENGINES", "CURL_CA_BUNDLE",   "CURL_HOME",    "CURL_SSL_BACKEND", "HOSTALIASES",
      "LOCALDOMAIN",     "RES_OPTIONS",     "RESOLV_HOST_CONF",
  };
  for (const char* name : names) unsetenv(name);
}

}  // namespace palisade
