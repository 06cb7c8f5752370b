#pragma once

#include <chrono>
#include <string>

#include "base/Namespace.h"

namespace zelkord {

// A self-signed certificate with its key, made on the spot. Who is to trust it takes it for a root.
struct TestCertificate {
  std::string certificate;  // PEM
  std::string privateKey;   // PEM

  // NamedBySubject: without alternative names, as certificates were of old.
  enum class Validity { Current, Expired, NamedBySubject };
  // For a host name or an IP address.
  static TestCertificate make(const std::string& host, Validity validity = Validity::Current);
};

}  // namespace zelkord
