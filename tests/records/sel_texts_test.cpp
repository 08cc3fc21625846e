#include "records/sel_texts.h"

#include <gmock/gmock.h>

#include "tests/mapping/mapping_fixture.h"

namespace {

using namespace ipmisel;
using ::testing::ElementsAre;

TEST(EventType, NamesDirectionAndClass) {
    const struct {
        std::uint8_t byte;
        const char* text;
    } cases[] = {{0x00, "Assertion, Unknown event type."}, {0x01, "Assertion, Threshold."},
                 {0x81, "Deassertion, Threshold."},        {0x02, "Assertion, Generic."},
                 {0x8C, "Deassertion, Generic."},          {0x0D, "Assertion, Unknown event type."},
                 {0x6E, "Assertion, Unknown event type."}, {0x6F, "Assertion, Sensor-specific."},
                 {0x70, "Assertion, Unknown event type."}};
    for (const auto& c : cases) EXPECT_EQ(EventTypeText(c.byte), c.text) << int{c.byte};
}

TEST(Source, TellsSoftwareFromAddresses) {
    const ipmiseltest::TextFolder folder(
        "535=BIOS. \r\n536=SMI. \n537=System. \n538=OEM. \n539=Remote. \n540=Terminal. \n"
        "541=Reserved. \n543=LUN %d. \n544=Channel %d.\n");
    const tqrhost::PluginContext context(folder.path());
    const struct {
        int id;
        const char* text;
    } software[] = {{0x00, "BIOS. "},    {0x0F, "BIOS. "},     {0x10, "SMI. "},
                    {0x20, "System. "},  {0x3F, "OEM. "},      {0x40, "Remote. "},
                    {0x46, "Remote. "},  {0x47, "Terminal. "}, {0x48, "Reserved. "},
                    {0x7F, "Reserved. "}};
    for (const auto& c : software) {
        EXPECT_EQ(SourceText(context.get(), static_cast<std::uint8_t>(c.id * 2 + 1), 0xF3),
                  std::string(c.text) + "Channel 15.")
            << c.id;
    }
    EXPECT_EQ(SourceText(context.get(), 0x20, 0x2D), "16 (address). LUN 1. Channel 2.");
}

TEST(Source, LeavesOutTextsThatAreNotThereAndCutsLongOnes) {
    const ipmiseltest::TextFolder folder("543=" + std::string(110, 'L') +
                                         "\n544=" + std::string(50, 'C') + "%d\n");
    const tqrhost::PluginContext context(folder.path());
    const ipmiseltest::LogRecorder log;
    EXPECT_EQ(SourceText(context.get(), 0x41, 0x30), std::string(50, 'C') + "3");
    EXPECT_THAT(log.Lines(0),
                ElementsAre("Could not find data_number 537", "Error in obtaining string."));
    EXPECT_EQ(SourceText(context.get(), 0x20, 0x30),
              "16 (address). " + std::string(110, 'L') + "CCC");  // 127 characters
}

TEST(ShutDown, OnlyPartZeroCarriesComment) {
    const struct {
        std::array<std::uint8_t, 5> bytes;
        const char* text;
    } cases[] = {{{0, 'a', 0, 'b', 'c'}, "(Shutdown Event): Comment String Part 0: abc"},
                 {{0, 0, 0, 0, 0}, "(Shutdown Event): Comment String Part 0: "},
                 {{1, 0x04, 0x03, 0x02, 0x01}, "(Shutdown Event): ReasonCode: 16909060"},
                 {{2, 0xFE, 0xFF, 0xFF, 0xFF}, "(Shutdown Event): ReasonCode: -2"}};
    for (const auto& c : cases) EXPECT_EQ(ShutDownText(c.bytes), c.text);
}

}  // namespace
