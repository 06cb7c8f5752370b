#include <gtest/gtest.h>

#include "zelkord/network/request/ZelkorURLRequestBuilder.h"

namespace zelkord {
namespace {

std::string rewritten(std::string_view url) {
  const auto builder = ZelkorURLRequestBuilder::make(url);
  return builder ? builder->createUrlRequest().url : "none";
}

std::string withValue(std::string value) {
  auto builder = ZelkorURLRequestBuilder::make("https://h/");
  builder->forceQueryItemWithName("n", std::move(value));
  return builder->createUrlRequest().url;
}

TEST(ZelkorURLRequestBuilderTest, RewritesAURLsOwnQuery) {
  const std::pair<std::string_view, std::string_view> cases[] = {
      {"https://h", "https://h"},
      {"https://h?b=2&a=1", "https://h?a=1&b=2"},
      {"https://h/p?", "https://h/p"},
      {"https://h/p?&&a=1&&", "https://h/p?a=1"},
      {"https://h/p?flag&empty=&=x", "https://h/p?=x&empty=&flag"},
      {"https://h/p?a=1&b=2&a=3", "https://h/p?a=3&b=2"},
      {"https://h/p?a=x=y", "https://h/p?a=x%3Dy"},
      {"https://h/p?q=c++&r=a%20b%2Bc", "https://h/p?q=c%2B%2B&r=a%20b%2Bc"},
      {"https://h/p?a=1;b=2", "https://h/p?a=1%3Bb%3D2"},
      {"https://h/p?a=%26%3d%23%25&b=%7e%C3%bc", "https://h/p?a=%26%3D%23%25&b=~%C3%BC"},
      {"https://h/p?a=%FF%00", "https://h/p?a=%FF%00"},
      {"https://h/p?a=[1]&b={\"x\"}", "https://h/p?a=%5B1%5D&b=%7B%22x%22%7D"},
      {"https://h/p?b=1&a=2#top?c=3&d", "https://h/p?a=2&b=1#top?c=3&d"},
      {"https://h/p#f", "https://h/p#f"},
      {"https://u:p@[::1]:8443/a%20b;v=1/c?x", "https://u:p@[::1]:8443/a%20b;v=1/c?x"},
      // By UTF-16 code unit U+1F600 stands before U+FF5E, by byte after it.
      {"https://h/?%EF%BD%9E=1&%F0%9F%98%80=2&z=3", "https://h/?z=3&%F0%9F%98%80=2&%EF%BD%9E=1"},
      {"https://h/?B=1&a=2&A=3", "https://h/?A=3&B=1&a=2"},
  };
  for (const auto& [url, expected] : cases) EXPECT_EQ(rewritten(url), expected) << url;
}

TEST(ZelkorURLRequestBuilderTest, EncodesAllButTheAgreedCharacters) {
  std::string printable;
  for (char c = 0x20; c < 0x7F; ++c) printable += c;
  EXPECT_EQ(withValue(printable),
            "https://h/?n=%20!%22%23$%25%26'()*%2B,-./0123456789:%3B%3C%3D%3E?@"
            "ABCDEFGHIJKLMNOPQRSTUVWXYZ%5B%5C%5D%5E_%60abcdefghijklmnopqrstuvwxyz%7B%7C%7D~");
  EXPECT_EQ(withValue("a\r\n\x7F"), "https://h/?n=a%0D%0A%7F");
}

TEST(ZelkorURLRequestBuilderTest, RefusesWhatIsNoAbsoluteURL) {
  const std::string_view urls[] = {"",
                                   "h/p?q=1",
                                   "/p",
                                   "//h/p",
                                   "https:",
                                   "https://",
                                   "https:/h",
                                   "https:///p",
                                   "1s://h",
                                   "ht tp://h",
                                   "https://h h/",
                                   "https://h/\n",
                                   "https://:443/",
                                   "https://u@",
                                   "https://h/%zz",
                                   "https://h/?q=%4",
                                   "https://h/?q=%",
                                   "https://h/\xC3\xBC",
                                   "https://h/?q=\xC3\xBC",
                                   "https://h/?q=a b",
                                   "https://h/p#%x",
                                   "https://h/<p>",
                                   "?a=1",
                                   "#f",
                                   "https://\x01h"};
  for (const auto url : urls) EXPECT_EQ(rewritten(url), "none") << url;
  EXPECT_EQ(rewritten("https://h/?" + std::string(kMaximumURLLength, 'a')), "none");
}

TEST(ZelkorURLRequestBuilderTest, ForceReplacesAndDefaultAddsWhatIsAbsent) {
  auto builder = *ZelkorURLRequestBuilder::make("https://h/?latlng=1,2");
  builder.defaultQueryItemWithName("latlng", "3,4");
  builder.forceQueryItemsFromArray(std::vector<QueryItem>{{"q", "a"}, {"b", ""}, {"q", "z"}});
  builder.defaultQueryItem({"a", std::nullopt});
  builder.defaultQueryItem({"A", "upper"});
  EXPECT_EQ(builder.createUrlRequest().url, "https://h/?A=upper&a&b=&latlng=1,2&q=z");
  builder.forceQueryItem({"latlng", "5,6"});
  EXPECT_TRUE(builder.containsQueryItemWithName("latlng"));
  EXPECT_FALSE(builder.containsQueryItemWithName("LATLNG"));
  EXPECT_EQ(builder.createUrlRequest().url, "https://h/?A=upper&a&b=&latlng=5,6&q=z");
}

TEST(ZelkorURLRequestBuilderTest, KeepsOneHeaderAName) {
  auto builder = *ZelkorURLRequestBuilder::make("https://h/");
  builder.forceHttpHeaderWithName("B", "1");
  builder.defaultHttpHeaderWithName("A", "2");
  builder.defaultHttpHeaderWithName("B", "3");
  builder.forceHttpHeaderWithName("b", "4");
  builder.forceHttpHeaderWithName("A", "5");
  EXPECT_EQ(builder.createMutableUrlRequest().headers,
            (HTTPHeaders{{"B", "1"}, {"A", "5"}, {"b", "4"}}));
}

}  // namespace
}  // namespace zelkord
