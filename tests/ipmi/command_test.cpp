#include "ipmi/command.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <vector>

namespace ipmi {

TEST(IpmiCommand, RequestsStandOnTheWireAsTheirClausesLayThemOut) {
    const struct {
        Command command;
        std::uint8_t netFn;
        std::uint8_t lun;
        std::uint8_t number;
        std::vector<std::uint8_t> data;
    } cases[] = {
        {GetDeviceId(), 0x06, 0, 0x01, {}},
        {GetSelfTestResults(), 0x06, 0, 0x04, {}},
        {GetDeviceGuid(), 0x06, 0, 0x08, {}},
        {GetSystemGuid(), 0x06, 0, 0x37, {}},
        {GetChassisStatus(), 0x00, 0, 0x01, {}},
        {GetPefConfigurationParameters(kPefEventFilter, 3), 0x04, 0, 0x13, {0x06, 0x03, 0x00}},
        {GetSelInfo(), 0x0A, 0, 0x40, {}},
        {GetSelAllocationInfo(), 0x0A, 0, 0x41, {}},
        {GetSelEntry(0x1234), 0x0A, 0, 0x43, {0x00, 0x00, 0x34, 0x12, 0x00, 0xFF}},
        {GetSelEntry(0x1234, 4, 8, 0x5678), 0x0A, 0, 0x43, {0x78, 0x56, 0x34, 0x12, 0x04, 0x08}},
        {GetSelTime(), 0x0A, 0, 0x48, {}},
        {GetSelTimeUtcOffset(), 0x0A, 0, 0x5C, {}},
        {GetSdrRepositoryInfo(), 0x0A, 0, 0x20, {}},
        {ReserveSdrRepository(), 0x0A, 0, 0x22, {}},
        {GetSdr(0x1234, 5, 16, 0x5678), 0x0A, 0, 0x23, {0x78, 0x56, 0x34, 0x12, 0x05, 0x10}},
        {GetSensorReading(0x30, 2), 0x04, 2, 0x2D, {0x30}},
        {GetSensorThresholds(0x30, 1), 0x04, 1, 0x27, {0x30}},
        {GetSensorHysteresis(0x30, 1), 0x04, 1, 0x25, {0x30, 0xFF}},
        {GetSensorEventStatus(0x30, 3), 0x04, 3, 0x2B, {0x30}},
        {GetSensorReadingFactors(0x30, 0x59, 1), 0x04, 1, 0x23, {0x30, 0x59}},
        {GetFruInventoryAreaInfo(7), 0x0A, 0, 0x10, {0x07}},
        {ReadFruData(7, 0x0102, 16), 0x0A, 0, 0x11, {0x07, 0x02, 0x01, 0x10}},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(c.command, (Command{c.netFn, c.lun, c.number, c.data}))
            << CommandName(c.command.code());
        EXPECT_FALSE(CommandName(c.command.code()).empty());
    }
}

TEST(CompletionCode, HasTheWordsOfItsCommandElseTheGenericOnes) {
    const struct {
        CommandCode command;
        std::uint8_t code;
        std::string_view text;
    } cases[] = {
        {kGetSdr, 0x00, "completed"},
        {kGetSdr, 0xC0, "node busy"},
        {kGetSdr, 0xC5, "reservation canceled or invalid"},
        {kGetSelEntry, 0xCB, "requested sensor, data, or record not present"},
        {kGetSdr, 0xD6, "command subfunction disabled or unavailable"},
        {kGetSdr, 0xD7, "reserved code"},
        {kGetSdr, 0xFF, "unspecified error"},
        {kGetSelEntry, 0x81, "SEL erase in progress"},
        {kReadFruData, 0x81, "FRU device busy"},
        {kGetSdr, 0x81, "command-specific code"},
        {kGetSdr, 0xBE, "command-specific code"},
        {kGetSdr, 0xBF, "reserved code"},
        {kGetSdr, 0x01, "device-specific code"},
        {kGetSdr, 0x7E, "device-specific code"},
        {kGetSdr, 0x7F, "reserved code"},
    };
    for (const auto& c : cases) EXPECT_EQ(CompletionCodeText(c.command, c.code), c.text) << +c.code;
}

TEST(RecordRead, IsWhatTheRequestsOfEventsAndSensorRecordsSay) {
    for (const Command& command :
         {GetSelEntry(0x1234, 5, 16, 0x5678), GetSdr(0x1234, 5, 16, 0x5678)}) {
        const auto read = RecordRead::Parse(command.data);
        ASSERT_TRUE(read);
        EXPECT_EQ(read->reservation, 0x5678);
        EXPECT_EQ(read->recordId, 0x1234);
        EXPECT_EQ(read->offset, 5);
        EXPECT_EQ(read->count, 16);
        EXPECT_FALSE(read->IsOfFirst() || read->IsOfWhole());
        for (std::size_t length = 0; length <= 7; ++length) {
            auto data = command.data;
            data.resize(length);
            EXPECT_EQ(RecordRead::Parse(data).has_value(), length == 6) << length;
        }
    }
    const auto first = RecordRead::Parse(GetSdr(kFirstRecordId).data);
    EXPECT_TRUE(first->IsOfFirst() && first->IsOfWhole());
    const std::vector<std::uint8_t> answer{0x00, 0x02, 0x00, 0x01};
    EXPECT_EQ(RecordIn(answer).size(), 1u);
    for (std::size_t length = 0; length <= kRecordAt; ++length) {
        EXPECT_TRUE(RecordIn(std::span(answer).first(length)).empty()) << length;
    }
}

TEST(CommandName, IsEmptyForACommandThatIsNotListed) {
    EXPECT_EQ(CommandName({kNetFnApplication, 0x43}), "");
    EXPECT_EQ(CommandName(kGetSelEntry), "Get SEL Entry");
}

}  // namespace ipmi
