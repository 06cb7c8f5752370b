#include <gtest/gtest.h>

#include "sandbox/TestData.h"
#include "sandbox/core/Files.h"
#include "sandbox/http/Certificate.h"

namespace sandbox {

TEST(CertificateTest, IsKeptUntilEitherFileIsNoGood) {
  const TemporaryFolder folder;
  const auto files = *ensureCertificate(folder.path());
  const auto first = readFile(files.certificate);
  ensureCertificate(folder.path());
  EXPECT_EQ(readFile(files.certificate), first);
  const TemporaryFolder other;
  const auto otherKey = *readFile((*ensureCertificate(other.path())).key);
  for (const std::string& spoilt : {std::string("damaged"), std::string(), otherKey}) {
    SCOPED_TRACE(spoilt);
    const auto before = readFile(files.certificate);
    writeTestFile(files.key, spoilt);
    ASSERT_TRUE(ensureCertificate(folder.path()));
    EXPECT_NE(readFile(files.certificate), before);
  }
  EXPECT_FALSE(ensureCertificate("/nonexistent"));
}

}  // namespace sandbox
