#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>

#include <algorithm>
#include <atomic>
#include <filesystem>

#include "base/RuntimeDirectory.h"
#include "corezelkor/ZLKPromise.h"
#include "corezelkor/client/Client.h"
#include "corezelkor/client/ClientError.h"
#include "corezelkor/client/DiagnosticsClient.h"
#include "corezelkor/client/EndpointClient.h"
#include "corezelkor/client/TinyDaemonTestSupport.h"

namespace zelkor {
namespace {

// Long enough for the slowest machine; no test waits for it to pass.
constexpr Duration kPatience = 30s;

ClientOptions optionsFor(const TinyDaemon& daemon) {
  ClientOptions options;
  options.configuration = {"lanthe", "Test/1"};
  options.socketPath = daemon.path();
  options.timeout = kPatience;
  return options;
}

ZLKSearchRequest searchFor(std::int64_t queryId, std::string text) {
  ZLKSearchRequest request;
  request.queryId = queryId;
  request.queryString = std::move(text);
  return request;
}

class ClientTest : public testing::Test {
 protected:
  ClientTest() {
    daemon_.on("Configure", [this](sd_bus_message* call) {
      sd_bus_reply_method_return(call, "s", daemon_.address().c_str());
    });
  }

  TinyDaemon daemon_;
};

TEST_F(ClientTest, AsksTheBusForAPrivateConnectionAndConfiguresFirst) {
  daemon_.on("Open", [this](sd_bus_message* call) {
    const int descriptor = daemon_.makePrivateConnection();
    sd_bus_reply_method_return(call, "h", descriptor);
    ::close(descriptor);
  });
  daemon_.reply("ListSessions", "aa{ss}", 1, 2, "identifier", "lanthe", "agent", "A/1");
  auto options = optionsFor(daemon_);
  options.socketPath.clear();
  options.busAddress = daemon_.address();
  Client client(options);
  const auto future = client.listSessions();
  const auto* result = future.getWithin(kPatience);
  ASSERT_TRUE(result && result->value);
  ASSERT_EQ(result->value->size(), 1u);
  EXPECT_EQ(result->value->front().agent, "A/1");
  EXPECT_EQ(daemon_.calls(), (std::vector<std::string>{"Open", "Configure", "ListSessions"}));
}

TEST_F(ClientTest, SendsTheRequestAndReadsTheWholeReply) {
  daemon_.on("Request", [](sd_bus_message* call) {
    const char* kind = nullptr;
    sd_bus_message_read(call, "s", &kind);
    EXPECT_STREQ(kind, "lookup");
    EXPECT_GT(sd_bus_message_has_signature(call, "sa{sv}"), 0);
    const std::string body(200'000, 'x');
    sd_bus_message* reply = nullptr;
    sd_bus_message_new_method_return(call, &reply);
    sd_bus_message_append(reply, "x", std::int64_t{7});
    sd_bus_message_open_container(reply, 'a', "{sv}");
    sd_bus_message_append(reply, "{sv}", "scale", "d", 2.0);
    sd_bus_message_append(reply, "{sv}", "unknown", "(ii)", 1, 2);
    sd_bus_message_append(reply, "{sv}", "httpResponse", "a{sv}", 2, "status", "i", 200, "headers",
                          "a{ss}", 1, "A", "b");
    sd_bus_message_open_container(reply, 'e', "sv");
    sd_bus_message_append(reply, "s", "data");
    sd_bus_message_open_container(reply, 'v', "ay");
    sd_bus_message_append_array(reply, 'y', body.data(), body.size());
    sd_bus_message_close_container(reply);
    sd_bus_message_close_container(reply);
    sd_bus_message_close_container(reply);
    sd_bus_message_append(reply, "a{sv}", 0);
    sd_bus_send(nullptr, reply, nullptr);
    sd_bus_message_unref(reply);
  });
  Client client(optionsFor(daemon_));
  ZLKLookupRequest request;
  request.queryId = 7;
  request.queryItems = {{"a", "b"}};
  request.queryContext = "around it";
  const auto future = client.request(request);
  const auto* answer = future.getWithin(kPatience);
  ASSERT_TRUE(answer && answer->reply);
  EXPECT_EQ(answer->queryId, 7);
  EXPECT_EQ(answer->reply->scale, 2);
  EXPECT_EQ(answer->reply->data.size(), 200'000u);
  EXPECT_EQ(answer->reply->httpResponse->headers, (HeaderFields{{"A", "b"}}));
  EXPECT_FALSE(answer->error);
}

TEST_F(ClientTest, TurnsEveryKindOfAnswerIntoAResult) {
  const auto code = [](ClientErrorCode value) {
    return std::pair(std::string(kClientErrorDomain), static_cast<std::int64_t>(value));
  };
  const auto nothing = std::pair(std::string(), std::int64_t{0});
  const auto none = std::int64_t{1};
  const struct {
    const char* name;
    TinyDaemon::Handler handler;
    std::pair<std::string, std::int64_t> error;
  } cases[] = {
      {"nothing", [=](auto* call) { sd_bus_reply_method_return(call, "xa{sv}a{sv}", none, 0, 0); },
       nothing},
      {"the service's error",
       [=](auto* call) {
         sd_bus_reply_method_return(call, "xa{sv}a{sv}", none, 0, 3, "domain", "s", "D", "code",
                                    "x", std::int64_t{5}, "userInfo", "a{sv}", 1, "reason", "s",
                                    "r");
       },
       {"D", 5}},
      {"no arguments", [](auto* call) { sd_bus_reply_method_return(call, ""); },
       code(ClientErrorCode::BadReply)},
      {"other types", [](auto* call) { sd_bus_reply_method_return(call, "s", "x"); },
       code(ClientErrorCode::BadReply)},
      {"missing error", [=](auto* call) { sd_bus_reply_method_return(call, "xa{sv}", none, 0); },
       code(ClientErrorCode::BadReply)},
      {"text for bytes",
       [=](auto* call) {
         sd_bus_reply_method_return(call, "xa{sv}a{sv}", none, 1, "data", "s", "text", 0);
       },
       code(ClientErrorCode::BadReply)},
      {"number for reason",
       [=](auto* call) {
         sd_bus_reply_method_return(call, "xa{sv}a{sv}", none, 0, 1, "userInfo", "a{sv}", 1,
                                    "reason", "i", 4);
       },
       code(ClientErrorCode::BadReply)},
      {"refused",
       [](auto* call) { sd_bus_reply_method_errorf(call, SD_BUS_ERROR_INVALID_ARGS, "no"); },
       code(ClientErrorCode::Refused)},
  };
  Client client(optionsFor(daemon_));
  for (const auto& [name, handler, expected] : cases) {
    SCOPED_TRACE(name);
    daemon_.on("Request", handler);
    const auto future = client.request(searchFor(1, "a"));
    const auto* answer = future.getWithin(kPatience);
    ASSERT_TRUE(answer);
    EXPECT_EQ(answer->queryId, 1);
    EXPECT_FALSE(answer->reply);
    const auto error = answer->error.value_or(Error{});
    EXPECT_EQ(std::pair(error.domain, error.code), expected) << error.description();
  }
}

TEST_F(ClientTest, RefusesTextThatCannotTravel) {
  Client client(optionsFor(daemon_));
  for (const auto& text : {std::string("a\0b", 3), std::string("\xff")}) {
    const auto future = client.request(searchFor(1, text));
    ASSERT_TRUE(future.getWithin(kPatience));
    EXPECT_TRUE(isClientError(future.get().error.value(), ClientErrorCode::Refused));
  }
}

TEST_F(ClientTest, SendsNoncharactersAsReplacements) {
  std::vector<std::string> sent;
  daemon_.on("Request", [&](sd_bus_message* call) {
    sd_bus_message_skip(call, "s");
    sd_bus_message_enter_container(call, 'a', "{sv}");
    while (sd_bus_message_enter_container(call, 'e', "sv") > 0) {
      const char* type = nullptr;
      const char* text = nullptr;
      sd_bus_message_skip(call, "s");
      sd_bus_message_peek_type(call, nullptr, &type);
      if (std::string_view(type) == "s") {
        sd_bus_message_read(call, "v", "s", &text);
        sent.emplace_back(text);
      } else if (std::string_view(type) == "a(ss)") {
        const char* value = nullptr;
        sd_bus_message_read(call, "v", "a(ss)", 1, &text, &value);
        sent.insert(sent.end(), {text, value});
      } else {
        sd_bus_message_skip(call, "v");
      }
      sd_bus_message_exit_container(call);
    }
    sd_bus_reply_method_return(call, "xa{sv}a{sv}", std::int64_t{1}, 0, 0);
  });
  Client client(optionsFor(daemon_));
  auto request = searchFor(1, "a\xEF\xBF\xBF");
  request.queryItems = {{"\xEF\xB7\x90", "\xF0\x9F\xBF\xBE"}};
  const auto future = client.request(std::move(request));
  ASSERT_TRUE(future.getWithin(kPatience));
  EXPECT_FALSE(future.get().error) << future.get().error->description();
  EXPECT_EQ(sent, (std::vector<std::string>{"a\xEF\xBF\xBD", "\xEF\xBF\xBD", "\xEF\xBF\xBD"}));
}

TEST_F(ClientTest, ALostConnectionFailsTheCallsUnderWayAndTheNextCallMakesANewOne) {
  const ZLKPromise<bool> disconnected;
  const ZLKPromise<bool> asked;
  daemon_.on("Request", [&](sd_bus_message*) { asked.fulfill(true); });
  auto options = optionsFor(daemon_);
  options.disconnected = [&] { disconnected.fulfill(true); };
  Client client(options);
  const auto first = client.request(searchFor(1, "a"));
  ASSERT_TRUE(asked.future().getWithin(kPatience));
  daemon_.closeConnections();
  ASSERT_TRUE(first.getWithin(kPatience));
  EXPECT_TRUE(isClientError(first.get().error.value(), ClientErrorCode::Disconnected));
  ASSERT_TRUE(disconnected.future().getWithin(kPatience));
  daemon_.reply("Request", "xa{sv}a{sv}", std::int64_t{2}, 0, 0);
  const auto second = client.request(searchFor(2, "b"));
  ASSERT_TRUE(second.getWithin(kPatience));
  EXPECT_FALSE(second.get().error);
  const auto calls = daemon_.calls();
  EXPECT_EQ(std::count(calls.begin(), calls.end(), "Configure"), 2);
}

TEST_F(ClientTest, HearsOfTheBagWhileACallIsUnderWay) {
  const ZLKPromise<std::string> version;
  auto options = optionsFor(daemon_);
  options.bagDidLoad = [&](const std::optional<ClientBag>& bag, const std::optional<Error>&) {
    version.fulfill(bag && bag->version ? *bag->version : "none");
  };
  Client client(options);
  daemon_.on("Request", [](sd_bus_message* call) {
    auto* bus = sd_bus_message_get_bus(call);
    // Of another form first: it is refused and does no harm.
    for (const bool good : {false, true}) {
      sd_bus_message* note = nullptr;
      sd_bus_message_new_method_call(bus, &note, nullptr, "/com/quenta/zelkord/client",
                                     "com.quenta.zelkord.Client1", "BagDidLoad");
      if (good) {
        sd_bus_message_append(note, "a{sv}a{sv}", 2, "version", "s", "12", "enabled", "b", 1, 0);
      } else {
        sd_bus_message_append(note, "i", 3);
      }
      sd_bus_send(nullptr, note, nullptr);
      sd_bus_message_unref(note);
    }
  });
  const auto unanswered = client.request(searchFor(1, "a"));
  const auto future = version.future();
  ASSERT_TRUE(future.getWithin(kPatience));
  EXPECT_EQ(future.get(), "12");
  EXPECT_FALSE(unanswered.isFulfilled());
}

TEST_F(ClientTest, EndsCallsThatAreNotAnsweredInTime) {
  auto options = optionsFor(daemon_);
  options.timeout = 1ms;
  Client client(options);
  const auto future = client.request(searchFor(3, "a"));
  ASSERT_TRUE(future.getWithin(kPatience));
  EXPECT_EQ(future.get().queryId, 3);
  EXPECT_TRUE(isClientError(future.get().error.value(), ClientErrorCode::TimedOut));
}

TEST_F(ClientTest, EndsCallsWithTheClient) {
  auto client = std::make_unique<Client>(optionsFor(daemon_));
  const auto main = client->request(searchFor(1, "a"));
  const auto endpoint = EndpointClient(*client).loadImages({}, 1s);
  client.reset();
  ASSERT_TRUE(main.isFulfilled() && endpoint.isFulfilled());
  EXPECT_TRUE(isClientError(main.get().error.value(), ClientErrorCode::Cancelled));
  EXPECT_TRUE(isClientError(endpoint.get().error.value(), ClientErrorCode::Cancelled));
}

TEST_F(ClientTest, SaysWhenThereIsNoDaemon) {
  auto options = optionsFor(daemon_);
  options.socketPath += ".gone";
  Client client(options);
  const auto main = client.bag();
  const auto endpoint = EndpointClient(client).loadImages({}, 1s);
  for (const auto* error : {&main.get().error, &endpoint.get().error}) {
    ASSERT_TRUE(*error);
    EXPECT_TRUE(isClientError(**error, ClientErrorCode::NotReachable)) << (*error)->description();
  }
}

// A socket that somebody else's process listens on: the kernel notes who called listen.
int makeForeignSocket(const std::string& path) {
  constexpr uid_t kNobody = 65534;
  const int listener = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  path.copy(address.sun_path, sizeof address.sun_path - 1);
  ::bind(listener, reinterpret_cast<const sockaddr*>(&address), sizeof address);
  const auto child = ::fork();
  if (child == 0) ::_exit(::setuid(kNobody) == 0 && ::listen(listener, 4) == 0 ? 0 : 1);
  int status = 0;
  ::waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
  return listener;
}

TEST_F(ClientTest, TellsNothingToSomebodyElsesProcess) {
  if (::geteuid() != 0) GTEST_SKIP() << "only root can be two users";
  auto options = optionsFor(daemon_);
  options.socketPath += ".foreign";
  const int listener = makeForeignSocket(options.socketPath);
  Client client(options);
  const auto future = client.request(searchFor(1, "secret"));
  ASSERT_TRUE(future.getWithin(kPatience));
  const auto& error = future.get().error;
  ASSERT_TRUE(error && isClientError(*error, ClientErrorCode::NotReachable));
  EXPECT_NE(error->reason()->find("user 65534"), std::string::npos) << *error->reason();
  const int accepted = ::accept4(listener, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK);
  char bytes[4096];
  const auto count = ::read(accepted, bytes, sizeof bytes);
  const std::string told(bytes, count > 0 ? static_cast<std::size_t>(count) : 0);
  EXPECT_EQ(told.find("secret"), std::string::npos);
  EXPECT_EQ(told.find("lanthe"), std::string::npos);
  ::close(accepted);
  ::close(listener);
  ::unlink(options.socketPath.c_str());
}

// Sets a variable, or takes it away, until it ends.
class ChangedVariable {
 public:
  ChangedVariable(const char* name, const char* value) : name_(name) {
    if (const char* before = ::getenv(name)) before_ = before;
    value ? ::setenv(name, value, 1) : ::unsetenv(name);
  }
  ~ChangedVariable() { before_ ? ::setenv(name_, before_->c_str(), 1) : ::unsetenv(name_); }
  ChangedVariable(const ChangedVariable&) = delete;
  ChangedVariable& operator=(const ChangedVariable&) = delete;

 private:
  const char* const name_;
  std::optional<std::string> before_;
};

TEST_F(ClientTest, FindsTheDaemonInATemporaryDirectory) {
  const auto root = daemon_.path() + ".d";
  const ChangedVariable runtime("XDG_RUNTIME_DIR", nullptr);
  const ChangedVariable temporary("TMPDIR", root.c_str());
  const auto usual = root + "/zelkord-" + std::to_string(::getuid());
  std::filesystem::create_directories(usual + ".aB3/com.quenta.zelkord");
  std::filesystem::create_directory(usual);  // left by a daemon that is gone
  for (const auto& path : {usual, usual + ".aB3"}) ::chmod(path.c_str(), 0700);
  std::filesystem::create_symlink(daemon_.path(), usual + ".aB3/com.quenta.zelkord/socket");
  if (findRuntimeDirectories(RuntimeEnvironment::ofProcess()).front() != usual) {
    std::filesystem::remove_all(root);
    GTEST_SKIP() << "the host has a runtime directory";
  }
  daemon_.reply("Metrics", "a{sx}", 0);
  auto options = optionsFor(daemon_);
  options.socketPath.clear();
  options.busAddress = "unix:path=/nowhere/bus";
  Client client(options);
  const auto future = DiagnosticsClient(client).metrics();
  ASSERT_TRUE(future.getWithin(kPatience));
  EXPECT_TRUE(future.get().value) << future.get().error->description();
  std::filesystem::remove_all(root);
}

TEST_F(ClientTest, TheEndpointIsReachedThroughTheConfiguration) {
  daemon_.reply("LoadImages", "a{say}", 1, "http://a/b", 3, 1, 2, 3);
  Client client(optionsFor(daemon_));
  const EndpointClient endpoint(client);
  const auto images = endpoint.loadImages({{.url = "http://a/b", .id = "", .data = {}}}, 1s);
  ASSERT_TRUE(images.getWithin(kPatience));
  ASSERT_TRUE(images.get().value);
  EXPECT_EQ(images.get().value->at("http://a/b").view(), std::string_view("\1\2\3"));
  EXPECT_EQ(daemon_.calls(), (std::vector<std::string>{"Configure", "LoadImages"}));
}

TEST_F(ClientTest, ToolsNeedNoConfiguration) {
  daemon_.reply("Metrics", "a{sx}", 1, "k", std::int64_t{12});
  daemon_.reply("ReadDefault", "s", "true");
  daemon_.reply("WriteDefault", "");
  auto options = optionsFor(daemon_);
  options.configuration = {};
  Client client(options);
  const DiagnosticsClient diagnostics(client);
  EXPECT_EQ(diagnostics.metrics().get().value->at("k"), 12);
  EXPECT_EQ(diagnostics.readDefault("", "ZLKUseMorvane").get().value, "true");
  EXPECT_TRUE(diagnostics.writeDefault("", "ZLKUseMorvane", "").get().value);
  EXPECT_EQ(daemon_.calls(), (std::vector<std::string>{"Metrics", "ReadDefault", "WriteDefault"}));
}

TEST_F(ClientTest, GivesTheFileOfAResource) {
  daemon_.on("FileHandleAndAttributesForResource", [](sd_bus_message* call) {
    int ends[2];
    ASSERT_EQ(::pipe(ends), 0);
    ASSERT_EQ(::write(ends[1], "abc", 3), 3);
    sd_bus_reply_method_return(call, "aha{sv}a{sv}", 1, ends[0], 1, "size", "t", std::uint64_t{3},
                               0);
    ::close(ends[0]);
    ::close(ends[1]);
  });
  Client client(optionsFor(daemon_));
  const auto future = client.fileHandleForResource("lookup_hints_weekly");
  const auto& file = future.get().value;
  ASSERT_TRUE(file);
  char bytes[4] = {};
  EXPECT_EQ(::read(*file->descriptor, bytes, sizeof bytes), 3);
  EXPECT_STREQ(bytes, "abc");
  EXPECT_EQ(file->size, 3u);
}

TEST_F(ClientTest, ManyThreadsShareOneClient) {
  daemon_.on("Request", [](sd_bus_message* call) {
    sd_bus_reply_method_return(call, "xa{sv}a{sv}", std::int64_t{1}, 0, 0);
  });
  Client client(optionsFor(daemon_));
  std::atomic<int> answered = 0;
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([&] {
      for (int i = 1; i <= 100; ++i) {
        if (!client.request(searchFor(i, "a")).get().error) ++answered;
      }
    });
  }
  for (auto& thread : threads) thread.join();
  EXPECT_EQ(answered, 400);
}

}  // namespace
}  // namespace zelkor
