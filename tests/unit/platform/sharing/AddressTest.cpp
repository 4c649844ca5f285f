#include "webapi/platform/Sharing.h"

#include <gtest/gtest.h>

namespace QELO::sharing {
namespace {

struct Address {
  std::string url = "before";
  _tag_SHARING_URL_TYPE type = SHARING_URL_HOST;
  bool good = false;
};

Address make(const std::string& host, int port, bool isHttps, const std::string& path,
             const std::string& rewriteApp) {
  Address address;
  address.good = GetSharingURL(host, port, isHttps, path, rewriteApp, address.url, address.type);
  return address;
}

TEST(SharingURL, HostAndPathThatTheClientCalled) {
  const Address address = make("nas", 0, false, "/webapi/", "");
  EXPECT_TRUE(address.good);
  EXPECT_EQ(address.url, "http://nas/webapi/sharing/");
  EXPECT_EQ(address.type, SHARING_URL_HOST);
}

TEST(SharingURL, PortIsLeftOutWhenItIsTheProtocolsOwn) {
  EXPECT_EQ(make("nas", 80, false, "/", "").url, "http://nas/sharing/");
  EXPECT_EQ(make("nas", 443, true, "/", "").url, "https://nas/sharing/");
  EXPECT_EQ(make("nas", 443, false, "/", "").url, "http://nas:443/sharing/");
  EXPECT_EQ(make("nas", 80, true, "/", "").url, "https://nas:80/sharing/");
  EXPECT_EQ(make("[fe80::1]", 5001, true, "/", "").url, "https://[fe80::1]:5001/sharing/");
  EXPECT_EQ(make("nas", -1, false, "/", "").url, "http://nas/sharing/");
}

TEST(SharingURL, ApplicationsPathTakesThePlaceOfTheClients) {
  const Address address = make("nas", 0, true, "/webapi/", "photo");
  EXPECT_EQ(address.url, "https://nas/photo/sharing/");
  EXPECT_EQ(address.type, SHARING_URL_REWRITE);
}

TEST(SharingURL, EmptyPathIsTheRoot) {
  EXPECT_EQ(make("nas", 0, false, "", "").url, "http://nas/sharing/");
}

TEST(SharingURL, AddressOfAMethod_LeadsBesideTheProgramToo) {
  EXPECT_EQ(make("nas", 0, false, "/webapi/rest/QELO.Share.Link/v1/", "").url,
            "http://nas/webapi/sharing/");
  EXPECT_EQ(make("nas", 0, false, "/rest/webapi/", "").url, "http://nas/rest/webapi/sharing/");
}

TEST(SharingURL, WithoutHostThereIsNone) {
  const Address address = make("", 80, false, "/", "");
  EXPECT_FALSE(address.good);
  EXPECT_EQ(address.url, "");
}

}  // namespace
}  // namespace QELO::sharing
