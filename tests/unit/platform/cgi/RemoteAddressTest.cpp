#include <cstdlib>

#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Cgi.h"

namespace {

class RemoteAddress : public PrivateRoot {
 protected:
  static std::string Get(int size = 65) {
    char text[65] = "before";
    const int result = QeloCgiGetRemoteIP(text, size);
    EXPECT_TRUE(result == 0 || text[0] == '\0') << text;
    return result == 0 ? text : "unknown";
  }
  static std::string From(const char* peer, const char* real = nullptr,
                          const char* forwarded = nullptr) {
    setenv("REMOTE_ADDR", peer, 1);
    const auto header = [](const char* name, const char* value) {
      if (value != nullptr) {
        setenv(name, value, 1);
      } else {
        unsetenv(name);
      }
    };
    header("HTTP_X_REAL_IP", real);
    header("HTTP_X_FORWARDED_FOR", forwarded);
    return Get();
  }
};

TEST_F(RemoteAddress, IsTheWebServersAndInShortForm) {
  EXPECT_EQ(From("192.0.2.1"), "192.0.2.1");
  EXPECT_EQ(From("2001:0DB8:0:0::1"), "2001:db8::1");
  EXPECT_EQ(From("::ffff:192.0.2.1"), "192.0.2.1");
  EXPECT_EQ(From("fe80::1%eth0"), "fe80::1");
}

TEST_F(RemoteAddress, IsUnknownWithoutAnAddress) {
  EXPECT_EQ(From(""), "unknown");
  EXPECT_EQ(From("/run/server.sock"), "unknown");
  EXPECT_EQ(From("192.0.2"), "unknown");
  unsetenv("REMOTE_ADDR");
  EXPECT_EQ(Get(), "unknown");
}

TEST_F(RemoteAddress, IsUnknownWhenItDoesNotFit) {
  setenv("REMOTE_ADDR", "192.0.2.1", 1);
  EXPECT_EQ(Get(9), "unknown");
  EXPECT_EQ(Get(10), "192.0.2.1");
}

TEST_F(RemoteAddress, HeadersOfAnUntrustedPeerAreNotBelieved) {
  EXPECT_EQ(From("192.0.2.1", "198.51.100.1", "198.51.100.1"), "192.0.2.1");
  Set({{"trusted_proxy", "192.0.2.2, nonsense, 10.0.0.0/8"}});
  EXPECT_EQ(From("192.0.2.1", "198.51.100.1"), "192.0.2.1");
}

TEST_F(RemoteAddress, RealAddressOfATrustedProxyIsBelieved) {
  Set({{"trusted_proxy", "192.0.2.2,10.0.0.0/8 2001:db8::/32"}});
  EXPECT_EQ(From("192.0.2.2", "198.51.100.1"), "198.51.100.1");
  EXPECT_EQ(From("10.9.8.7", "198.51.100.1"), "198.51.100.1");
  EXPECT_EQ(From("2001:db8:1::5", "2001:0:0::9"), "2001::9");
}

TEST_F(RemoteAddress, LastForwardedAddressThatIsNoProxyIsBelieved) {
  Set({{"trusted_proxy", "10.0.0.0/8"}});
  EXPECT_EQ(From("10.0.0.1", nullptr, "198.51.100.1"), "198.51.100.1");
  EXPECT_EQ(From("10.0.0.1", nullptr, "203.0.113.9, 198.51.100.1, 10.0.0.2"), "198.51.100.1");
  EXPECT_EQ(From("10.0.0.1", nullptr, "lies,198.51.100.1"), "198.51.100.1");
}

TEST_F(RemoteAddress, ProxyWithoutHeaderSpeaksForItself) {
  Set({{"trusted_proxy", "10.0.0.0/8"}});
  EXPECT_EQ(From("10.0.0.1"), "10.0.0.1");
  EXPECT_EQ(From("10.0.0.1", "", " , "), "10.0.0.1");
  EXPECT_EQ(From("10.0.0.1", "10.0.0.2", "10.0.0.2, 10.0.0.3"), "10.0.0.1");
}

TEST_F(RemoteAddress, HeadersThatAgreeAreBelieved) {
  Set({{"trusted_proxy", "10.0.0.0/8"}});
  EXPECT_EQ(From("10.0.0.1", "198.51.100.1", "203.0.113.9, 198.51.100.1"), "198.51.100.1");
}

TEST_F(RemoteAddress, InnerProxyInRealAddressLeavesTheChain) {
  Set({{"trusted_proxy", "10.0.0.0/8"}});
  EXPECT_EQ(From("10.0.0.1", "10.0.0.2", "198.51.100.1, 10.0.0.2"), "198.51.100.1");
}

TEST_F(RemoteAddress, HeadersThatContradictMakeItUnknown) {
  Set({{"trusted_proxy", "10.0.0.0/8"}});
  EXPECT_EQ(From("10.0.0.1", "203.0.113.9", "198.51.100.1"), "unknown");
}

TEST_F(RemoteAddress, BrokenHeadersMakeItUnknown) {
  Set({{"trusted_proxy", "10.0.0.0/8"}});
  EXPECT_EQ(From("10.0.0.1", "nonsense"), "unknown");
  EXPECT_EQ(From("10.0.0.1", nullptr, "198.51.100.1, nonsense"), "unknown");
  EXPECT_EQ(From("10.0.0.1", nullptr, "198.51.100.1:80"), "unknown");
}

}  // namespace
