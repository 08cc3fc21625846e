#include "base/sha256.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "base/hex.h"

namespace ipmisel {

std::string DigestOf(const std::string& text) {
    return HexText(Sha256(std::vector<std::uint8_t>(text.begin(), text.end())));
}

// The examples of FIPS 180-2 and its published test vectors; the lengths lie around the ends of a
// block.
TEST(Sha256, AgreesWithThePublishedVectors) {
    EXPECT_EQ(DigestOf(""), "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855");
    EXPECT_EQ(DigestOf("abc"), "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
    EXPECT_EQ(DigestOf("abcdbcdecdefdefgefghfghighijhijkijkljklmklmnlmnomnopnopq"),
              "248d6a61d20638b8e5c026930c3e6039a33ce45964ff2167f6ecedd419db06c1");
    EXPECT_EQ(DigestOf(std::string(1000000, 'a')),
              "cdc76e5c9914fb9281a1c7e284d73e67f1809a48a497200e046d39ccc7112cd0");
}

}  // namespace ipmisel
