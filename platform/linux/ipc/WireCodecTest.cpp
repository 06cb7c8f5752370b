#include <gtest/gtest.h>
#include <sys/socket.h>

#include <cmath>
#include <functional>
#include <limits>

#include "platform/linux/ipc/IpcTestSupport.h"
#include "platform/linux/ipc/SocketAdoption.h"
#include "platform/linux/ipc/WireDecoding.h"
#include "platform/linux/ipc/WireEncoding.h"

namespace zelkord::ipc {
namespace {

// Messages that never leave.
class WireCodecTest : public testing::Test {
 protected:
  WireCodecTest() {
    int pair[2];
    EXPECT_EQ(::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, pair), 0);
    peer_ = Descriptor(pair[0]);
    Descriptor ours(pair[1]);
    bus_ = adoptSocket(ours, true);
  }

  MessagePtr message(const std::function<int(sd_bus_message*)>& fill) {
    sd_bus_message* made = nullptr;
    EXPECT_GE(sd_bus_message_new_method_call(bus_.get(), &made, nullptr, "/", nullptr, "Member"),
              0);
    MessagePtr owned(made);
    EXPECT_GE(fill(made), 0);
    EXPECT_GE(sd_bus_message_seal(made, 1, 0), 0);
    return owned;
  }
  auto decode(const std::string& signature, const std::function<int(sd_bus_message*)>& fill) {
    return decodeArguments(message(fill).get(), signature, {});
  }

