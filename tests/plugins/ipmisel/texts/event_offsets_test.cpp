#include "plugins/ipmisel/texts/event_offsets.h"

#include "tests/plugins/ipmisel/texts/mapping_fixture.h"

namespace {

using ipmiseltest::kFifteenBlanks;
using ::testing::ElementsAre;

class SensorOffset : public ipmiseltest::MappingTest {};
class GenericOffset : public ipmiseltest::MappingTest {};
class ThresholdOffset : public ipmiseltest::MappingTest {};

const std::string kIndent = kFifteenBlanks;

TEST_F(ThresholdOffset, AppendsThresholdThenReading) {
    const std::string extension = "\n" + kIndent + "Sensor-specific event extension code 0a. \n";
    const std::tuple<int, int, int, std::string> cases[] = {
        {0x51, 0x40, 0x45,
         "<101>. \n" + kIndent + "Trigger threshold value: 69.00 <730>. \n" + kIndent +
             "Trigger reading: 64.00 <730>."},
        {0x00, 1, 1, "<100>. " + kIndent},
        {0x0B, 1, 1, "<111>. " + kIndent},
        {0x0C, 1, 1, kIndent},
        {0xA0, 0x0A, 4, "<100>.  DIMM_10.\n" + kIndent + "OEM code 0a."},
        {0xA0, 0x0A, 2, "<100>.  \n" + kIndent + "OEM code 0a."},
        {0xF0, 0x0B, 0x0A,
         "<100>. " + extension + kIndent + "Sensor-specific event extension code 0b."},
    };
    for (const auto& [data1, data2, data3, text] : cases)
        EXPECT_EQ(Threshold(data1, data2, data3), text) << data1;
    EXPECT_EQ(log.All().front().second, "IPMIMapping::GetThresholdOffset() function entered.");
    EXPECT_EQ(log.All().back().second, "IPMIMapping::GetThresholdOffset() function completed.");
}

/// A type, its last offset with a numbered text, and that text's number.
struct LastText {
    int type, offset, number;
    std::string text() const { return "<" + std::to_string(number) + ">. "; }
};

TEST_F(GenericOffset, OffsetsEndWithTheirReadingType) {
    constexpr LastText kCases[] = {{0x02, 2, 122}, {0x03, 1, 131}, {0x04, 1, 141}, {0x05, 1, 151},
                                   {0x06, 1, 161}, {0x07, 8, 178}, {0x08, 1, 181}, {0x09, 1, 191},
                                   {0x0A, 8, 208}, {0x0B, 7, 217}, {0x0C, 3, 223}};
    for (const LastText& c : kCases) {
        EXPECT_EQ(Generic(c.type, c.offset), c.text());
        EXPECT_EQ(Generic(c.type, c.offset + 1), "") << c.type;
    }
    EXPECT_EQ(Generic(0x01, 0), "");
    EXPECT_EQ(Generic(0x0D, 0), "");
}

TEST_F(GenericOffset, SeverityAndPreviousStateNestOnce) {
    EXPECT_EQ(Generic(0x03, 0x41, 0x20), "<131>. <525><172>. <526><130>. ");
    EXPECT_EQ(Generic(0x03, 0x41, 0xF0), "<131>. <526><130>. ");
    EXPECT_EQ(Generic(0x03, 0x41, 0x2F), "<131>. <525><172>. ");
    EXPECT_EQ(Generic(0x03, 0x41, 0x9E), "<131>. <525><526>");  // codes that mean nothing
    EXPECT_EQ(Generic(0x03, 0xC1, 0x20), "<131>. ");
}

TEST_F(SensorOffset, OffsetsEndWithTheirSensorType) {
    constexpr LastText kCases[] = {{0x05, 6, 236}, {0x06, 5, 245},  {0x08, 5, 265}, {0x09, 7, 277},
                                   {0x0F, 2, 292}, {0x11, 7, 357},  {0x13, 9, 369}, {0x14, 2, 372},
                                   {0x1D, 4, 384}, {0x1E, 4, 394},  {0x1F, 6, 406}, {0x20, 1, 411},
                                   {0x21, 8, 428}, {0x22, 14, 444}, {0x23, 8, 458}, {0x24, 3, 463},
                                   {0x25, 2, 479}, {0x27, 1, 481},  {0x28, 3, 493}, {0x29, 3, 503},
                                   {0xC1, 9, 865}};
    for (const LastText& c : kCases) {
        EXPECT_EQ(Sensor(c.type, c.offset), c.text());
        EXPECT_EQ(Sensor(c.type, c.offset + 1), "") << c.type;
    }
    for (const int type : {0x00, 0x01, 0x0A, 0x0E, 0x15, 0x17, 0x1C, 0x26, 0x2D, 0xC0}) {
        EXPECT_EQ(Sensor(type, 0), "") << type;
    }
}

TEST_F(SensorOffset, BuiltInTexts) {
    const std::tuple<int, int, const char*> cases[] = {
        {0x07, 9, "<259>. "},
        {0x07, 10, "Processor Automatically Throttled. "},
        {0x07, 11, ""},
        {0x0C, 10, "Critical Overtemperature."},
        {0x0D, 8, "Rebuild/Remap Aborted (was not completed normally)"},
        {0x0D, 9, ""},
        {0x10, 5, "SEL Almost Full. "},
        {0x16, 0, "Cable is connected"},
        {0x1B, 1, "Configuration Error - Incorrect cable connected / Incorrect interconnection"},
        {0x2A, 2, ""},
        {0x2B, 7, "Software or Firmware Change detected with associated Entity was successful"},
        {0x2C, 7, "FRU Communication Lost"},
        {0xD0, 15, "SEL Fullness"},
        {0xD2, 6, "CPU Cores"},
        {0xD2, 7, ""}};
    for (const auto& [sensorType, offset, text] : cases) {
        EXPECT_EQ(Sensor(sensorType, offset), text) << sensorType << " " << offset;
    }
    EXPECT_EQ(log.Lines(0).size(), 0u);
}

TEST_F(SensorOffset, SecondTexts) {
    const std::string extension = "\n" + kIndent + "Sensor-specific event extension code ";
    const std::string all = "Logging has been disabled for all events of ";
    const struct {
        int sensorType, data1, data2, data3;
        std::string text;
    } cases[] = {
        // Memory: the module.
        {0x0C, 0x30, 0, 0x1F, "<280>. <286:31>. " + extension + "1f. \n"},
        {0x0C, 0x3F, 0, 0x1F, "<286:31>. " + extension + "1f. \n"},
        {0x0C, 0x20, 0, 13, "<280>.  DIMM_31.\n"},
        // System firmware: the kind of error, the stage.
        {0x0F, 0xC0, 0x0D, 0, "<290>. <313>. "},
        {0x0F, 0xC0, 0x0E, 0, "<290>. Reserved"},
        {0x0F, 0xC1, 0x0F, 0, "<291>. <335>. "},
        {0x0F, 0xC2, 0x19, 0, "<292>. <329>. "},
        {0x0F, 0x02, 0x19, 0, "<292>. "},
        {0x0F, 0xC3, 0x01, 0, ""},
        // Slot: its type and number.
        {0x21, 0xF0, 0x0C, 3, "<420>. <476>. #3 " + extension + "03. \n"},
        {0x21, 0xCF, 0x0D, 3, ""},
        {0x21, 0xC9, 0x01, 3, "<465>. "},
        // Watchdog 2: interrupt and use.
        {0x23, 0xC8, 0x35, 0, "<458>. <513>. <520>. "},
        {0x23, 0xC8, 0x46, 0, "<458>. "},
        {0x23, 0xC7, 0x11, 0, "<457>. "},
        {0x23, 0x08, 0x11, 0, "<458>. "},
        // Logging disabled: for what. A type outside the list has no name, not one out of another.
        {0x10, 1, 0x6F, 0x03,
         "<347:111:3>. " + kIndent + "Deassertion event. Sensor-specific Type. "},
        {0x10, 1, 0x01, 0x12, "<347:1:2>. " + kIndent + "Assertion event. Threshold Type. "},
        {0x10, 1, 0x0C, 0x31,
         "<347:12:1>. " + kIndent + "Assertion event. " + all + "<662>. <662> - "},
        {0x10, 1, 0x00, 0x20, "<347:0:0>. " + kIndent + "Deassertion event. " + all + "<650>. "},
        {0x10, 1, 0x47, 0x20, "<347:71:0>. " + kIndent + "Deassertion event. " + all},
        {0x10, 0, 0x6F, 0x30, "<346>. "},
        // System event: what. Codes outside do not run into other lists.
        {0x12, 3, 0x52, 0, "<376>. <387>. <417>. "},
        {0x12, 3, 0x63, 0, "<376>. "},
        {0x12, 4, 0xC1, 0, "<377>. Reserved  Alert.  "},
        {0x12, 4, 0x40, 0, "<377>. Reserved  "},
        {0x12, 4, 0x3E, 0,
         "<377>. Diagnostic Interrupt (NMI).  OEM action.  power cycle.  reset.  power off.  "},
        {0x12, 5, 0x81, 0, "<378>. event is second of pair. SDR Timestamp Clock updated."},
        {0x12, 5, 0x00, 0, "<378>. event is first of pair. SEL Timestamp Clock updated."},
        {0x12, 2, 0xFF, 0, "<375>. "},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(Sensor(c.sensorType, c.data1, c.data2, c.data3), c.text)
            << c.sensorType << " " << c.data1 << " " << c.data2;
    }
}

TEST_F(SensorOffset, SeverityAndPreviousState) {
    EXPECT_EQ(Sensor(0x09, 0x40, 0x61), "<270>. <525><176>. <526><271>. ");
    // The severity's label stands even when there is none, other than in generic events.
    EXPECT_EQ(Sensor(0x09, 0x40, 0xFF), "<270>. <525>");
    EXPECT_EQ(Sensor(0x01, 0x40, 0x0F), "<525><170>. ");  // of every type
    EXPECT_EQ(Sensor(0x0C, 0x70, 0xF1, 2), "<280>. <286:2>. <525><526><281>. \n" + kIndent +
                                               "Sensor-specific event extension code 02. \n");
    EXPECT_EQ(Sensor(0x09, 0xA0, 0x61, 1), "<270>. <527>.  DIMM_01.\n");
}

TEST(EventOffsets, FailedFetchLeavesItsPieceOut) {
    const ipmiseltest::LogRecorder log;
    const ipmiseltest::TextFolder folder("526=was \n");
    const NQORTQR20::PluginContext context(folder.path());
    const auto sensor = [&](std::uint8_t type, std::uint8_t data1, std::uint8_t data2) {
        return ipmisel::SensorOffsetText(context.get(), type, {data1, data2, 0}, 0x6F);
    };
    EXPECT_EQ(sensor(0x2A, 0x41, 0x00), "Session Deactivatedwas Session Activated");
    EXPECT_THAT(log.Lines(0),
                ElementsAre("Could not find data_number 525", "Error in obtaining string.",
                            "Could not find data_number 170", "Error in obtaining string."));
    EXPECT_EQ(sensor(0x10, 0x01, 0x02), kIndent + "Deassertion event. ");
}

TEST_F(SensorOffset, AppendsWithinTheBuffer) {
    for (unsigned room = 0; room <= 40; ++room) {
        std::vector<char> out(room);
        if (room > 0) std::fill_n(out.begin(), std::min(room - 1, 3u), 'x');
        mapping.GetSensorOffset(context.get(), 0x12, 0x44, 0xFF, 0xFF, 0x6F, out.data(), room);
        if (room == 0) continue;
        ASSERT_EQ(out.back(), '\0');
        const std::string whole = "xxx<377>. Reserved  Diagnostic Interrupt";
        EXPECT_EQ(std::string(out.data()), whole.substr(0, room - 1)) << room;
    }
}

}  // namespace
