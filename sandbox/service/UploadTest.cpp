#include <gtest/gtest.h>
#include <openssl/sha.h>
#include <zlib.h>

#include <random>

#include "sandbox/TestData.h"
#include "sandbox/service/UploadStore.h"

namespace sandbox {

namespace {

// A sender: what it would put into the body and into the digest header.
struct SentUpload {
  std::string body;
  std::string digest;
};

SentUpload sendUpload(std::string_view text) {
  z_stream stream{};
  deflateInit2(&stream, Z_DEFAULT_COMPRESSION, Z_DEFLATED, -15, 8, Z_DEFAULT_STRATEGY);
  SentUpload sent;
  std::string digested;
  char buffer[4096];
  const auto pass = [&](int flush) {
    stream.next_out = reinterpret_cast<Bytef*>(buffer);
    stream.avail_out = sizeof buffer;
    const int status = deflate(&stream, flush);
    sent.body.append(buffer, sizeof buffer - stream.avail_out);
    return status;
  };
  for (std::size_t at = 0; at < text.size(); at += 4096) {
    const std::string_view piece = text.substr(at, 4096);
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(piece.data()));
    stream.avail_in = static_cast<uInt>(piece.size());
    while (stream.avail_in > 0) {
      digested += piece;
      pass(Z_NO_FLUSH);
    }
  }
  while (pass(Z_FINISH) == Z_OK) {
  }
  deflateEnd(&stream);
  unsigned char hash[SHA512_DIGEST_LENGTH];
  SHA512(reinterpret_cast<const unsigned char*>(digested.data()), digested.size(), hash);
  char hex[3];
  for (const unsigned char byte : hash) {
    std::snprintf(hex, sizeof hex, "%02x", byte);
    sent.digest += hex;
  }
  return sent;
}

// Text that hardly packs, so that the compressor's buffer overflows.
std::string noisyJson(std::size_t size) {
  std::mt19937 random(7);
  std::string text = "[\"";
  while (text.size() < size) text += static_cast<char>('#' + random() % 56);
  for (char& c : text) c = c == '\\' ? '~' : c;
  return text + "\"]";
}

Request uploadRequest(const SentUpload& sent) {
  Request request;
  request.method = "POST";
  request.path = "/feedback";
  request.headers = {{"Content-Encoding", "deflate"}, {"X-Quenta-Digest", sent.digest}};
  request.body = sent.body;
  return request;
}

}  // namespace

TEST(UploadCheckTest, TheDigestOfASmallTextIsItsHash) {
  EXPECT_EQ(uploadDigest("abc"),
            "ddaf35a193617abacc417349ae20413112e6fa4e89a97ea20a9eeee64b55d39a"
            "2192992a274fc1a836ba3c23a3feebbd454d4423643ce80e2a9ac94fa54ca49f");
  EXPECT_EQ(uploadDigest("").substr(0, 16), "cf83e1357eefb8bd");
}

TEST(UploadCheckTest, AcceptsWhatASenderMakesWhateverItsSize) {
  for (const std::size_t size : {5U, 4095U, 4096U, 4097U, 100'000U, 1'000'000U}) {
    SCOPED_TRACE(size);
    for (const std::string& text : {noisyJson(size), "[\"" + std::string(size, ' ') + "\"]"}) {
      EXPECT_EQ(checkUpload(uploadRequest(sendUpload(text))).problem, "");
    }
  }
}

TEST(UploadCheckTest, APieceThatNeedsSeveralPassesCountsSeveralTimes) {
  const std::string text = noisyJson(1'000'000);
  unsigned char hash[SHA512_DIGEST_LENGTH];
  SHA512(reinterpret_cast<const unsigned char*>(text.data()), text.size(), hash);
  char start[3];
  std::snprintf(start, sizeof start, "%02x", hash[0]);
  EXPECT_FALSE(uploadDigest(text).starts_with(start));
}

TEST(UploadCheckTest, SaysWhatIsWrong) {
  const SentUpload good = sendUpload(R"({"fb":[]})");
  struct Case {
    const char* what;
    std::function<void(Request&)> spoil;
  };
  for (const auto& [what, spoil] : std::initializer_list<Case>{
           {"Content-Encoding",
            [](Request& request) { request.headers.erase(request.headers.begin()); }},
           {"no X-Quenta-Digest", [](Request& request) { request.headers.pop_back(); }},
           {"does not match", [](Request& request) { request.headers.back().second[0] ^= 1; }},
           {"DEFLATE", [](Request& request) { request.body.pop_back(); }},
           {"DEFLATE", [](Request& request) { request.body = R"({"fb":[]})"; }},
           {"not JSON", [](Request& request) { request = uploadRequest(sendUpload("{")); }},
           {"not JSON", [](Request& request) {
              request = uploadRequest(sendUpload(std::string(600, '[')));
            }}}) {
    SCOPED_TRACE(what);
    Request request = uploadRequest(good);
    spoil(request);
    EXPECT_NE(checkUpload(request).problem.find(what), std::string::npos);
  }
}

TEST(UploadStoreTest, KeepsGoodAndBadOnesAndNoticesRepeats) {
  const TemporaryFolder folder;
  auto store = *UploadStore::open(folder.path() / "uploads.db");
  Request request = uploadRequest(sendUpload(R"({"fb":[1]})"));
  request.headers.emplace_back("X-Quenta-Transfer-Identifier", "t-1");
  EXPECT_EQ(store->accept(request).status, 200U);
  EXPECT_EQ(store->accept(request).status, 200U);
  request.body = "\xFFnot packed";
  EXPECT_EQ(store->accept(request).status, 400U);
  const auto uploads = store->list(0);
  ASSERT_EQ(uploads.size(), 3U);
  EXPECT_EQ(uploads.at(0).at("content").at("fb").at(0), 1);
  EXPECT_EQ(uploads.at(0).at("repeat"), false);
  EXPECT_EQ(uploads.at(1).at("repeat"), true);
  EXPECT_EQ(uploads.at(2).at("accepted"), false);
  EXPECT_EQ(store->list(2).size(), 1U);
  store->clear();
  EXPECT_TRUE(store->list(0).empty());
}

}  // namespace sandbox
