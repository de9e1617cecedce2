// SPDX-License-Identifier: MIT
#include "platform/digest/sha256.h"

#include <gtest/gtest.h>

namespace brivo {
namespace {

// FIPS 180-4's examples.
TEST(Sha256Test, KnownDigests) {
  EXPECT_EQ(sha256Of(std::string_view()), "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855");
  EXPECT_EQ(sha256Of("abc"), "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
  EXPECT_EQ(sha256Of("abcdbcdecdefdefgefghfghighijhijkijkljklmklmnlmnomnopnopq"),
            "248d6a61d20638b8e5c026930c3e6039a33ce45964ff2167f6ecedd419db06c1");
}

TEST(Sha256Test, PiecesGiveTheDigestOfTheWhole) {
  const std::string text(1'000'003, 'a');
  Sha256 digest;
  for (std::size_t i = 0; i < text.size(); i += 7'777)
    digest.add(std::as_bytes(std::span(text).subspan(i, std::min<std::size_t>(7'777, text.size() - i))));
  EXPECT_EQ(digest.hexDigest(), sha256Of(text));
}

}  // namespace
}  // namespace brivo
