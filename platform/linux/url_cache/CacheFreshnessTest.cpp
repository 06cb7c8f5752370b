#include <gtest/gtest.h>

#include <cstdint>

#include "platform/linux/url_cache/CacheFreshness.h"
#include "platform/linux/url_cache/CachePolicyTestSupport.h"

namespace zelkord {
namespace {

TEST(CacheFreshnessTest, LivesAsLongAsTheHeadersSay) {
  const std::string now = "Date: Sun, 22 Nov 2026 12:00:00 GMT\n";
  const struct {
    std::string headers;
    std::int64_t seconds;
    int status = 200;
  } cases[] = {
      {"", 0},
      {"Cache-Control: max-age=60", 60},
      {"cache-control: private , MAX-AGE=\"60\"", 60},
      {"Cache-Control: s-maxage=90, max-age=60, must-revalidate", 60},
      {"Cache-Control: s-maxage=90", 0},
      {"Cache-Control: max-age=60\nCache-Control: public", 60},
      {"Cache-Control: max-age=60, max-age=60", 60},
      {"Cache-Control: max-age=60, max-age=61", 0},
      {"Cache-Control: max-age=60, no-cache=\"Set-Cookie\"", 0},
      {"Cache-Control: max-age=60, no-store", 0},
      {"Cache-Control: max-age=99999999999999999999999999", 2147483648},
      {"Cache-Control: max-age=-1", 0},
      {"Cache-Control: max-age=6x", 0},
      {"Cache-Control: max-age=", 0},
      {"Cache-Control: max-age", 0},
      {"Cache-Control: max-age=\"60", 0},
      {"Cache-Control: ext=\"max-age=1, no-store\", max-age=60", 60},
      {"Cache-Control: ext=\"a\\\", no-store\", max-age=60", 60},
      {"Cache-Control: ext=\"a\\", 0},
      {"Cache-Control: ext=\"open, max-age=60", 0},
      {"Cache-Control: ,,=,\t,max-age=60,", 60},
      {now + "Expires: Sun, 22 Nov 2026 12:01:00 GMT", 60},
      {"Expires: Sun, 22 Nov 2026 12:01:00 GMT", 60},
      {now + "Expires: Fri, 31 Dec 9999 23:59:59 GMT", 251606951999},
      {now + "Expires: Sun, 22 Nov 2026 11:00:00 GMT", 0},
      {now + "Expires: 0", 0},
      {now + "Expires: Sun, 22 Nov 2026 12:01:00 GMT\nCache-Control: max-age=5", 5},
      {now + "Expires: Sun, 22 Nov 2026 12:01:00 GMT\nCache-Control: max-age=bad", 0},
      {now + "Expires: 0\nLast-Modified: Sun, 22 Nov 2026 11:00:00 GMT", 0},
      {now + "Last-Modified: Sun, 22 Nov 2026 11:00:00 GMT", 360},
      {now + "Last-Modified: Sun, 22 Nov 2026 11:00:00 GMT", 360, 404},
      {now + "Last-Modified: Sun, 22 Nov 2026 11:00:00 GMT", 0, 500},
      {now + "Last-Modified: Sun, 22 Nov 1970 11:00:00 GMT", 86400},
      {now + "Last-Modified: Sun, 22 Nov 2026 13:00:00 GMT", 0},
      {now + "Last-Modified: yesterday", 0},
  };
  for (const auto& [headers, seconds, status] : cases) {
    SCOPED_TRACE(headers);
    EXPECT_EQ(freshnessLifetime(storedForTest(headersForTest(headers), status)).count(), seconds);
  }
}

TEST(CacheFreshnessTest, AgesFromTheOldestThatIsKnown) {
  const struct {
    const char* headers;
    Duration requested;  // before it came
    Duration passed;     // since
    std::int64_t seconds;
  } cases[] = {
      {"", 0s, 10s, 10},
      {"", 3s, 10s, 13},
      {"Age: 7", 3s, 10s, 20},
      {"Age: 7, 9", 0s, 10s, 17},
      {"Age: -7", 0s, 10s, 10},
      {"Date: Sun, 22 Nov 2026 11:59:00 GMT\nAge: 7", 3s, 10s, 70},
      {"Date: Sun, 22 Nov 2026 13:00:00 GMT", 0s, 10s, 10},
      {"Date: nonsense", 0s, 10s, 10},
      {"Age: 99999999999999999999", 0s, 10s, 2147483658},
      // The clock was set back while the request was under way, and afterwards.
      {"", -5s, 10s, 10},
      {"", 0s, -1s, kUnknownAge.count()},
  };
  for (const auto& [headers, requested, passed, seconds] : cases) {
    SCOPED_TRACE(headers);
    auto stored = storedForTest(headersForTest(headers));
    stored.requestedAt -= requested;
    EXPECT_EQ(currentAge(stored, kCacheTestTime + passed).count(), seconds);
  }
}

TEST(CacheFreshnessTest, HeedsTheRequestToo) {
  const struct {
    const char* request;
    Duration passed;
    bool fresh;
  } cases[] = {
      {"", 59s, true},
      {"", 60s, false},
      {"", -1s, false},
      {"no-cache", 1s, false},
      {"max-age=5", 5s, true},
      {"max-age=5", 6s, false},
      {"max-age=0", 0s, true},
      {"max-age=oops", 1s, false},
      {"min-fresh=50", 9s, true},
      {"min-fresh=50", 10s, false},
      {"min-fresh=oops", 1s, false},
      {"max-stale=100", 61s, false},
      {"max-stale=\"", 1s, false},
  };
  const auto stored = storedForTest({{"Cache-Control", "max-age=60"}});
  for (const auto& [request, passed, fresh] : cases) {
    SCOPED_TRACE(std::string(request) + " after " + std::to_string(passed.count()));
    EXPECT_EQ(isFresh(stored, kCacheTestTime + passed, parseCacheDirectives(request)), fresh);
  }
}

}  // namespace
}  // namespace zelkord
