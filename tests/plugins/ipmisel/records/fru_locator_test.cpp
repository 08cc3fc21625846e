#include "plugins/ipmisel/records/fru_locator.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using ::testing::ElementsAre;

std::vector<std::string> StringsOf(const IPMIFRULocator& locator) {
    std::vector<std::string> strings{"left over"};
    locator.GetFRUDataString(strings);
    return strings;
}

void Put(IPMIFRULocator* locator, int offset, const std::string& bytes) {
    locator->SetFRUData(offset, reinterpret_cast<const unsigned char*>(bytes.data()),
                        static_cast<unsigned>(bytes.size()));
}

TEST(FruLocator, MarkerSelectsTheFixedLayout) {
    IPMIFRULocator locator;
    Put(&locator, 10, std::string("\x01%\x00", 3));
    Put(&locator, 17, "Board serial");
    Put(&locator, 48, "Maker*cut at the star");
    Put(&locator, 81, std::string(31, 'N'));
    Put(&locator, 112, "S1");
    Put(&locator, 144, "Product");
    EXPECT_THAT(StringsOf(locator), ElementsAre("No chassis part number", "Product", "Board serial",
                                                "Maker", std::string(30, 'N'), "S1"));
}

TEST(FruLocator, RunAtTheEndIsKeptWithoutBracketTests) {
    const std::tuple<int, std::string, std::vector<std::string>> cases[] = {
        {3, std::string("ABC\0X\0(12)\0", 11), {"ABC", "(12)"}},
        {3, "A]B[", {}},
        {3, "FOO(", {"FOO("}},
        {3, "FOO)", {}},
        {3, "[1]#Q-7/B", {"[1]", "Q-7/B"}},
        {308, "A)]B", {"A)]B"}},
        // The fixed layout, all of it behind the end.
        {309, std::string("\x01%\x00", 3), {"No chassis part number", "", "", "", "", ""}},
    };
    for (const auto& [at, bytes, strings] : cases) {
        IPMIFRULocator locator;
        Put(&locator, at, bytes);
        EXPECT_EQ(StringsOf(locator), strings) << bytes;
    }
}

TEST(FruLocator, DataOutsideTheBufferIsLeftOut) {
    IPMIFRULocator locator;
    const std::vector<unsigned char> bytes(400, 'A');
    locator.SetFRUData(310, bytes.data(), 400);
    locator.SetFRUData(312, bytes.data(), 1);
    locator.SetFRUData(-1, bytes.data(), 1);
    EXPECT_THAT(StringsOf(locator), ElementsAre("AA"));
}

}  // namespace
