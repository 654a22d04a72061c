// Lists of runtime options as they go to the library and come back.
#include "vswitch/runtime_options.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstddef>
#include <cstring>
#include <string>
#include <vector>

#include "queried_host.h"

namespace {

using RuntimeOptions = Queries;

// A packed list, byte by byte.
struct OptionList {
  std::vector<unsigned char> packed = {};  // the options

  OptionList &add(unsigned type, std::string const &data, int length = -1) {
    auto const size = length < 0 ? data.size() + 4 : static_cast<std::size_t>(length);
    for (auto const value : {type, static_cast<unsigned>(size)}) {
      packed.push_back(value & 0xFFU);
      packed.push_back(value >> 8U);
    }
    packed.insert(packed.end(), data.begin(), data.end());
    return *this;
  }
  OptionList &add_number(unsigned type, int value) {
    std::string data(sizeof value, '\0');
    std::memcpy(data.data(), &value, sizeof value);
    return add(type, data);
  }
  /// Hands it to the host in a block of its own size, so that a sanitizer sees what is read past
  /// it.
  [[nodiscard]] QEX_ReturnStatus set() const {
    return set_as(static_cast<qex_uint32>(sizeof(qex_uint32) + packed.size()));
  }
  [[nodiscard]] QEX_ReturnStatus set_as(qex_uint32 total) const {
    std::string list(reinterpret_cast<char const *>(&total), sizeof total);
    list.append(packed.begin(), packed.end());
    return VSQEX_SetRuntimeOptions(reinterpret_cast<VSRuntimeOptions *>(list.data()));
  }
};

std::string text(char const *value) {
  return {value, std::strlen(value) + 1};
}

std::vector<unsigned char> options(std::vector<qex_uint16> const &ids) {
  VSRuntimeOptions *list = nullptr;
  EXPECT_EQ(VSQEX_GetRuntimeOptions(ids.data(), static_cast<qex_uint16>(ids.size()), &list),
            QEX_OK);
  auto const *const first = reinterpret_cast<unsigned char *>(list);
  std::vector<unsigned char> bytes(first + 4, first + list->totalLength);
  VSQEX_FreeMemory(list);
  return bytes;
}

TEST_F(RuntimeOptions, RuntimeOptionsComeBackAsTheyWereSet) {
  ASSERT_EQ(OptionList()
                .add_number(VS_RT_OPT_IGMP_VERSION, 2)
                .add(VS_RT_OPT_MLD_ROUTER_IP, text("fe80::1"))
                .add(VS_RT_OPT_IGMP_ROUTER_IP, text("10.1.1.1"))
                .set(),
            QEX_OK);
  OptionList wanted;
  wanted.add(VS_RT_OPT_IGMP_ROUTER_IP, text("10.1.1.1")).add_number(VS_RT_OPT_IGMP_VERSION, 2);
  EXPECT_THAT(options({VS_RT_OPT_IGMP_ROUTER_IP, VS_RT_OPT_IGMP_VERSION}),
              testing::ElementsAreArray(wanted.packed));
}

TEST_F(RuntimeOptions, NoIdsMeanAllOptions) {
  VSRuntimeOptions *list = nullptr;
  ASSERT_EQ(VSQEX_GetRuntimeOptions(nullptr, 0, &list), QEX_OK);
  auto const *at = reinterpret_cast<unsigned char *>(list + 1);
  auto const *const end = reinterpret_cast<unsigned char *>(list) + list->totalLength;
  std::vector<unsigned> types;
  while (at < end) {
    types.push_back(at[0]);
    at += at[2];
  }
  EXPECT_EQ(at, end);
  EXPECT_THAT(types, testing::ElementsAre(0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14));
  VSQEX_FreeMemory(list);
  EXPECT_EQ(VSQEX_GetRuntimeOptions(nullptr, 1, &list), QEX_BAD_PARAM);
  qex_uint16 const unknown = 15;
  EXPECT_EQ(VSQEX_GetRuntimeOptions(&unknown, 1, &list), QEX_NOT_SUPPORTED);
  ASSERT_EQ(VSQEX_GetRuntimeOptions(&unknown, 0, &list), QEX_OK) << "asked for none";
  EXPECT_EQ(list->totalLength, 4U);
  VSQEX_FreeMemory(list);
}

TEST_F(RuntimeOptions, MalformedListsAreRefusedWhole) {
  auto const number = std::string(4, '\0');
  EXPECT_EQ(OptionList().set(), QEX_OK) << "no options";
  EXPECT_EQ(OptionList().set_as(3), QEX_BAD_PARAM);
  EXPECT_EQ(OptionList().set_as(4097), QEX_BAD_PARAM);
  EXPECT_EQ(OptionList().add(VS_RT_OPT_IGMP_VERSION, number, 0).set(), QEX_BAD_PARAM);
  EXPECT_EQ(OptionList().add(VS_RT_OPT_IGMP_VERSION, number, 3).set(), QEX_BAD_PARAM);
  EXPECT_EQ(OptionList().add(VS_RT_OPT_IGMP_VERSION, number, 9).set(), QEX_BAD_PARAM);
  EXPECT_EQ(OptionList().add(VS_RT_OPT_IGMP_VERSION, "\3").set(), QEX_BAD_PARAM);
  EXPECT_EQ(OptionList().add(VS_RT_OPT_IGMP_ROUTER_IP, "10.0.0.1").set(), QEX_BAD_PARAM)
      << "without its NUL";
  EXPECT_EQ(OptionList().add(VS_RT_OPT_IGMP_ROUTER_IP, text("10.0.0.1") + text("x")).set(),
            QEX_BAD_PARAM);
  EXPECT_EQ(OptionList().add(VS_RT_OPT_IGMP_ROUTER_IP, text("ten")).set(), QEX_INVALID_ADDRESS);
  EXPECT_EQ(OptionList().add(VS_RT_OPT_MLD_ROUTER_IP, text("10.0.0.1")).set(), QEX_INVALID_ADDRESS);
  EXPECT_EQ(OptionList().add_number(15, 0).set(), QEX_NOT_SUPPORTED);
  EXPECT_EQ(OptionList().add_number(VS_RT_OPT_IGMP_VERSION, 4).set(), QEX_BAD_PARAM);
  EXPECT_EQ(OptionList()
                .add_number(VS_RT_OPT_IGMP_QUERIES, 5)
                .add_number(VS_RT_OPT_ALLOW_FAST_PATH, 2)
                .set(),
            QEX_BAD_PARAM);
  OptionList two;
  two.add_number(VS_RT_OPT_IGMP_QUERIES, 2);
  EXPECT_THAT(options({VS_RT_OPT_IGMP_QUERIES}), testing::ElementsAreArray(two.packed))
      << "the option before the wrong one is as it was";
}

}  // namespace
