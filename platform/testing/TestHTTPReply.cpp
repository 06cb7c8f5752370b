#include "platform/testing/TestHTTPReply.h"

#include <zlib.h>

#include "base/Check.h"

namespace zelkord {
namespace {

std::string headOfReply(int status, const HTTPHeaders& headers) {
  std::string head = "HTTP/1.1 " + std::to_string(status) + " Reply\r\n";
  for (const auto& [name, value] : headers) head += name + ": " + value + "\r\n";
  return head + "\r\n";
}

std::string packedWithGzip(const std::string& text) {
  z_stream stream{};
  ZK_CHECK(deflateInit2(&stream, 9, Z_DEFLATED, 15 + 16, 9, Z_DEFAULT_STRATEGY) == Z_OK,
           "zlib initialises");
  std::string packed(deflateBound(&stream, text.size()), '\0');
  stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(text.data()));
  stream.avail_in = static_cast<uInt>(text.size());
  stream.next_out = reinterpret_cast<Bytef*>(packed.data());
  stream.avail_out = static_cast<uInt>(packed.size());
  ZK_CHECK(deflate(&stream, Z_FINISH) == Z_STREAM_END, "zlib packs in one go");
  packed.resize(stream.total_out);
  deflateEnd(&stream);
  return packed;
}

}  // namespace

TestHTTPReply TestHTTPReply::make(int status, std::string body, HTTPHeaders headers) {
  headers.emplace_back("Content-Length", std::to_string(body.size()));
  return {.bytes = headOfReply(status, headers) + body};
}

TestHTTPReply TestHTTPReply::redirect(int status, std::string location) {
  return make(status, "moved", {{"Location", std::move(location)}});
}

TestHTTPReply TestHTTPReply::gzip(const std::string& body) {
  return make(200, packedWithGzip(body), {{"Content-Encoding", "gzip"}});
}

TestHTTPReply TestHTTPReply::truncated(std::string sent, std::size_t announced) {
  const HTTPHeaders headers{{"Content-Length", std::to_string(announced)}};
  return {.bytes = headOfReply(200, headers) + sent, .ending = Ending::Close};
}

TestHTTPReply TestHTTPReply::endless() {
  return {
      .bytes = headOfReply(200, {}), .ending = Ending::Repeat, .repeated = std::string(65536, 'x')};
}

TestHTTPReply TestHTTPReply::dripping(std::size_t size, Duration pauseBefore) const {
  TestHTTPReply reply = *this;
  reply.pieceSize = size;
  reply.pause = pauseBefore;
  return reply;
}

}  // namespace zelkord
