// SPDX-License-Identifier: MIT
#include "platform/zeph/address.h"

#include <gtest/gtest.h>

namespace brivo::zeph {
namespace {

TEST(AddressTest, APathGoesThereAndBackByteForByte) {
  for (const std::string path : {"/run/user/1000/brivod/manager", "/tmp/a b,c;d%e=f", "/\xC3\xA4\xFF"}) {
    const Endpoint endpoint = endpointForPath(path);
    EXPECT_EQ(pathOfEndpoint(endpoint), path);
  }
  EXPECT_EQ(endpointForPath("/run/x").address, "unix:path=/run/x");
  EXPECT_EQ(endpointForPath("/a b").address, "unix:path=/a%20b");
}

TEST(AddressTest, TheFirstUnixPathOfAListIsTaken) {
  EXPECT_EQ(pathOfEndpoint({"tcp:host=localhost,port=1;unix:guid=00,path=/x;unix:path=/y"}), "/x");
}

TEST(AddressTest, AnythingElseHasNoPath) {
  for (const char* bad :
       {"", "unix", "unix:", "unix:abstract=/x", "tcp:path=/x", "unix:path=%4", "unix:path=%zz"}) {
    EXPECT_EQ(pathOfEndpoint({bad}), std::nullopt) << bad;
  }
}

}  // namespace
}  // namespace brivo::zeph
