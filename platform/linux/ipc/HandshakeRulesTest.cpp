#include <gtest/gtest.h>

#include <string>

#include "platform/linux/ipc/Authenticator.h"
#include "platform/linux/ipc/Introspection.h"
#include "platform/linux/ipc/MessageGate.h"

namespace zelkord::ipc {
namespace {

using namespace std::string_literals;

struct AuthOutcome {
  std::string said;
  std::string left;  // what was not touched
  Authenticator::State state;
};

// Feeds bytes in pieces of that size, as a socket would show them.
AuthOutcome authenticate(const std::string& input, std::size_t piece) {
  Authenticator authenticator(1000, "5e1f");
  AuthOutcome outcome;
  std::string seen;
  std::size_t next = 0;
  for (;;) {
    while (authenticator.state() != Authenticator::State::Done) {
      const auto length = authenticator.stepLength(seen);
      if (length == 0 || authenticator.state() == Authenticator::State::Failed) break;
      outcome.said += authenticator.step(std::string_view(seen).substr(0, length));
      seen.erase(0, length);
    }
    if (next >= input.size()) break;
    seen += input.substr(next, piece);
    next += piece;
  }
  outcome.left = seen;
  outcome.state = authenticator.state();
  return outcome;
}

TEST(AuthenticatorTest, FollowsTheProtocolHoweverTheBytesArrive) {
  using State = Authenticator::State;
  const std::string ok = "OK 5e1f\r\n";
  const std::string rejected = "REJECTED EXTERNAL\r\n";
  struct Case {
    std::string input;
    std::string said;
    State state;
    std::string left = "";
  };
  const Case cases[] = {
      {"\0AUTH EXTERNAL 31303030\r\nBEGIN\r\n"s, ok, State::Done},
      {"\0AUTH EXTERNAL\r\nDATA\r\nNEGOTIATE_UNIX_FD\r\nBEGIN\r\nl\1"s,
       "DATA\r\n" + ok + "AGREE_UNIX_FD\r\n", State::Done, "l\1"},
      {"\0AUTH EXTERNAL\r\nDATA 31303030\r\nBEGIN\r\n"s, "DATA\r\n" + ok, State::Done},
      {"\0AUTH\r\nAUTH EXTERNAL 31303030\r\n"s, rejected + ok, State::NeedsBegin},
      {"\0AUTH EXTERNAL 30\r\n"s, rejected, State::NeedsAuth},
      {"\0AUTH EXTERNAL 3130303\r\n"s, rejected, State::NeedsAuth},
      {"\0AUTH EXTERNAL 2D31\r\n"s, rejected, State::NeedsAuth},
      {"\0AUTH ANONYMOUS\r\nAUTH DBUS_COOKIE_SHA1 31\r\n"s, rejected + rejected, State::NeedsAuth},
      {"\0AUTH EXTERNAL\r\nCANCEL\r\n"s, "DATA\r\n" + rejected, State::NeedsAuth},
      {"\0NEGOTIATE_UNIX_FD\r\nDATA\r\n"s, "ERROR\r\nERROR\r\n", State::NeedsAuth},
      {"\0BEGIN\r\n"s, "", State::Failed},
      {"AUTH EXTERNAL\r\n"s, "", State::Failed},
      {"\0A\0B\r\n"s, "", State::Failed},
      {"\0"s + std::string(600, 'A'), "", State::Failed},
      {"\0"s + "AUTH\r\nAUTH\r\nAUTH\r\nAUTH\r\nAUTH\r\n",
       rejected + rejected + rejected + rejected, State::Failed},
  };
  for (const auto& [input, said, state, left] : cases) {
    for (const std::size_t piece : {1u, 2u, 7u, 4096u}) {
      SCOPED_TRACE(input + " in pieces of " + std::to_string(piece));
      const auto outcome = authenticate(input, piece);
      EXPECT_EQ(outcome.said, said);
      EXPECT_EQ(outcome.state, state);
      if (state == State::Done) {
        EXPECT_EQ(outcome.left, left);
      }
    }
  }
}

MessageHeader header(char order, std::uint32_t body, std::uint32_t fields,
                     std::uint8_t version = 1) {
  MessageHeader made{static_cast<std::uint8_t>(order), 1, 0, version};
  for (unsigned i = 0; i < 4; ++i) {
    const unsigned shift = order == 'l' ? 8 * i : 24 - 8 * i;
    made[4 + i] = static_cast<std::uint8_t>(body >> shift);
    made[12 + i] = static_cast<std::uint8_t>(fields >> shift);
  }
  return made;
}

TEST(MessageGateTest, KnowsTheSizeOfAMessageFromItsHeader) {
  EXPECT_EQ(messageSize(header('l', 10, 3)), 16u + 8 + 10);
  EXPECT_EQ(messageSize(header('B', 1u << 24, 8)), 16u + 8 + (1u << 24));
  EXPECT_EQ(messageSize(header('l', 0xFFFFFFFF, 0xFFFFFFFF)), 16ull + 0x100000000 + 0xFFFFFFFF);
  EXPECT_EQ(messageSize(header('x', 10, 3)), std::nullopt);
  EXPECT_EQ(messageSize(header('l', 10, 3, 2)), std::nullopt);
}

TEST(MessageGateTest, NoticesAMessageThatNeverCame) {
  MessageGate gate(100);
  EXPECT_FALSE(gate.begin(header('l', 85, 0)));
  ASSERT_TRUE(gate.begin(header('l', 84, 0)));
  EXPECT_TRUE(gate.readInVain(99));
  EXPECT_FALSE(gate.readInVain(1));
  gate.arrived();
  EXPECT_TRUE(gate.isBetweenMessages());
  EXPECT_TRUE(gate.readInVain(99));  // one of unknown size
  EXPECT_FALSE(gate.readInVain(1));
}

TEST(IntrospectionTest, LeadsToTheObjectAndDescribesIt) {
  const std::vector<Interface> interfaces{
      {"a.B", {{"M", "s kind, a{sv} request", "x(ss)"}, {"N", "", "", true}}, {{"S", "s name"}}}};
  const std::pair<const char*, const char*> cases[] = {
      {"/", "<node name=\"com\"/>"},
      {"/com/quenta", "<node name=\"zelkord\"/>"},
      {"/com/quenta/zelkord",
       " <interface name=\"a.B\">\n  <method name=\"M\">\n"
       "   <arg name=\"kind\" type=\"s\" direction=\"in\"/>\n"
       "   <arg name=\"request\" type=\"a{sv}\" direction=\"in\"/>\n"
       "   <arg type=\"x\" direction=\"out\"/>\n   <arg type=\"(ss)\" direction=\"out\"/>\n"
       "  </method>\n  <method name=\"N\">\n"
       "   <annotation name=\"org.freedesktop.DBus.Method.NoReply\" value=\"true\"/>\n"
       "  </method>\n  <signal name=\"S\">\n   <arg name=\"name\" type=\"s\"/>\n  </signal>\n "
       "</interface>\n"},
  };
  for (const auto& [path, part] : cases) {
    EXPECT_NE(introspectionDocument(path, interfaces).find(part), std::string::npos) << path;
  }
  EXPECT_EQ(introspectionDocument("/com/quenta/zelkord/client", interfaces).find("name="),
            std::string::npos);
}

}  // namespace
}  // namespace zelkord::ipc
