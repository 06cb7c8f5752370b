#include "sandbox/http/Certificate.h"

#include <openssl/bio.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/rand.h>
#include <openssl/x509v3.h>

#include <ctime>
#include <memory>

#include "sandbox/core/Files.h"

namespace sandbox {

namespace {

constexpr long kValidSeconds = 3650L * 86400;
constexpr long kRenewSeconds = 30L * 86400;

using Key = std::unique_ptr<EVP_PKEY, decltype(&EVP_PKEY_free)>;
using Certificate = std::unique_ptr<X509, decltype(&X509_free)>;
using Memory = std::unique_ptr<BIO, decltype(&BIO_free)>;

bool addExtension(X509* certificate, int nid, const char* value) {
  X509V3_CTX context;
  X509V3_set_ctx_nodb(&context);
  X509V3_set_ctx(&context, certificate, certificate, nullptr, nullptr, 0);
  X509_EXTENSION* extension = X509V3_EXT_conf_nid(nullptr, &context, nid, value);
  if (extension == nullptr) return false;
  const bool added = X509_add_ext(certificate, extension, -1) == 1;
  X509_EXTENSION_free(extension);
  return added;
}

void setSerial(X509* certificate) {
  unsigned char bytes[8];
  RAND_bytes(bytes, sizeof bytes);
  std::uint64_t serial = 0;
  for (const unsigned char byte : bytes) serial = serial << 8U | byte;
  ASN1_INTEGER_set_uint64(X509_get_serialNumber(certificate), serial >> 1U);
}

Certificate makeCertificate(EVP_PKEY* key) {
  Certificate certificate(X509_new(), &X509_free);
  X509_set_version(certificate.get(), X509_VERSION_3);
  setSerial(certificate.get());
  X509_gmtime_adj(X509_getm_notBefore(certificate.get()), -3600);
  X509_gmtime_adj(X509_getm_notAfter(certificate.get()), kValidSeconds);
  X509_set_pubkey(certificate.get(), key);
  X509_NAME* name = X509_get_subject_name(certificate.get());
  X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_ASC,
                             reinterpret_cast<const unsigned char*>("localhost"), -1, -1, 0);
  X509_set_issuer_name(certificate.get(), name);
  const bool extended =
      addExtension(certificate.get(), NID_basic_constraints, "critical,CA:FALSE") &&
      addExtension(certificate.get(), NID_subject_key_identifier, "hash") &&
      addExtension(certificate.get(), NID_ext_key_usage, "serverAuth") &&
      addExtension(certificate.get(), NID_subject_alt_name,
                   "DNS:localhost,IP:127.0.0.1,IP:0:0:0:0:0:0:0:1");
  if (!extended || X509_sign(certificate.get(), key, EVP_sha256()) == 0) certificate.reset();
  return certificate;
}

std::string contentOf(BIO* memory) {
  char* bytes = nullptr;
  const long size = BIO_get_mem_data(memory, &bytes);
  return {bytes, static_cast<std::size_t>(size)};
}

std::string pemOf(X509* certificate) {
  const Memory memory(BIO_new(BIO_s_mem()), &BIO_free);
  PEM_write_bio_X509(memory.get(), certificate);
  return contentOf(memory.get());
}

std::string pemOf(EVP_PKEY* key) {
  const Memory memory(BIO_new(BIO_s_mem()), &BIO_free);
  PEM_write_bio_PrivateKey(memory.get(), key, nullptr, nullptr, 0, nullptr, nullptr);
  return contentOf(memory.get());
}

// Whether the two belong together and last for a while.
bool isUsable(const CertificateFiles& files) {
  const auto certificateText = readFile(files.certificate);
  const auto keyText = readFile(files.key);
  if (!certificateText || !keyText) return false;
  const Memory certificateMemory(
      BIO_new_mem_buf(certificateText->data(), static_cast<int>(certificateText->size())),
      &BIO_free);
  const Memory keyMemory(BIO_new_mem_buf(keyText->data(), static_cast<int>(keyText->size())),
                         &BIO_free);
  const Certificate certificate(
      PEM_read_bio_X509(certificateMemory.get(), nullptr, nullptr, nullptr), &X509_free);
  const Key key(PEM_read_bio_PrivateKey(keyMemory.get(), nullptr, nullptr, nullptr),
                &EVP_PKEY_free);
  if (!certificate || !key || X509_check_private_key(certificate.get(), key.get()) != 1)
    return false;
  std::time_t soon = std::time(nullptr) + kRenewSeconds;
  return X509_cmp_time(X509_get0_notAfter(certificate.get()), &soon) > 0;
}

}  // namespace

Outcome<CertificateFiles> ensureCertificate(const std::filesystem::path& folder) {
  CertificateFiles files{folder / "cert.pem", folder / "key.pem"};
  if (isUsable(files)) return files;
  const Key key(EVP_EC_gen("P-256"), &EVP_PKEY_free);
  const Certificate certificate =
      key ? makeCertificate(key.get()) : Certificate(nullptr, &X509_free);
  if (!certificate) return Failure{"no certificate could be made"};
  if (!writeFileAtomically(files.key, pemOf(key.get()), 0600))
    return Failure{"cannot write " + files.key.string()};
  if (!writeFileAtomically(files.certificate, pemOf(certificate.get()), 0644)) {
    return Failure{"cannot write " + files.certificate.string()};
  }
  return files;
}

}  // namespace sandbox