  Descriptor peer_;
  BusPtr bus_;
};

// A value as text, to compare and to show.
std::string shown(const Value& value);

struct ShowValue {
  std::string operator()(bool value) const { return value ? "true" : "false"; }
  std::string operator()(const std::string& text) const { return "\"" + text + "\""; }
  std::string operator()(const Data& data) const { return "<" + std::string(data.view()) + ">"; }
  std::string operator()(const FileHandle& handle) const {
    return handle.descriptor() >= 0 ? "open" : "none";
  }
  std::string operator()(const Unsupported& value) const { return "?" + value.signature; }
  std::string operator()(const Value& value) const { return shown(value); }
  template <typename A, typename B>
  std::string operator()(const std::pair<A, B>& pair) const {
    return (*this)(pair.first) + "=" + (*this)(pair.second);
  }
  template <typename T>
  std::string operator()(const T& content) const {
    if constexpr (std::is_arithmetic_v<T>) {
      return std::to_string(content);
    } else {
      std::string text = "[";
      for (const auto& element : content) text += (*this)(element) + ",";
      return text + "]";
    }
  }
};

std::string shown(const Value& value) {
  return signatureOf(value) + " " + std::visit(ShowValue(), value.variant);
}

std::string shown(const std::variant<Decoded, DecodeFailure>& outcome) {
  if (const auto* failure = std::get_if<DecodeFailure>(&outcome)) {
    constexpr const char* kNames[] = {"wrong type", "over limit", "malformed"};
    return kNames[static_cast<int>(failure->kind)];
  }
  std::string text;
  for (const auto& value : std::get<Decoded>(outcome).values) text += shown(value) + ";";
  return text;
}

TEST_F(WireCodecTest, EveryTypeComesBackAsItWent) {
  const Dictionary inner{
      {"b", true}, {"s", "text"}, {"ay", Data("by\0te")}, {"none", Dictionary{}}};
  const Values values[] = {
      {},
      {true},
      {std::numeric_limits<std::int32_t>::min()},
      {std::numeric_limits<std::uint32_t>::max()},
      {std::numeric_limits<std::int64_t>::min()},
      {std::numeric_limits<std::uint64_t>::max()},
      {-0.5},
      {std::numeric_limits<double>::infinity()},
      {""},
      {"Gr\xC3\xBC\xC3\x9F\x65 \xF0\x9F\x8C\x8D"},
      {Data()},
      {Data(std::string(1u << 20, 'd'))},
      {Strings{"a", "", "c"}},
      {StringPairs{{"q", "1"}, {"q", "2"}}},
      {StringMap{{"k", "v"}}},
      {IntegerMap{{"k", -7}}},
      {DataMap{{"id", Data("x")}, {"", Data()}}},
      {Dictionary{{"nested", inner}, {"list", std::vector<Dictionary>{inner, {}}}}},
      {std::vector<StringMap>{{{"a", "b"}}, {}}},
      {std::vector<Dictionary>{}},
      {FileHandle(::dup(0))},
      {FileHandles{}},
      {FileHandles{FileHandle(::dup(0))}},
      {std::int64_t{5}, Dictionary{}, Dictionary{{"code", std::int64_t{1}}}},
  };
  for (const auto& sent : values) {
    const auto signature = signatureOf(sent);
    SCOPED_TRACE(signature);
    std::string expected;
    for (const auto& value : sent) expected += shown(value) + ";";
    const auto outcome =
        decode(signature, [&](sd_bus_message* m) { return encodeValues(m, signature, sent); });
    EXPECT_EQ(shown(outcome), expected);
  }
}

TEST_F(WireCodecTest, HostileArgumentsAreRefused) {
  const std::string longest(65'536, 'x');
  const std::string tooLong = longest + "x";
  const std::string tooManyBytes((1u << 20) + 1, 'b');
  const auto nested = [](int depth) {
    Dictionary outer;
    for (int i = 1; i < depth; ++i) {
      Dictionary next;
      next["k"] = std::move(outer);
      outer = std::move(next);
    }
    return outer;
  };
  const auto values = [](Values content) {
    return [content](sd_bus_message* m) { return encodeValues(m, signatureOf(content), content); };
  };
  struct Case {
    const char* name;
    std::string signature;
    std::function<int(sd_bus_message*)> fill;
    std::string expected;
  };
  const Case cases[] = {
      {"longest string", "s", values({longest}), "s \"" + longest + "\";"},
      {"string", "s", values({tooLong}), "over limit"},
      {"key", "a{sv}", values({Dictionary{{tooLong, true}}}), "over limit"},
      {"string in a dictionary", "a{sv}", values({Dictionary{{"k", tooLong}}}), "over limit"},
      {"string in pairs", "a(ss)", values({StringPairs{{"k", tooLong}}}), "over limit"},
      {"byte array", "ay", values({Data(tooManyBytes)}), "over limit"},
      {"elements", "as", values({Strings(kMaximumDecodedElements + 1)}), "over limit"},
      {"deepest nesting", "a{sv}", values({nested(kMaximumDecodingDepth)}),
       shown(Value(nested(kMaximumDecodingDepth))) + ";"},
      {"nesting", "a{sv}", values({nested(kMaximumDecodingDepth + 1)}), "over limit"},
      {"wrong type", "s", values({std::int64_t{1}}), "wrong type"},
      {"too few", "ss", values({"a"}), "wrong type"},
      {"too many", "", values({"a"}), "wrong type"},
      {"not UTF-8", "s",
       [](sd_bus_message* m) {
         char* text = nullptr;
         const int r = sd_bus_message_append_string_space(m, 2, &text);
         if (r >= 0) text[0] = '\xC3', text[1] = '(';
         return r;
       },
       "malformed"},
      {"repeated key", "a{sv}",
       [](sd_bus_message* m) {
         return sd_bus_message_append(m, "a{sv}", 2, "k", "s", "first", "k", "u", 2u);
       },
       "a{sv} [\"k\"=u 2,];"},
      {"types that nothing uses", "a{sv}",
       [](sd_bus_message* m) {
         return sd_bus_message_append(m, "a{sv}", 7, "0", "o", "/path", "1", "(sx)", "a", 1LL, "2",
                                      "v", "v", "s", "deep", "3", "a(so)", 1, "a", "/", "4", "g",
                                      "as", "5", "aau", 2, 1, 7u, 0, "6", "s", "kept");
       },
       "a{sv} [\"0\"=o ?o,\"1\"=(sx) ?(sx),\"2\"=v ?v,\"3\"=a(so) ?a(so),\"4\"=g ?g,"
       "\"5\"=aau ?aau,\"6\"=s \"kept\",];"},
  };
  for (const auto& [name, signature, fill, expected] : cases) {
    SCOPED_TRACE(name);
    EXPECT_EQ(shown(decode(signature, fill)), expected);
  }
}

TEST_F(WireCodecTest, TextThatIsNotUtf8IsMendedBeforeItIsSent) {
  using namespace std::string_literals;
  const std::pair<std::string, std::string> cases[] = {
      {"a\xFF"s, "a\xEF\xBF\xBD"},
      {"\xC3"s, "\xEF\xBF\xBD"},
      {"zero\0byte"s,
       "zero\xEF\xBF\xBD"
       "byte"},
      {"ok \xC3\xBC \xE2\x82"s, "ok \xC3\xBC \xEF\xBF\xBD\xEF\xBF\xBD"},
  };
  for (const auto& [sent, expected] : cases) {
    const auto text = sent;
    const auto outcome =
        decode("s", [&](sd_bus_message* m) { return encodeValues(m, "s", {text}); });
    EXPECT_EQ(shown(outcome), "s \"" + expected + "\";");
  }
}

TEST_F(WireCodecTest, ValuesOfAnotherTypeAreNotSent) {
  const std::pair<std::string, Values> cases[] = {
      {"s", {std::int64_t{1}}},
      {"", {"s"}},
      {"a{sv}", {Dictionary{{"k", Unsupported{"o"}}}}},
  };
  for (const auto& [signature, values] : cases) {
    SCOPED_TRACE(signature);
    sd_bus_message* made = nullptr;
    ASSERT_GE(sd_bus_message_new_method_call(bus_.get(), &made, nullptr, "/", nullptr, "M"), 0);
    const MessagePtr owned(made);
    EXPECT_LT(encodeValues(made, signature, values), 0);
  }
}

}  // namespace
}  // namespace zelkord::ipc
