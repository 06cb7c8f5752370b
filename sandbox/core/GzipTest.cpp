#include <gtest/gtest.h>
#include <zlib.h>

#include "sandbox/core/Gzip.h"

namespace sandbox {

namespace {

std::string rawDeflated(std::string_view text) {
  z_stream stream{};
  deflateInit2(&stream, Z_DEFAULT_COMPRESSION, Z_DEFLATED, -15, 8, Z_DEFAULT_STRATEGY);
  std::string packed(deflateBound(&stream, static_cast<uLong>(text.size())), '\0');
  stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(text.data()));
  stream.avail_in = static_cast<uInt>(text.size());
  stream.next_out = reinterpret_cast<Bytef*>(packed.data());
  stream.avail_out = static_cast<uInt>(packed.size());
  deflate(&stream, Z_FINISH);
  packed.resize(stream.total_out);
  deflateEnd(&stream);
  return packed;
}

std::size_t gunzippedSize(const std::string& packed) {
  z_stream stream{};
  inflateInit2(&stream, 15 + 16);
  stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(packed.data()));
  stream.avail_in = static_cast<uInt>(packed.size());
  std::string output(1 << 20, '\0');
  int status = Z_OK;
  while (status == Z_OK) {
    stream.next_out = reinterpret_cast<Bytef*>(output.data());
    stream.avail_out = static_cast<uInt>(output.size());
    status = inflate(&stream, Z_NO_FLUSH);
  }
  inflateEnd(&stream);
  return status == Z_STREAM_END ? stream.total_out : 0;
}

}  // namespace

TEST(GzipTest, UnpacksOnlyWholeStreamsWithinTheLimit) {
  const std::string text(200'000, 'x');
  const std::string packed = rawDeflated(text);
  EXPECT_EQ(inflateRaw(packed, text.size()), text);
  EXPECT_EQ(inflateRaw(rawDeflated(""), 10), "");
  EXPECT_FALSE(inflateRaw(packed, text.size() - 1));
  EXPECT_FALSE(inflateRaw(std::string_view(packed).substr(0, packed.size() - 1), text.size()));
  EXPECT_FALSE(inflateRaw(packed + "x", text.size()));
  EXPECT_FALSE(inflateRaw(gzip(text), text.size()));
  EXPECT_FALSE(inflateRaw("", 10));
}

TEST(GzipTest, PacksSmallAndLargeTexts) {
  EXPECT_EQ(gunzippedSize(gzip(std::string(3'000'000, 'y'))), 3'000'000U);
  EXPECT_EQ(gunzippedSize(gzipOfBlanks(5'000'000)), 5'000'004U);
}

}  // namespace sandbox
