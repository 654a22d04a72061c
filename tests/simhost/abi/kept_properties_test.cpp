// Properties that the host keeps elsewhere than under their keys: names, uplink ports, types.
#include <gmock/gmock.h>

#include <string>

#include "configured_switch.h"
#include "nebpublic/names.h"
#include "qexapi/switch_properties.h"
#include "vswitch/properties.h"

namespace {

using KeptProperties = ConfiguredSwitch;

TEST_F(KeptProperties, TheAliasIsAPropertyToo) {
  EXPECT_EQ(global(QEX_NEBPROP_SWITCH_ALIAS), bytes_of_text("s"));
  EXPECT_EQ(set_global(QEX_NEBPROP_SWITCH_ALIAS, bytes_of_text("renamed")), QEX_OK);
  EXPECT_EQ(VSDVS_SetMTU("s", 9000), QEX_NOT_FOUND);
  EXPECT_EQ(VSDVS_SetMTU("renamed", 9000), QEX_OK);
  ASSERT_EQ(VSDVS_CreateVSwitch("other", "o", nullptr, 0, 1, 0, 0, 0), QEX_OK);
  EXPECT_EQ(set_global(QEX_NEBPROP_SWITCH_ALIAS, bytes_of_text("other")), QEX_EXISTS);
  EXPECT_EQ(set_global(QEX_NEBPROP_SWITCH_ALIAS, bytes_of_text("")), QEX_BAD_PARAM);
  EXPECT_EQ(set_global(QEX_NEBPROP_SWITCH_ALIAS, bytes_of_text(std::string(128, 'n'))),
            QEX_NAME_TOO_LONG);
  EXPECT_EQ(global(QEX_NEBPROP_SWITCH_ALIAS), bytes_of_text("renamed"));
}

TEST_F(KeptProperties, TheVersionIsAPropertyToo) {
  EXPECT_EQ(global(QEX_NEBPROP_SWITCH_VERSION), bytes_of(qex_uint32{200}));
  EXPECT_EQ(DVSQEX_SwitchSetVersion("s-id", 100), QEX_OK);
  EXPECT_EQ(global(QEX_NEBPROP_SWITCH_VERSION), bytes_of(qex_uint32{100}));
  EXPECT_EQ(set_global(QEX_NEBPROP_SWITCH_VERSION, bytes_of(qex_uint32{300})), QEX_OK);
  EXPECT_EQ(global(QEX_NEBPROP_SWITCH_VERSION), bytes_of(qex_uint32{300}));
  EXPECT_EQ(set_global(QEX_NEBPROP_SWITCH_VERSION, bytes_of(qex_uint32{0})), QEX_BAD_PARAM);
}

TEST_F(KeptProperties, ThePortsetIsAPropertyThatCallersOnlyRead) {
  EXPECT_EQ(host(QEX_NEBPROP_HOST_PROXY), bytes_of_text("s-ports"));
  EXPECT_EQ(set_host(QEX_NEBPROP_HOST_PROXY, bytes_of_text("x")), QEX_READ_ONLY);
  EXPECT_EQ(DVSQEX_HostPropClear("s-id", QEX_NEBPROP_HOST_PROXY), QEX_READ_ONLY);
}

TEST_F(KeptProperties, TheConnectIdIsAPropertyOfThePort) {
  EXPECT_EQ(port(QEX_NEBPROP_PORT_CONNECTID), bytes_of(qex_uint32{7}));
  EXPECT_EQ(set_port(QEX_NEBPROP_PORT_CONNECTID, bytes_of(qex_uint32{8})), QEX_OK);
  DVPortList *list = nullptr;
  ASSERT_EQ(DVSQEX_SwitchPortList("s-id", &list, DVSPORT_TYPE_ACTIVE), QEX_OK);
  ASSERT_EQ(list->nports, 3);
  EXPECT_STREQ(list->dvPort[2].dvPortId, "p");
  EXPECT_EQ(list->dvPort[2].connectId, 8U);
  DVSQEX_DataFree(list);
}

TEST_F(KeptProperties, TheTypeOfAPortIsItsProperty) {
  ASSERT_EQ(set_port(QEX_NEBPROP_PORT_TYPE, bytes_of(DVSPORT_TYPE_SHADOW)), QEX_OK);
  DVPortList *list = nullptr;
  ASSERT_EQ(DVSQEX_SwitchPortList("s-id", &list, DVSPORT_TYPE_SHADOW), QEX_OK);
  ASSERT_EQ(list->nports, 1);
  EXPECT_EQ(list->type, DVSPORT_TYPE_SHADOW);
  EXPECT_STREQ(list->dvPort[0].dvPortId, "p");
  DVSQEX_DataFree(list);
  EXPECT_EQ(set_port(QEX_NEBPROP_PORT_TYPE, bytes_of(0)), QEX_BAD_PARAM);
  EXPECT_EQ(set_port(QEX_NEBPROP_PORT_TYPE, bytes_of(5)), QEX_BAD_PARAM);
}

TEST_F(KeptProperties, TheUplinkPortsArePropertiesOfTheSwitchAndOfTheHost) {
  VSUplinkPorts *names = nullptr;
  VSUplinkPortIds *ids = nullptr;
  ASSERT_EQ(VSDVS_GetSwitchUplinkPorts("s", &names, &ids), QEX_OK);
  ASSERT_EQ(names->nUplinkPorts, 2U);
  ASSERT_EQ(ids->nUplinkPorts, 2U);
  EXPECT_STREQ(text_in(names, 1), "uplink2");
  EXPECT_STREQ(text_in(ids, 1), "uplink2");
  auto const bytes = [](auto const *record, std::size_t width) {
    auto const *const first = reinterpret_cast<unsigned char const *>(record);
    return Bytes(first, first + 4 + (2 * width));
  };
  EXPECT_EQ(global(QEX_NEBPROP_SWITCH_UPLINKPORTS), bytes(names, QEX_NEB_NAME_MAX_LEN));
  EXPECT_EQ(host(QEX_NEBPROP_HOST_UPLINKPORTS), bytes(ids, QEX_NEB_PORT_ID_MAX_LEN));
  std::memcpy(text_in(names, 0), "left", 5);
  EXPECT_EQ(set_global(QEX_NEBPROP_SWITCH_UPLINKPORTS, bytes(names, QEX_NEB_NAME_MAX_LEN)), QEX_OK);
  std::memcpy(text_in(ids, 1), "right", 6);
  EXPECT_EQ(set_host(QEX_NEBPROP_HOST_UPLINKPORTS, bytes(ids, QEX_NEB_PORT_ID_MAX_LEN)), QEX_OK);
  VSDVS_FreeMemory(names);
  VSDVS_FreeMemory(ids);
  ASSERT_EQ(VSDVS_GetSwitchUplinkPorts("s", &names, &ids), QEX_OK);
  EXPECT_STREQ(text_in(names, 0), "left");
  EXPECT_STREQ(text_in(ids, 0), "uplink1");
  EXPECT_STREQ(text_in(names, 1), "right");
  EXPECT_STREQ(text_in(ids, 1), "right");
  VSDVS_FreeMemory(names);
  VSDVS_FreeMemory(ids);
}

TEST_F(KeptProperties, AnUplinkPortHasAThirdCall) {
  int number = 0;
  ASSERT_EQ(VSDVS_DvPortIDToPortID("s", "uplink2", &number), QEX_OK);
  auto const id = static_cast<qex_uint32>(number);
  Bytes value{1};
  EXPECT_EQ(
      DVSQEX_UplinkDataSet("s-id", VSPROP_PORT_TX_UPLINK, id, value.data(), 1, POLICY_PROP_TYPE),
      QEX_OK);
  EXPECT_EQ(port(VSPROP_PORT_TX_UPLINK, "uplink2"), value);
  void *data = nullptr;
  int length = 0;
  ASSERT_EQ(DVSQEX_UplinkDataGet("s-id", VSPROP_PORT_TX_UPLINK, id, &data, &length), QEX_OK);
  EXPECT_EQ(taken(data, length), value);
  ASSERT_EQ(VSDVS_DvPortIDToPortID("s", "p", &number), QEX_OK);
  EXPECT_EQ(DVSQEX_UplinkDataGet("s-id", VSPROP_PORT_TX_UPLINK, static_cast<qex_uint32>(number),
                                 &data, &length),
            QEX_NOT_FOUND)
      << "it is no uplink port";
}

}  // namespace
