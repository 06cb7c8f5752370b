#include "sandbox/core/Gzip.h"

#include <zlib.h>

#include <algorithm>

namespace sandbox {

namespace {

constexpr int kGzipWindowBits = 15 + 16;
constexpr int kRawWindowBits = -15;
constexpr int kMemoryLevel = 8;
constexpr std::size_t kChunk = 65536;

Bytef* zlibBytes(std::string_view text) {
  return reinterpret_cast<Bytef*>(const_cast<char*>(text.data()));
}

// A deflating stream that appends to `packed`.
class GzipWriter final {
 public:
  GzipWriter() {
    deflateInit2(&stream_, Z_BEST_SPEED, Z_DEFLATED, kGzipWindowBits, kMemoryLevel,
                 Z_DEFAULT_STRATEGY);
  }
  GzipWriter(const GzipWriter&) = delete;
  GzipWriter& operator=(const GzipWriter&) = delete;
  ~GzipWriter() { deflateEnd(&stream_); }

  void write(std::string_view text, int flush) {
    stream_.next_in = zlibBytes(text);
    stream_.avail_in = static_cast<uInt>(text.size());
    do {
      const std::size_t used = packed_.size();
      packed_.resize(used + kChunk);
      stream_.next_out = reinterpret_cast<Bytef*>(packed_.data() + used);
      stream_.avail_out = kChunk;
      deflate(&stream_, flush);
      packed_.resize(used + kChunk - stream_.avail_out);
    } while (stream_.avail_out == 0);
  }

  std::string take() { return std::move(packed_); }

 private:
  z_stream stream_{};
  std::string packed_;
};

}  // namespace

std::string gzip(std::string_view text) {
  GzipWriter writer;
  writer.write(text, Z_FINISH);
  return writer.take();
}

std::string gzipOfBlanks(std::size_t size) {
  GzipWriter writer;
  const std::string blanks(1 << 20, ' ');
  writer.write("[\"", Z_NO_FLUSH);
  for (; size > 0; size -= std::min(size, blanks.size())) {
    writer.write(std::string_view(blanks).substr(0, size), Z_NO_FLUSH);
  }
  writer.write("\"]", Z_FINISH);
  return writer.take();
}

std::optional<std::string> inflateRaw(std::string_view packed, std::size_t limit) {
  z_stream stream{};
  if (inflateInit2(&stream, kRawWindowBits) != Z_OK) return std::nullopt;
  stream.next_in = zlibBytes(packed);
  stream.avail_in = static_cast<uInt>(packed.size());
  std::string text;
  int status = Z_OK;
  while (status == Z_OK && text.size() <= limit) {
    const std::size_t used = text.size();
    text.resize(used + kChunk);
    stream.next_out = reinterpret_cast<Bytef*>(text.data() + used);
    stream.avail_out = kChunk;
    status = inflate(&stream, Z_NO_FLUSH);
    text.resize(used + kChunk - stream.avail_out);
  }
  const bool complete = status == Z_STREAM_END && stream.avail_in == 0 && text.size() <= limit;
  inflateEnd(&stream);
  if (!complete) return std::nullopt;
  return text;
}

}  // namespace sandbox
