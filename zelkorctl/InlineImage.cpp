#include "zelkorctl/InlineImage.h"

#include <cstddef>
#include <cstdint>

namespace zelkorctl {
namespace {

// The protocol takes at most this much base64 at once.
constexpr std::size_t kLongestPiece = 4096;

std::string base64(std::string_view bytes) {
  static constexpr char kDigits[] =
      "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
  std::string text;
  for (std::size_t at = 0; at < bytes.size(); at += 3) {
    std::uint32_t group = 0;
    for (std::size_t i = 0; i < 3; ++i) {
      group = group << 8 | (at + i < bytes.size() ? static_cast<unsigned char>(bytes[at + i]) : 0);
    }
    for (std::size_t i = 0; i < 4; ++i) {
      text.push_back(at + i > bytes.size() ? '=' : kDigits[group >> (18 - 6 * i) & 63]);
    }
  }
  return text;
}

}  // namespace

bool showsInlineImages(std::string_view type, std::string_view program) {
  return type == "xterm-kitty" || type == "xterm-ghostty" || program == "WezTerm" ||
         program == "ghostty";
}

// a=T transmits and shows, f=100 is PNG, q=2 asks for no answer, m=1 says that more follows.
std::string inlineImage(std::string_view png) {
  const auto text = base64(png);
  std::string result;
  for (std::size_t at = 0; at < text.size(); at += kLongestPiece) {
    result += at == 0 ? "\x1b_Ga=T,f=100,q=2," : "\x1b_G";
    result += at + kLongestPiece < text.size() ? "m=1;" : "m=0;";
    result += text.substr(at, kLongestPiece) + "\x1b\\";
  }
  return result;
}

}  // namespace zelkorctl
