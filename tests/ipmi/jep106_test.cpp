#include "ipmi/jep106.h"

#include <gtest/gtest.h>

#include <vector>

namespace {

using namespace ipmi;
using Bytes = std::vector<std::uint8_t>;

TEST(Jep106, NamesTheManufacturerOfBankAndCode) {
    EXPECT_EQ(ManufacturerOfBank(0x80, 0x01), "AMD");
    EXPECT_EQ(ManufacturerOfBank(0x01, 0x01), "Cirrus Logic");
    EXPECT_EQ(ManufacturerOfBank(0x06, 0x82), "Mavrix Technology, Inc");
    EXPECT_EQ(ManufacturerAfterContinuations(Bytes{0xFE}), "Numonyx Corporation");
    EXPECT_EQ(ManufacturerAfterContinuations(Bytes{0x7F, 0x01, 0x7F}), "Cirrus Logic");
}

TEST(Jep106, CodesOutsideTheTableHaveNoName) {
    for (const auto& [bank, code] : {std::pair{0x07, 0x01}, {0x86, 0xFE}, {0, 0x7F}, {0, 0x80}}) {
        EXPECT_EQ(
            ManufacturerOfBank(static_cast<std::uint8_t>(bank), static_cast<std::uint8_t>(code)),
            "")
            << bank << " " << code;
    }
    for (const Bytes& code : {Bytes{}, Bytes{0x7F}, Bytes{0xFF}, Bytes(8, 0x7F),
                              Bytes{0x7F, 0x7F, 0x7F, 0x7F, 0x7F, 0x7F, 0x7F, 0x01}}) {
        EXPECT_EQ(ManufacturerAfterContinuations(code), "") << code.size();
    }
}

}  // namespace
