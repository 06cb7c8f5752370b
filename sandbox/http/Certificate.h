#pragma once

#include <filesystem>
#include <optional>
#include <string>

#include "sandbox/core/Outcome.h"

namespace sandbox {

// The files of a server certificate and its key, both PEM.
struct CertificateFiles {
  std::filesystem::path certificate;
  std::filesystem::path key;
};

// cert.pem and key.pem (0600) in `folder`: a certificate for localhost, 127.0.0.1 and ::1 that
// signs itself, so that clients trust it by naming the file. Made when missing, unreadable or about
// to expire, and then kept.
Outcome<CertificateFiles> ensureCertificate(const std::filesystem::path& folder);

}  // namespace sandbox
