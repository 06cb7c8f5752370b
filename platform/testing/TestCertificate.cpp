#include "platform/testing/TestCertificate.h"

#include <openssl/ec.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <openssl/x509v3.h>

#include <cctype>
#include <memory>

#include "base/Check.h"

namespace zelkord {
namespace {

using X509Pointer = std::unique_ptr<X509, decltype(&X509_free)>;
using KeyPointer = std::unique_ptr<EVP_PKEY, decltype(&EVP_PKEY_free)>;
using BIOPointer = std::unique_ptr<BIO, decltype(&BIO_free_all)>;

constexpr long kCertificateDay = 24 * 60 * 60;

void addCertificateExtension(X509* certificate, int nid, const std::string& value) {
  X509V3_CTX context;
  X509V3_set_ctx_nodb(&context);
  X509V3_set_ctx(&context, certificate, certificate, nullptr, nullptr, 0);
  X509_EXTENSION* extension = X509V3_EXT_conf_nid(nullptr, &context, nid, value.c_str());
  ZK_CHECK(extension, "a certificate extension is made");
  X509_add_ext(certificate, extension, -1);
  X509_EXTENSION_free(extension);
}

X509Pointer makeX509(EVP_PKEY* key, const std::string& host, TestCertificate::Validity validity) {
  const bool expired = validity == TestCertificate::Validity::Expired;
  X509Pointer certificate(X509_new(), &X509_free);
  X509_set_version(certificate.get(), X509_VERSION_3);
  ASN1_INTEGER_set(X509_get_serialNumber(certificate.get()), 1);
  X509_gmtime_adj(X509_getm_notBefore(certificate.get()), -2 * kCertificateDay);
  X509_gmtime_adj(X509_getm_notAfter(certificate.get()), (expired ? -1 : 2) * kCertificateDay);
  X509_NAME* name = X509_get_subject_name(certificate.get());
  X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_ASC,
                             reinterpret_cast<const unsigned char*>(host.c_str()), -1, -1, 0);
  X509_set_issuer_name(certificate.get(), name);
  X509_set_pubkey(certificate.get(), key);
  const bool isAddress = std::isdigit(static_cast<unsigned char>(host.front())) != 0;
  addCertificateExtension(certificate.get(), NID_basic_constraints, "critical,CA:TRUE");
  if (validity != TestCertificate::Validity::NamedBySubject) {
    addCertificateExtension(certificate.get(), NID_subject_alt_name,
                            (isAddress ? "IP:" : "DNS:") + host);
  }
  ZK_CHECK(X509_sign(certificate.get(), key, EVP_sha256()) > 0, "a certificate is signed");
  return certificate;
}

std::string textOfBIO(BIO* bio) {
  char* bytes = nullptr;
  const long size = BIO_get_mem_data(bio, &bytes);
  return {bytes, static_cast<std::size_t>(size)};
}

}  // namespace

TestCertificate TestCertificate::make(const std::string& host, Validity validity) {
  const KeyPointer key(EVP_EC_gen("P-256"), &EVP_PKEY_free);
  const auto x509 = makeX509(key.get(), host, validity);
  const BIOPointer certificate(BIO_new(BIO_s_mem()), &BIO_free_all);
  const BIOPointer privateKey(BIO_new(BIO_s_mem()), &BIO_free_all);
  PEM_write_bio_X509(certificate.get(), x509.get());
  PEM_write_bio_PrivateKey(privateKey.get(), key.get(), nullptr, nullptr, 0, nullptr, nullptr);
  return {textOfBIO(certificate.get()), textOfBIO(privateKey.get())};
}

std::shared_ptr<SSL_CTX> TestCertificate::serverContext() const {
  std::shared_ptr<SSL_CTX> tls(SSL_CTX_new(TLS_server_method()), &SSL_CTX_free);
  const BIOPointer certificateText(BIO_new_mem_buf(certificate.data(), -1), &BIO_free_all);
  const BIOPointer keyText(BIO_new_mem_buf(privateKey.data(), -1), &BIO_free_all);
  const X509Pointer x509(PEM_read_bio_X509(certificateText.get(), nullptr, nullptr, nullptr),
                         &X509_free);
  const KeyPointer key(PEM_read_bio_PrivateKey(keyText.get(), nullptr, nullptr, nullptr),
                       &EVP_PKEY_free);
  const bool usable = SSL_CTX_use_certificate(tls.get(), x509.get()) == 1 &&
                      SSL_CTX_use_PrivateKey(tls.get(), key.get()) == 1;
  ZK_CHECK(usable, "the server's certificate is usable");
  return tls;
}

}  // namespace zelkord
