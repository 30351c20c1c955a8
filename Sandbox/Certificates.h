#pragma once

/// Certificates for the sandbox's server: a good one, and one for each reason to refuse a server.
///
/// Threads: none of its own. Ownership: reference-counted by the TLS library behind unique pointers. Errors:
/// `std::runtime_error` that says what could not be made, read or written.

#include <openssl/evp.h>
#include <openssl/ssl.h>
#include <openssl/x509.h>

#include <filesystem>
#include <memory>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

namespace palisade::sandbox {

template <auto free>
struct Freer {
  template <typename Object>
  void operator()(Object* object) const {
    free(object);
  }
};
using Key = std::unique_ptr<EVP_PKEY, Freer<EVP_PKEY_free>>;
using Certificate = std::unique_ptr<X509, Freer<X509_free>>;

/// What is wrong with the server, as `--certificate` names it.
enum class CertificateKind {
  good,
  expired,
  notYetValid,
  wrongName,
  selfSigned,
  unknownAuthority,
  clientOnly,
  weakKey,
  weakSignature,
  notAnAuthority,
  excludedName,
  oldProtocol,
  plain
};

struct CertificateKindName {
  CertificateKind kind;
  std::string_view name;
  std::string_view explanation;
};

std::span<const CertificateKindName> certificateKinds();

/// None for a name that stands for nothing.
std::optional<CertificateKind> certificateKindNamed(std::string_view name);

struct Identity {
  Certificate certificate;
  Key key;
};

/// The sandbox's own authority, whose certificate clients are told to trust.
class Authority {
 public:
  /// Reads it from `ca.pem` and `ca.key` in the folder, or makes both.
  explicit Authority(const std::filesystem::path& folder);

  /// Makes the context a server's whose certificate is of that kind. Not for `plain`, which has none.
  void prepare(SSL_CTX& context, CertificateKind kind) const;

 private:
  Identity _own;
};

}  // namespace palisade::sandbox
