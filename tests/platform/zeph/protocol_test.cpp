// SPDX-License-Identifier: MIT
#include "platform/zeph/protocol.h"

#include <gtest/gtest.h>

#include "zeph/echo_service.h"

namespace brivo::zeph {
namespace {

TEST(ProtocolTest, AMemberIsItsSelectorWithoutTheLastColonAndInnerColonsAsUnderscores) {
  EXPECT_EQ((Member{"openDevice:withReply:", Member::Kind::method, "", "", ""}.dbusName()),
            "openDevice_withReply");
  EXPECT_EQ((Member{"requestDeviceListWithReply:", Member::Kind::method, "", "", ""}.dbusName()),
            "requestDeviceListWithReply");
  EXPECT_EQ((Member{"hold", Member::Kind::method, "", "", ""}.dbusName()), "hold");
}

TEST(ProtocolTest, MembersAreFoundByEitherName) {
  for (const Member& member : kEchoMembers) {
    EXPECT_EQ(kEchoProtocol.withSelector(member.selector), &member);
    EXPECT_EQ(kEchoProtocol.withDBusName(member.dbusName()), &member);
  }
  EXPECT_EQ(kEchoProtocol.withSelector("echo"), nullptr);
  EXPECT_EQ(kEchoProtocol.withDBusName("echo:withReply"), nullptr);
}

TEST(InterfaceTest, ARestrictedArgumentAdmitsOnlyItsClassesAllTheWayDown) {
  Interface interface(kEchoProtocol);
  interface.setClasses({Value::Class::string, Value::Class::array},
                       "echo:withReply:", Interface::Origin::argument);
  const auto admits = [&](const Value& value, Interface::Origin origin) {
    return interface.admits(value, "echo:withReply:", origin);
  };
  EXPECT_TRUE(admits(Array{"a", Array{"b"}}, Interface::Origin::argument));
  EXPECT_FALSE(admits(Array{"a", Array{1}}, Interface::Origin::argument));
  EXPECT_FALSE(admits(Dictionary{}, Interface::Origin::argument));
  EXPECT_TRUE(admits(Dictionary{}, Interface::Origin::reply)) << "the reply is not restricted";
  EXPECT_TRUE(interface.admits(Dictionary{}, "event:", Interface::Origin::argument));
}

}  // namespace
}  // namespace brivo::zeph
