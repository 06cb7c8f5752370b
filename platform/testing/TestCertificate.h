#pragma once

#include <chrono>
#include <memory>
#include <string>

#include "base/Namespace.h"

struct ssl_ctx_st;

namespace zelkord {

// A self-signed certificate with its key, made on the spot. Who is to trust it takes it for a root.
struct TestCertificate {
  std::string certificate;  // PEM
  std::string privateKey;   // PEM

  // NamedBySubject: without alternative names, as certificates were of old.
  enum class Validity { Current, Expired, NamedBySubject };
  // For a host name or an IP address.
  static TestCertificate make(const std::string& host, Validity validity = Validity::Current);

  // For servers that show it.
  std::shared_ptr<ssl_ctx_st> serverContext() const;
};

}  // namespace zelkord
