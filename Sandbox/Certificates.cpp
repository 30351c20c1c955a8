#include "Sandbox/Certificates.h"

#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/rsa.h>
#include <openssl/x509v3.h>

#include <algorithm>
#include <cstdio>
#include <stdexcept>
#include <string>

namespace palisade::sandbox {
namespace {

constexpr long hour = 3600;
constexpr long year = 365 * 24 * hour;
constexpr unsigned weakKeyBits = 1024;

constexpr CertificateKindName certificateNames[] = {
    {CertificateKind::good, "good", "nothing is wrong"},
    {CertificateKind::expired, "expired", "valid until an hour ago"},
    {CertificateKind::notYetValid, "not-yet-valid", "valid from the next hour on"},
    {CertificateKind::wrongName, "wrong-name", "made out for another server"},
    {CertificateKind::selfSigned, "self-signed", "signed by nobody else"},
    {CertificateKind::unknownAuthority, "unknown-authority", "signed by an authority that clients do not know"},
    {CertificateKind::clientOnly, "client-only", "good for clients only"},
    {CertificateKind::weakKey, "weak-key", "an RSA key of 1024 bits"},
    {CertificateKind::weakSignature, "weak-signature", "signed over SHA-1"},
    {CertificateKind::notAnAuthority, "not-an-authority", "signed with a certificate that may not sign others"},
    {CertificateKind::excludedName, "excluded-name", "signed by an authority that may not sign for this machine"},
    {CertificateKind::oldProtocol, "old-protocol", "a good certificate, but nothing newer than TLS 1.1"},
    {CertificateKind::plain, "plain", "no TLS at all"},
};

void require(bool succeeded, const char* what) {
  if (succeeded) return;
  char reason[256];
  ERR_error_string_n(ERR_get_error(), reason, sizeof reason);
  throw std::runtime_error(std::string("Cannot ") + what + ": " + reason + ".");
}

struct CertificateForm {
  const char* commonName = "Palisade sandbox server";
  const char* names = "IP:127.0.0.1,DNS:localhost";
  long validFrom = -hour;
  long validUntil = year;
  const char* constraints = "critical,CA:FALSE";
  const char* use = "critical,digitalSignature";
  const char* extendedUse = "serverAuth";
  const char* nameConstraints = nullptr;
  const EVP_MD* digest = EVP_sha256();
};

constexpr const char* authorityConstraints = "critical,CA:TRUE";
constexpr const char* authorityUse = "critical,keyCertSign,cRLSign";

CertificateForm authorityForm(const char* commonName) {
  return {.commonName = commonName,
          .names = nullptr,
          .constraints = authorityConstraints,
          .use = authorityUse,
          .extendedUse = nullptr};
}

Key makeKey() {
  Key key(EVP_EC_gen("P-256"));
  require(key != nullptr, "make a key");
  return key;
}

void addExtension(X509& certificate, X509& issuer, int kind, const char* value) {
  if (value == nullptr) return;
  X509V3_CTX context;
  X509V3_set_ctx_nodb(&context);
  X509V3_set_ctx(&context, &issuer, &certificate, nullptr, nullptr, 0);
  const std::unique_ptr<X509_EXTENSION, Freer<X509_EXTENSION_free>> extension(
      X509V3_EXT_conf_nid(nullptr, &context, kind, value));
  require(extension != nullptr && X509_add_ext(&certificate, extension.get(), -1) == 1, "describe a certificate");
}

// Signed by `issuer`, or by its own key where that is none.
Identity issue(const CertificateForm& form, const Identity* issuer, Key key = makeKey()) {
  Identity identity = {.certificate = Certificate(X509_new()), .key = std::move(key)};
  require(identity.certificate != nullptr, "make a certificate");
  X509& certificate = *identity.certificate;
  X509& issuing = issuer == nullptr ? certificate : *issuer->certificate;

  X509_set_version(&certificate, X509_VERSION_3);
  const std::unique_ptr<BIGNUM, Freer<BN_free>> serial(BN_new());
  require(serial != nullptr && BN_rand(serial.get(), 127, BN_RAND_TOP_ANY, BN_RAND_BOTTOM_ANY) == 1 &&
              BN_to_ASN1_INTEGER(serial.get(), X509_get_serialNumber(&certificate)) != nullptr,
          "number a certificate");
  X509_gmtime_adj(X509_getm_notBefore(&certificate), form.validFrom);
  X509_gmtime_adj(X509_getm_notAfter(&certificate), form.validUntil);
  X509_NAME_add_entry_by_txt(X509_get_subject_name(&certificate), "CN", MBSTRING_UTF8,
                             reinterpret_cast<const unsigned char*>(form.commonName), -1, -1, 0);
  X509_set_issuer_name(&certificate, X509_get_subject_name(&issuing));
  X509_set_pubkey(&certificate, identity.key.get());
  addExtension(certificate, issuing, NID_basic_constraints, form.constraints);
  addExtension(certificate, issuing, NID_key_usage, form.use);
  addExtension(certificate, issuing, NID_ext_key_usage, form.extendedUse);
  addExtension(certificate, issuing, NID_subject_alt_name, form.names);
  addExtension(certificate, issuing, NID_name_constraints, form.nameConstraints);
  addExtension(certificate, issuing, NID_subject_key_identifier, "hash");
  if (issuer != nullptr) addExtension(certificate, issuing, NID_authority_key_identifier, "keyid:always");
  EVP_PKEY* const signingKey = issuer == nullptr ? identity.key.get() : issuer->key.get();
  require(X509_sign(&certificate, signingKey, form.digest) > 0, "sign a certificate");
  return identity;
}

using File = std::unique_ptr<std::FILE, Freer<std::fclose>>;

File openFile(const std::filesystem::path& path, const char* mode) {
  File file(std::fopen(path.c_str(), mode));
  if (file == nullptr) throw std::runtime_error("Cannot open " + path.string() + ".");
  return file;
}

}  // namespace

std::span<const CertificateKindName> certificateKinds() { return certificateNames; }

std::optional<CertificateKind> certificateKindNamed(std::string_view name) {
  const auto found = std::find_if(std::begin(certificateNames), std::end(certificateNames),
                                  [name](const auto& kind) { return kind.name == name; });
  return found == std::end(certificateNames) ? std::nullopt : std::optional(found->kind);
}

Authority::Authority(const std::filesystem::path& folder) {
  const std::filesystem::path certificatePath = folder / "ca.pem";
  const std::filesystem::path keyPath = folder / "ca.key";
  if (std::filesystem::exists(certificatePath) && std::filesystem::exists(keyPath)) {
    _own.certificate.reset(PEM_read_X509(openFile(certificatePath, "r").get(), nullptr, nullptr, nullptr));
    _own.key.reset(PEM_read_PrivateKey(openFile(keyPath, "r").get(), nullptr, nullptr, nullptr));
    require(_own.certificate != nullptr && _own.key != nullptr, "read the authority from its folder");
    return;
  }
  _own = issue(authorityForm("Palisade sandbox authority"), nullptr);
  const File keyFile = openFile(keyPath, "wx");
  require(PEM_write_PrivateKey(keyFile.get(), _own.key.get(), nullptr, nullptr, 0, nullptr, nullptr) == 1,
          "write the authority's key");
  require(PEM_write_X509(openFile(certificatePath, "w").get(), _own.certificate.get()) == 1,
          "write the authority's certificate");
}

void Authority::prepare(SSL_CTX& context, CertificateKind kind) const {
  CertificateForm form;
  Identity other;  // who signs in place of the authority
  const Identity* issuer = &_own;
  Key key = makeKey();

  switch (kind) {
    case CertificateKind::expired:
      form.validFrom = -year;
      form.validUntil = -hour;
      break;
    case CertificateKind::notYetValid: form.validFrom = hour; break;
    case CertificateKind::wrongName: form.names = "IP:192.0.2.1,DNS:server.example"; break;
    case CertificateKind::selfSigned: issuer = nullptr; break;
    case CertificateKind::unknownAuthority:
      other = issue(authorityForm("Some other authority"), nullptr);
      issuer = &other;
      break;
    case CertificateKind::clientOnly: form.extendedUse = "clientAuth"; break;
    case CertificateKind::weakKey: key.reset(EVP_RSA_gen(weakKeyBits)); break;
    case CertificateKind::weakSignature: form.digest = EVP_sha1(); break;
    case CertificateKind::notAnAuthority:
      other = issue({.commonName = "Some other server", .names = nullptr}, &_own);
      issuer = &other;
      break;
    case CertificateKind::excludedName: {
      CertificateForm authority = authorityForm("Authority for other machines");
      authority.nameConstraints = "critical,excluded;IP:127.0.0.0/255.0.0.0";
      other = issue(authority, &_own);
      issuer = &other;
      break;
    }
    case CertificateKind::good:
    case CertificateKind::oldProtocol:
    case CertificateKind::plain: break;
  }

  const Identity server = issue(form, issuer, std::move(key));
  // A server may offer what clients refuse.
  SSL_CTX_set_security_level(&context, 0);
  if (kind == CertificateKind::oldProtocol) {
    SSL_CTX_set_min_proto_version(&context, TLS1_VERSION);
    SSL_CTX_set_max_proto_version(&context, TLS1_1_VERSION);
  }
  require(SSL_CTX_use_certificate(&context, server.certificate.get()) == 1 &&
              SSL_CTX_use_PrivateKey(&context, server.key.get()) == 1,
          "use the server's certificate");
  if (other.certificate != nullptr) SSL_CTX_add1_chain_cert(&context, other.certificate.get());
}

}  // namespace palisade::sandbox
