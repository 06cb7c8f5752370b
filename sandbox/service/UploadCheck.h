#pragma once

#include <string>
#include <string_view>

#include "sandbox/http/Message.h"

namespace sandbox {

// The digest that belongs to an upload of this JSON text: 128 lower-case hexadecimal characters.
//
// It is SHA-512 over what the sender's compressing stream is fed. The text enters in pieces of 4096
// bytes (the last one shorter), each into raw DEFLATE with zlib's default settings and a 4096-byte
// output buffer; a piece that needs several passes of the compressor enters the digest once for
// each pass. So the digest is the plain SHA-512 of the text except where the compressor's output
// filled its buffer.
std::string uploadDigest(std::string_view text);

// What was found in an upload.
struct UploadVerdict {
  std::string problem;  // empty: accepted
  std::string text;     // what the body unpacks to; empty when it does not
};

// Checks method, encoding, body and digest. JSON is at most 512 deep, the text at most 64 MiB.
UploadVerdict checkUpload(const Request& request);

}  // namespace sandbox
