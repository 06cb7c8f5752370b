#include "sandbox/service/UploadCheck.h"

#include <openssl/evp.h>
#include <zlib.h>

#include <array>
#include <boost/json/parse.hpp>
#include <memory>

#include "sandbox/core/Gzip.h"
#include "sandbox/core/Text.h"

namespace sandbox {

namespace {

constexpr std::size_t kPieceSize = 4096;
constexpr std::size_t kLargestUpload = 64U << 20U;
constexpr std::size_t kDeepestJson = 512;

using DigestContext = std::unique_ptr<EVP_MD_CTX, decltype(&EVP_MD_CTX_free)>;

// The sender's compressing stream, of which only the passes count.
class PassCounter final {
 public:
  PassCounter() {
    deflateInit2(&stream_, Z_DEFAULT_COMPRESSION, Z_DEFLATED, -15, 8, Z_DEFAULT_STRATEGY);
  }
  PassCounter(const PassCounter&) = delete;
  PassCounter& operator=(const PassCounter&) = delete;
  ~PassCounter() { deflateEnd(&stream_); }

  int passesFor(std::string_view piece) {
    stream_.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(piece.data()));
    stream_.avail_in = static_cast<uInt>(piece.size());
    int passes = 0;
    int status = Z_OK;
    do {
      stream_.next_out = output_.data();
      stream_.avail_out = static_cast<uInt>(output_.size());
      status = deflate(&stream_, Z_NO_FLUSH);
      ++passes;
    } while (status == Z_OK && stream_.avail_in > 0);
    return passes;
  }

 private:
  z_stream stream_{};
  std::array<Bytef, kPieceSize> output_{};
};

std::string lowerHex(const unsigned char* bytes, std::size_t count) {
  static constexpr char kDigits[] = "0123456789abcdef";
  std::string text;
  for (std::size_t at = 0; at < count; ++at)
    text.append({kDigits[bytes[at] >> 4], kDigits[bytes[at] & 15]});
  return text;
}

bool isJsonText(const std::string& text) {
  boost::system::error_code error;
  boost::json::parse_options options;
  options.max_depth = kDeepestJson;
  boost::json::parse(text, error, {}, options);
  return !error;
}

std::string problemWith(const Request& request, const std::string& text) {
  const auto digest = request.header("X-Quenta-Digest");
  if (!digest) return "no X-Quenta-Digest";
  if (*digest != uploadDigest(text)) return "X-Quenta-Digest does not match";
  if (!isJsonText(text)) return "the body is not JSON";
  return {};
}

}  // namespace

std::string uploadDigest(std::string_view text) {
  const DigestContext digest(EVP_MD_CTX_new(), &EVP_MD_CTX_free);
  EVP_DigestInit_ex(digest.get(), EVP_sha512(), nullptr);
  PassCounter counter;
  for (; !text.empty(); text.remove_prefix(std::min(text.size(), kPieceSize))) {
    const std::string_view piece = text.substr(0, kPieceSize);
    for (int pass = counter.passesFor(piece); pass > 0; --pass) {
      EVP_DigestUpdate(digest.get(), piece.data(), piece.size());
    }
  }
  std::array<unsigned char, EVP_MAX_MD_SIZE> bytes{};
  unsigned size = 0;
  EVP_DigestFinal_ex(digest.get(), bytes.data(), &size);
  return lowerHex(bytes.data(), size);
}

UploadVerdict checkUpload(const Request& request) {
  if (lowerCased(request.header("Content-Encoding").value_or("")) != "deflate") {
    return {"Content-Encoding is not deflate", {}};
  }
  auto text = inflateRaw(request.body, kLargestUpload);
  if (!text) return {"the body is not one raw DEFLATE stream", {}};
  std::string problem = problemWith(request, *text);
  return {std::move(problem), std::move(*text)};
}

}  // namespace sandbox
