#include <gtest/gtest.h>

#include <string>

#include "webapi/platform/Network.h"

namespace {

constexpr int kV4 = 2;
constexpr int kV6 = 10;

}  // namespace

TEST(AddressType, OfFourDecimalNumbersIsIPv4) {
  for (const char* text : {"0.0.0.0", "127.0.0.1", "192.168.1.1", "255.255.255.255"}) {
    EXPECT_EQ(QELONetGetAddrType(text), kV4) << text;
  }
}

TEST(AddressType, OfTheFormsOfRfc4291IsIPv6) {
  for (const char* text :
       {"::", "::1", "1::", "fe80::1", "FE80::ABCD", "2001:db8:0:0:8:800:200c:417a",
        "2001:db8::8:800:200C:417A", "ff01::101", "::ffff:192.0.2.1", "::13.1.68.3",
        "64:ff9b::192.0.2.33", "0:0:0:0:0:0:0:0", "1:2:3:4:5:6:7::"}) {
    EXPECT_EQ(QELONetGetAddrType(text), kV6) << text;
  }
}

TEST(AddressType, OfOldWaysToWriteIPv4IsNone) {
  for (const char* text : {"1", "127.1", "10.0.1", "0x7f.0.0.1", "0177.0.0.1", "192.168.01.1",
                           "2130706433", "1.2.3.4.5", "1.2.3", "1.2.3.", "256.1.1.1", "-1.1.1.1"}) {
    EXPECT_EQ(QELONetGetAddrType(text), 0) << text;
  }
}

TEST(AddressType, OfBrokenIPv6IsNone) {
  for (const char* text : {":", ":::", "1:2:3:4:5:6:7", "1:2:3:4:5:6:7:8:9", "1::2::3",
                           "12345::", "g::", "1:2:3:4:5:6:7:", ":1:2:3:4:5:6:7", "::ffff:192.0.2",
                           "::ffff:192.0.2.256", "::192.0.2.1:1"}) {
    EXPECT_EQ(QELONetGetAddrType(text), 0) << text;
  }
}

TEST(AddressType, OfAnAddressWithSomethingMoreIsNone) {
  for (const char* text : {"", " ", " 1.2.3.4", "1.2.3.4 ", "1.2.3.4\n", "1.2.3.4:80", "1.2.3.4/24",
                           "::1/128", "[::1]", "[::1]:80", "localhost", "nas"}) {
    EXPECT_EQ(QELONetGetAddrType(text), 0) << text;
  }
}

TEST(AddressType, OfAnAddressWithAnInterfaceIsNone) {
  for (const char* text : {"fe80::1%lo", "fe80::1%1", "fe80::1%", "::1%lo", "127.0.0.1%lo"}) {
    EXPECT_EQ(QELONetGetAddrType(text), 0) << text;
  }
}

TEST(AddressType, OfNothingOrVeryMuchIsNone) {
  EXPECT_EQ(QELONetGetAddrType(nullptr), 0);
  EXPECT_EQ(QELONetGetAddrType(std::string(16UL << 20U, '1').c_str()), 0);
  EXPECT_EQ(QELONetGetAddrType(std::string(16UL << 20U, ':').c_str()), 0);
}
