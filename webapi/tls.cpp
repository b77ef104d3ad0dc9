#include "webapi/tls.h"

#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/rand.h>
#include <openssl/x509v3.h>

#include <array>
#include <cstdio>
#include <sstream>

namespace vornwebapi {
namespace {

constexpr const char *kKeyFile = "tls.key";
constexpr const char *kCertificateFile = "tls.crt";
constexpr const char *kLastDay = "20491231235959Z"; // nobody renews a device's own certificate

template <auto Free> struct Deleter {
  template <typename T> void operator()(T *object) const { Free(object); }
};
using Key = std::unique_ptr<EVP_PKEY, Deleter<EVP_PKEY_free>>;
using Certificate = std::unique_ptr<X509, Deleter<X509_free>>;
using Memory = std::unique_ptr<BIO, Deleter<BIO_free_all>>;

std::string LastError() {
  std::array<char, 256> text{};
  ERR_error_string_n(ERR_get_error(), text.data(), text.size());
  ERR_clear_error();
  return text.data();
}

std::string TextOf(BIO *memory) {
  char *bytes = nullptr;
  const long size = BIO_get_mem_data(memory, &bytes);
  return {bytes, static_cast<size_t>(size)};
}

bool AddExtension(X509 *certificate, int kind, const std::string &value) {
  const std::unique_ptr<X509_EXTENSION, Deleter<X509_EXTENSION_free>> extension(
      X509V3_EXT_conf_nid(nullptr, nullptr, kind, value.c_str()));
  return extension && X509_add_ext(certificate, extension.get(), -1) == 1;
}

/// Names as the certificate lists them. What is no host name is left out: it would be read as an extension's text.
std::string AlternativeNames(const std::string &names) {
  std::string out = "DNS:localhost";
  std::istringstream words(names);
  for (std::string name; words >> name;) {
    if (name.find_first_not_of("abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-.") ==
        std::string::npos) {
      out += ",DNS:" + name;
    }
  }
  return out;
}

Certificate MakeCertificate(EVP_PKEY *key, const std::string &names) {
  Certificate certificate(X509_new());
  std::array<unsigned char, 16> serial{};
  if (!certificate || RAND_bytes(serial.data(), serial.size()) != 1) {
    return nullptr;
  }
  serial[0] &= 0x7F; // positive
  const std::unique_ptr<BIGNUM, Deleter<BN_free>> number(BN_bin2bn(serial.data(), serial.size(), nullptr));
  X509_NAME *name = X509_get_subject_name(certificate.get());
  // From 1970 on: the clock of a device without a battery is wrong at its first start.
  const bool made = number && BN_to_ASN1_INTEGER(number.get(), X509_get_serialNumber(certificate.get())) != nullptr &&
                    X509_set_version(certificate.get(), X509_VERSION_3) == 1 &&
                    ASN1_TIME_set(X509_getm_notBefore(certificate.get()), 0) != nullptr &&
                    ASN1_TIME_set_string_X509(X509_getm_notAfter(certificate.get()), kLastDay) == 1 &&
                    X509_set_pubkey(certificate.get(), key) == 1 &&
                    X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_ASC,
                                               reinterpret_cast<const unsigned char *>("vornwebd"), -1, -1, 0) == 1 &&
                    X509_set_issuer_name(certificate.get(), name) == 1 &&
                    AddExtension(certificate.get(), NID_subject_alt_name, AlternativeNames(names)) &&
                    AddExtension(certificate.get(), NID_basic_constraints, "critical,CA:FALSE") &&
                    AddExtension(certificate.get(), NID_key_usage, "critical,digitalSignature") &&
                    AddExtension(certificate.get(), NID_ext_key_usage, "serverAuth") &&
                    X509_sign(certificate.get(), key, EVP_sha256()) > 0;
  return made ? std::move(certificate) : nullptr;
}

/// The certificate's file comes last: with it both are there.
bool MakeFiles(const StateFolder &folder, const std::string &names) {
  const Key key(EVP_EC_gen("P-256"));
  const Certificate certificate = key ? MakeCertificate(key.get(), names) : nullptr;
  const Memory keyText(BIO_new(BIO_s_mem()));
  const Memory certificateText(BIO_new(BIO_s_mem()));
  return certificate && keyText && certificateText &&
         PEM_write_bio_PrivateKey(keyText.get(), key.get(), nullptr, nullptr, 0, nullptr, nullptr) == 1 &&
         PEM_write_bio_X509(certificateText.get(), certificate.get()) == 1 &&
         folder.Write(kKeyFile, TextOf(keyText.get())) && folder.Write(kCertificateFile, TextOf(certificateText.get()));
}

std::string FingerprintOf(const X509 *certificate) {
  std::array<unsigned char, EVP_MAX_MD_SIZE> digest{};
  unsigned size = 0;
  X509_digest(certificate, EVP_sha256(), digest.data(), &size);
  std::string out;
  for (unsigned at = 0; at < size; ++at) {
    std::array<char, 4> byte{};
    std::snprintf(byte.data(), byte.size(), at == 0 ? "%02X" : ":%02X", digest[at]);
    out += byte.data();
  }
  return out;
}

} // namespace

TlsContext OpenTls(const StateFolder &folder, const std::string &names, std::string &fingerprint, std::string &fault) {
  if (!folder.Has(kCertificateFile) && !MakeFiles(folder, names)) {
    fault = folder.Path(kCertificateFile) + ": cannot be made: " + LastError();
    return nullptr;
  }
  TlsContext context(SSL_CTX_new(TLS_server_method()));
  if (!context || SSL_CTX_set_min_proto_version(context.get(), TLS1_2_VERSION) != 1 ||
      // Forward secrecy and authenticated encryption alone (RFC 9325, section 4.2).
      SSL_CTX_set_cipher_list(context.get(), "ECDHE+AESGCM:ECDHE+CHACHA20") != 1 ||
      SSL_CTX_use_certificate_file(context.get(), folder.Path(kCertificateFile).c_str(), SSL_FILETYPE_PEM) != 1 ||
      SSL_CTX_use_PrivateKey_file(context.get(), folder.Path(kKeyFile).c_str(), SSL_FILETYPE_PEM) != 1 ||
      SSL_CTX_check_private_key(context.get()) != 1) {
    fault = folder.Path(kCertificateFile) + ": " + LastError();
    return nullptr;
  }
  SSL_CTX_set_options(context.get(), SSL_OP_NO_RENEGOTIATION | SSL_OP_NO_COMPRESSION | SSL_OP_CIPHER_SERVER_PREFERENCE |
                                         SSL_OP_NO_TICKET | SSL_OP_PRIORITIZE_CHACHA);
  SSL_CTX_set_session_cache_mode(context.get(), SSL_SESS_CACHE_OFF);
  SSL_CTX_set_mode(context.get(), SSL_MODE_RELEASE_BUFFERS | SSL_MODE_ENABLE_PARTIAL_WRITE |
                                      SSL_MODE_ACCEPT_MOVING_WRITE_BUFFER); // an idle connection holds no buffers
  fingerprint = FingerprintOf(SSL_CTX_get0_certificate(context.get()));
  return context;
}

} // namespace vornwebapi
