#include "tests/soak/hostile/RawConnection.h"

#include <fcntl.h>
#include <fmt/core.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <utility>

namespace zelkord::soak {
namespace {

constexpr int kMostDescriptorsAtOnce = 64;

std::string hexadecimal(const std::string& text) {
  std::string digits;
  for (const char character : text) digits += fmt::format("{:02x}", character);
  return digits;
}

void append32(std::string& bytes, std::uint32_t value) {
  for (int shift = 0; shift < 32; shift += 8) bytes += static_cast<char>(value >> shift & 0xff);
}

void pad(std::string& bytes, std::size_t alignment) {
  while (bytes.size() % alignment != 0) bytes += '\0';
}

void appendField(std::string& fields, char code, char type, std::string_view text) {
  pad(fields, 8);
  fields += code;
  fields += '\1';
  fields += type;
  fields += '\0';
  if (type == 'g') {
    fields += static_cast<char>(text.size());
  } else {
    append32(fields, static_cast<std::uint32_t>(text.size()));
  }
  fields += text;
  fields += '\0';
}

}  // namespace

RawConnection::RawConnection(const std::string& socketPath)
    : socket_(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  if (socket_ < 0 || socketPath.size() >= sizeof(address.sun_path)) {
    _close();
    return;
  }
  std::copy(socketPath.begin(), socketPath.end(), address.sun_path);
  const timeval patience{2, 0};
  ::setsockopt(socket_, SOL_SOCKET, SO_SNDTIMEO, &patience, sizeof(patience));
  ::setsockopt(socket_, SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof(patience));
  if (::connect(socket_, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0)
    _close();
}

RawConnection::~RawConnection() { _close(); }

RawConnection::RawConnection(RawConnection&& other) noexcept
    : socket_(std::exchange(other.socket_, -1)) {}

void RawConnection::_close() {
  if (socket_ >= 0) ::close(socket_);
  socket_ = -1;
}

std::string RawConnection::_line() {
  std::string line;
  for (char character = 0; ::recv(socket_, &character, 1, 0) == 1;) {
    line += character;
    if (character == '\n') return line;
  }
  return {};
}

bool RawConnection::authenticate() {
  using namespace std::string_literals;
  const auto user = hexadecimal(std::to_string(::getuid()));
  if (!isOpen() || !send("\0AUTH EXTERNAL "s + user + "\r\n") || !_line().starts_with("OK "))
    return false;
  if (!send("NEGOTIATE_UNIX_FD\r\n") || !_line().starts_with("AGREE")) return false;
  return send("BEGIN\r\n");
}

bool RawConnection::send(std::string_view bytes) {
  while (isOpen() && !bytes.empty()) {
    const auto sent = ::send(socket_, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    if (sent <= 0) return false;
    bytes.remove_prefix(static_cast<std::size_t>(sent));
  }
  return isOpen();
}

bool RawConnection::sendDescriptors(int count) {
  if (!isOpen() || count > kMostDescriptorsAtOnce) return false;
  const int nothing = ::open("/dev/null", O_RDONLY | O_CLOEXEC);
  if (nothing < 0) return false;
  char byte = 0;
  iovec bytes{&byte, 1};
  alignas(cmsghdr) std::array<char, CMSG_SPACE(kMostDescriptorsAtOnce * sizeof(int))> space{};
  msghdr message{};
  message.msg_iov = &bytes;
  message.msg_iovlen = 1;
  message.msg_control = space.data();
  message.msg_controllen = CMSG_SPACE(static_cast<std::size_t>(count) * sizeof(int));
  auto* header = CMSG_FIRSTHDR(&message);
  header->cmsg_level = SOL_SOCKET;
  header->cmsg_type = SCM_RIGHTS;
  header->cmsg_len = CMSG_LEN(static_cast<std::size_t>(count) * sizeof(int));
  for (int i = 0; i < count; ++i) {
    std::memcpy(CMSG_DATA(header) + static_cast<std::size_t>(i) * sizeof(int), &nothing,
                sizeof(int));
  }
  const bool sent = ::sendmsg(socket_, &message, MSG_NOSIGNAL) == 1;
  ::close(nothing);
  return sent;
}

std::string headOfLongCall(std::uint32_t bodyBytes) {
  std::string fields;
  appendField(fields, 1, 'o', "/com/quenta/zelkord");
  appendField(fields, 2, 's', "com.quenta.zelkord.Daemon1");
  appendField(fields, 3, 's', "ReportEventData");
  appendField(fields, 8, 'g', "sxay");
  std::string head = {'l', '\1', '\0', '\1'};
  append32(head, bodyBytes);
  append32(head, 1);
  append32(head, static_cast<std::uint32_t>(fields.size()));
  head += fields;
  pad(head, 8);
  return head;
}

}  // namespace zelkord::soak
