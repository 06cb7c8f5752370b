#include <gtest/gtest.h>

#include "zelkord/network/bag/BagFailureReason.h"

namespace zelkord {
namespace {

TEST(BagFailureReasonTest, SpeaksToPeople) {
  using enum URLErrorCode;
  const std::pair<Error, const char*> cases[] = {
      {urlError(CannotConnect, "Failed to connect to h port 1: Connection refused"),
       "connection refused"},
      {urlError(CannotConnect, "Failed to connect: Network is unreachable"), "network unreachable"},
      {urlError(CannotConnect, "Failed to connect"), "no connection"},
      {urlError(HostNotFound, "Could not resolve host: h"), "name does not resolve"},
      {urlError(TLSFailure, "SSL certificate problem: self-signed certificate"),
       "certificate not trusted (SSL certificate problem: self-signed certificate)"},
      {urlError(TLSFailure, "wrong version number"), "no secure connection (wrong version number)"},
      {urlError(TimedOut), "no answer in time"},
      {urlError(TooLarge), "too large"},
      {urlError(Other), "failed"},
      {zelkorError(2, "statusCode 503"), "HTTP status 503"},
      {zelkorError(2, "not JSON object"), "not JSON"},
      {zelkorError(2, "no data"), "empty answer"},
  };
  for (const auto& [error, words] : cases) EXPECT_EQ(bagFailureReason(error), words);
}

TEST(BagFailureReasonTest, AURLForPeopleHasNothingPrivate) {
  const std::pair<const char*, const char*> cases[] = {
      {"https://h/bag?cc=DE", "https://h/bag"}, {"https://h/bag#f?x", "https://h/bag"},
      {"https://u:p@h:1/b?x", "https://h:1/b"}, {"https://u@x@h/b", "https://h/b"},
      {"https://h/b@c", "https://h/b@c"},       {"https://u@h", "https://h"},
      {"https://h?q=a@b", "https://h"},
  };
  for (const auto& [url, shown] : cases) EXPECT_EQ(urlForPeople(url), shown);
}

}  // namespace
}  // namespace zelkord
