// A switch with a port on the host of this process, reached through the two libraries, and raw
// property calls with their memory taken care of.
#pragma once

#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <optional>
#include <string_view>
#include <type_traits>
#include <vector>

#include "abi/simhost_api/simhost.h"
#include "nebpublic/kernel_state.h"
#include "nebpublic/property_types.h"
#include "nebpublic/state.h"
#include "vswitch/configuration.h"

using Bytes = std::vector<unsigned char>;

template <typename Record>
Bytes bytes_of(Record const &record) {
  static_assert(std::is_trivially_copyable_v<Record>);
  Bytes bytes(sizeof record);
  std::memcpy(bytes.data(), &record, sizeof record);
  return bytes;
}

/// The record that the bytes are.
template <typename Record>
Record as(Bytes const &bytes) {
  Record record{};
  EXPECT_EQ(bytes.size(), sizeof record);
  std::memcpy(&record, bytes.data(), sizeof record);
  return record;
}

inline Bytes bytes_of_text(std::string_view text) {
  Bytes bytes(text.begin(), text.end());
  bytes.push_back(0);
  return bytes;
}

inline Bytes operator+(Bytes left, Bytes const &right) {
  left.insert(left.end(), right.begin(), right.end());
  return left;
}

/// What a raw call allocates, released at once.
inline Bytes taken(void *data, int length) {
  auto const *const first = static_cast<unsigned char const *>(data);
  Bytes bytes(first, first + length);
  DVSQEX_DataFree(data);
  return bytes;
}

/// The texts of the lists of uplink ports, which follow the count without being declared.
inline char *text_in(VSUplinkPorts *names, std::size_t at) {
  return reinterpret_cast<char *>(names + 1) + (at * QEX_NEB_NAME_MAX_LEN);
}
inline char *text_in(VSUplinkPortIds *ids, std::size_t at) {
  return reinterpret_cast<char *>(ids + 1) + (at * QEX_NEB_PORT_ID_MAX_LEN);
}

/// The switch "s" with the identifier "s-id", uplink ports "uplink1" and "uplink2", and the port
/// "p". Nothing of it is left after a test, no memory that the host gave out either.
struct ConfiguredSwitch : testing::Test {
  ConfiguredSwitch() {
    unsetenv("SIMHOST_STATE");
    EXPECT_EQ(DVSState_ConfigReset(), QEX_OK);
    EXPECT_EQ(VSDVS_CreateVSwitch("s", "s-id", "s-ports", 0, 1, 0, 0, 2), QEX_OK);
    EXPECT_EQ(VSDVS_AddDVPort("s", "p", 7), QEX_OK);
  }
  ~ConfiguredSwitch() override {
    EXPECT_EQ(simhost_ledger_count(), 0U);
    EXPECT_EQ(DVSState_ConfigReset(), QEX_OK);
  }
  ConfiguredSwitch(ConfiguredSwitch const &) = delete;
  ConfiguredSwitch &operator=(ConfiguredSwitch const &) = delete;

  static std::optional<Bytes> global(char const *key) {
    void *data = nullptr;
    int length = 0;
    if (DVSQEX_GlobalPropGet("s-id", key, &data, &length) != QEX_OK) {
      return std::nullopt;
    }
    return taken(data, length);
  }
  static std::optional<Bytes> host(char const *key) {
    void *data = nullptr;
    int length = 0;
    if (DVSQEX_HostPropGet("s-id", key, &data, &length) != QEX_OK) {
      return std::nullopt;
    }
    return taken(data, length);
  }
  static std::optional<Bytes> port(char const *key, char const *name = "p") {
    void *data = nullptr;
    int length = 0;
    if (DVSQEX_PortDataGet("s-id", name, key, &data, &length) != QEX_OK) {
      return std::nullopt;
    }
    return taken(data, length);
  }

  static QEX_ReturnStatus set_global(char const *key, Bytes value,
                                     qex_uint32 type = CONFIG_PROP_TYPE) {
    return DVSQEX_GlobalPropSet("s-id", key, value.data(), static_cast<int>(value.size()), type);
  }
  static QEX_ReturnStatus set_host(char const *key, Bytes value,
                                   qex_uint32 type = CONFIG_PROP_TYPE) {
    return DVSQEX_HostPropSet("s-id", key, value.data(), static_cast<int>(value.size()), type);
  }
  static QEX_ReturnStatus set_port(char const *key, Bytes value, char const *name = "p",
                                   qex_uint32 type = CONFIG_PROP_TYPE) {
    return DVSQEX_PortDataSet("s-id", name, key, value.data(), static_cast<int>(value.size()),
                              type);
  }
};
