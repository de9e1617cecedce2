// SPDX-License-Identifier: MIT
#include "platform/base/base64.h"

#include <gtest/gtest.h>

#include "platform/base/data.h"

namespace brivo {
namespace {

TEST(Base64Test, KnownAnswers) {
  // RFC 4648, section 10.
  const std::pair<const char*, const char*> vectors[] = {{"", ""},
                                                         {"f", "Zg=="},
                                                         {"fo", "Zm8="},
                                                         {"foo", "Zm9v"},
                                                         {"foob", "Zm9vYg=="},
                                                         {"fooba", "Zm9vYmE="},
                                                         {"foobar", "Zm9vYmFy"}};
  for (const auto& [plain, encoded] : vectors) {
    EXPECT_EQ(encodeBase64(Data::copyOf(plain).bytes()), encoded);
    const auto decoded = decodeBase64(encoded);
    ASSERT_TRUE(decoded);
    EXPECT_EQ(Data(*decoded).text(), plain);
  }
  EXPECT_FALSE(decodeBase64("Zm9*"));
}

}  // namespace
}  // namespace brivo
