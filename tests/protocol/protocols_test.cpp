// SPDX-License-Identifier: MIT
#include "protocol/protocols.h"

#include <gtest/gtest.h>

#include <map>

namespace brivo {
namespace {

using zeph::Member;

/// The wire names with their signatures and whether they are served: a contract with clients in other
/// languages.
struct Row {
  const char* in;
  const char* out;
  Member::Kind kind;
  bool served;
};

void expectRows(const zeph::Protocol& protocol, const std::map<std::string, Row>& rows) {
  EXPECT_EQ(protocol.members.size(), rows.size());
  for (const auto& [name, row] : rows) {
    const Member* member = protocol.withDBusName(name);
    ASSERT_TRUE(member) << name;
    EXPECT_STREQ(member->in, row.in) << name;
    EXPECT_STREQ(member->out, row.out) << name;
    EXPECT_EQ(member->kind, row.kind) << name;
    EXPECT_EQ(member->serving == Member::Serving::served, row.served) << name;
  }
}

constexpr auto kMethod = Member::Kind::method;
constexpr auto kSignal = Member::Kind::signal;

TEST(ProtocolsTest, TheManagersMembers) {
  EXPECT_STREQ(deviceManagerProtocol().interface, "org.orvid.OVZEPHDeviceManagerProtocol");
  expectRows(deviceManagerProtocol(), {{"requestDeviceListWithReply", {"", "a{sv}", kMethod, true}},
                                       {"openDevice_withReply", {"s", "a{sv}", kMethod, true}},
                                       {"closeDevice_withReply", {"s", "a{sv}", kMethod, false}},
                                       {"notifyAddedDevice", {"a{sv}", "", kSignal, true}},
                                       {"notifyRemovedDevice", {"a{sv}", "", kSignal, true}}});
}

TEST(ProtocolsTest, TheDevicesMembers) {
  EXPECT_STREQ(korvelProtocol().interface, "org.orvid.KorvelProtocol");
  expectRows(korvelProtocol(),
             {{"requestStartUsingDeviceWithReply", {"", "a{sv}", kMethod, true}},
              {"enumerateContentWithOptions", {"a{sv}", "", kMethod, true}},
              {"registerInterestedEventNotifications", {"as", "", kMethod, true}},
              {"unregisterInterestedEventNotifications", {"as", "", kMethod, true}},
              {"requestMetadataForObjectHandle_options_withReply", {"ta{sv}", "a{sv}", kMethod, true}},
              {"requestThumbnailDataForObjectHandle_options_withReply", {"ta{sv}", "a{sv}", kMethod, true}},
              {"requestDownloadObjectHandle_options_withReply", {"ta{sv}", "a{sv}", kMethod, true}},
              {"requestReadDataFromObjectHandle_options_withReply", {"ta{sv}", "a{sv}", kMethod, true}},
              {"requestDeleteObjectHandle_options_withReply", {"ta{sv}", "a{sv}", kMethod, true}},
              {"openDeviceSessionWithReply", {"", "", kMethod, false}},
              {"sendPTPCommand_andPayload_withReply", {"", "", kMethod, false}},
              {"ptpEventForwarding", {"", "", kMethod, false}},
              {"notifyAddedItems", {"a{sv}", "", kSignal, true}},
              {"postNotification", {"a{sv}", "", kSignal, true}},
              {"notifyContentCatalogPercentCompleted", {"u", "", kSignal, true}},
              {"orvidEventNotification_completion", {"v", "", kSignal, false}},
              {"notifyPtpEvent", {"v", "", kSignal, false}},
              {"notifyDeviceCloseWithUSBLocationID", {"v", "", kSignal, false}}});
}

TEST(ProtocolsTest, EveryArgumentHasAName) {
  for (const zeph::Protocol* protocol : {&deviceManagerProtocol(), &korvelProtocol()}) {
    for (const Member& member : protocol->members) {
      const std::string signature = std::string(member.in) + member.out;
      long types = 0;
      for (std::size_t i = 0; i < signature.size(); ++types)
        i += signature.substr(i, 5) == "a{sv}" ? 5 : signature[i] == 'a' ? 2 : 1;
      EXPECT_EQ(std::ranges::count(member.names, ','), types) << member.selector;
    }
  }
}

TEST(ProtocolsTest, RestrictedSelectorsAdmitTheAllowedClassesOnly) {
  const auto interface =
      restrictedInterface(korvelProtocol(), {{"registerInterestedEventNotifications:", 0}});
  const auto origin = zeph::Interface::Origin::argument;
  EXPECT_TRUE(interface.admits(Array{"x"}, "registerInterestedEventNotifications:", origin));
  EXPECT_FALSE(interface.admits(Value(), "registerInterestedEventNotifications:", origin));
}

}  // namespace
}  // namespace brivo
