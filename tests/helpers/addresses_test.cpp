// Text forms of addresses, from any alignment.

#include "helpers/addresses.h"

#include <gtest/gtest.h>

#include <string>

#include "tests/helpers/records_in_memory.h"

namespace {

using namespace std::string_literals;

/// The text of an address that starts at an odd byte.
std::string text(PyObject *(*form)(void const *), std::string const &bytes) {
  alignas(8) char block[24] = {};
  bytes.copy(block + 1, sizeof block - 1);
  return text_of(form(block + 1));
}

TEST(MacAddressText, HasTwoLowerCaseDigitsForEachByte) {
  EXPECT_EQ("02:11:22:aa:bb:cc", text(mac_address_text, "\x02\x11\x22\xaa\xbb\xcc"));
  EXPECT_EQ("00:00:00:00:00:00", text(mac_address_text, "\0\0\0\0\0\0"s));
  EXPECT_EQ("ff:ff:ff:ff:ff:ff", text(mac_address_text, "\xff\xff\xff\xff\xff\xff"));
}

TEST(Ipv4AddressText, IsADottedQuadOfNetworkOrder) {
  EXPECT_EQ("192.168.0.1", text(ipv4_address_text, "\xc0\xa8\0\x01"s));
  EXPECT_EQ("0.0.0.0", text(ipv4_address_text, "\0\0\0\0"s));
  EXPECT_EQ("255.255.255.255", text(ipv4_address_text, "\xff\xff\xff\xff"));
}

TEST(Ipv6AddressText, IsThePresentationForm) {
  EXPECT_EQ("::", text(ipv6_address_text, std::string(16, '\0')));
  EXPECT_EQ("fe80::1", text(ipv6_address_text, "\xfe\x80\0\0\0\0\0\0\0\0\0\0\0\0\0\x01"s));
  EXPECT_EQ("::ffff:10.0.0.1",
            text(ipv6_address_text, "\0\0\0\0\0\0\0\0\0\0\xff\xff\x0a\0\0\x01"s));
  EXPECT_EQ("2001:db8:a:b:c:d:e:f",
            text(ipv6_address_text, "\x20\x01\x0d\xb8\0\x0a\0\x0b\0\x0c\0\x0d\0\x0e\0\x0f"s));
  EXPECT_EQ("ffff:ffff:ffff:ffff:ffff:ffff:ffff:ffff",
            text(ipv6_address_text, std::string(16, '\xff')));
}

}  // namespace
