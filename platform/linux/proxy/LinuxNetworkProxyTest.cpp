#include <gmock/gmock.h>

#include "platform/linux/proxy/LinuxNetworkProxy.h"
#include "platform/linux/proxy/ProxyRules.h"
#include "platform/testing/RecordingLog.h"

namespace zelkord {
namespace {

using testing::ElementsAre;

class LinuxNetworkProxyTest : public testing::Test {
 protected:
  RecordingLog log_;
  NotificationCenter center_;
  DeviceProfileStore store_{center_, "de_DE"};
};

TEST_F(LinuxNetworkProxyTest, TheProxyNeedsTheProfileAndAConfiguration) {
  LinuxNetworkProxy proxy(store_, log_);
  const json::object good{{"proxy", "http://127.0.0.1:8080"}, {"hosts", {"A.example", 5, "b c"}}};
  proxy.setConfiguration(&good, "zelkord");
  EXPECT_FALSE(proxy.isEnabled());
  DeviceProfile profile;
  profile.networkProxyEnabled = true;
  store_.replace(profile);
  ASSERT_TRUE(proxy.isEnabled());
  EXPECT_THAT(proxy.proxyConfiguration()->hosts, ElementsAre("a.example"));
  const json::object bad{{"proxy", "ftp://h:1"}, {"hosts", {"a"}}};
  proxy.setConfiguration(&bad, "zelkord");
  EXPECT_FALSE(proxy.isEnabled());
  EXPECT_EQ(log_.count(LogLevel::Error), 1);
  proxy.setConfiguration(&good, "zelkord");
  proxy.setConfiguration(nullptr, "zelkord");
  EXPECT_EQ(proxy.proxyConfiguration(), nullptr);
}

TEST(ProxyRulesTest, WantAProxyWithAPort) {
  const std::pair<const char*, bool> cases[] = {
      {"http://h:1", true},
      {"https://proxy.example:65535/", true},
      {"http://[::1]:80", true},
      {"http://h", false},
      {"http://h:0", false},
      {"http://h:65536", false},
      {"http://:80", false},
      {"socks5://h:80", false},
      {"http://u:p@h:80", false},
      {"http://h:80/path", false},
      {"h:80", false},
      {"http://[::1:80", false},
      {"http://h:8 0", false},
      {"", false},
  };
  for (const auto& [proxy, isGood] : cases) {
    SCOPED_TRACE(proxy);
    std::string problem;
    const auto parsed = parseProxyConfiguration({{"proxy", proxy}, {"hosts", {"a"}}}, &problem);
    EXPECT_EQ(parsed != nullptr, isGood) << problem;
  }
}

}  // namespace
}  // namespace zelkord
