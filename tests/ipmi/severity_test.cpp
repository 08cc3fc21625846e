#include "ipmi/severity.h"

#include <gtest/gtest.h>

#include <fstream>
#include <string>
#include <string_view>

#include "ipmi/event_offsets.h"
#include "ipmi/event_types.h"

namespace ipmi {

std::string Name(std::optional<Severity> severity) {
    return std::string(severity ? SeverityName(*severity) : "none");
}

TEST(Severity, OfAFaultIsOkWhenItIsDeassertedAndThereIsNoneWithoutWords) {
    for (int eventType = 0; eventType < 0x80; ++eventType) {
        for (int sensorType = 0; sensorType < 0x100; ++sensorType) {
            for (int offset = 0; offset < 16; ++offset) {
                const auto type = static_cast<std::uint8_t>(eventType);
                const auto sensor = static_cast<std::uint8_t>(sensorType);
                const auto at = static_cast<std::uint8_t>(offset);
                const EventGrade grade = GradeOf(type, sensor, at);
                if (IsFault(grade.asserted) && grade.duration != Duration::kReturn) {
                    ASSERT_EQ(grade.deasserted, Severity::kOk) << eventType << " " << sensorType;
                }
                if (EventOffsetText(type, sensor, at).empty()) {
                    ASSERT_FALSE(grade.asserted || grade.deasserted) << eventType << sensorType;
                }
            }
        }
    }
}

// Every row of docs/severities.md is what the table says, and every offset that has words has its
// row.
TEST(Severity, IsThatOfItsPage) {
    std::ifstream page(IPMISEL_DOCS "/severities.md");
    ASSERT_TRUE(page);
    const auto hexadecimal = [](const std::string& line, const char* before) {
        const std::size_t at = line.find(before);
        if (at == std::string::npos) return std::uint8_t{0};
        return static_cast<std::uint8_t>(
            std::stoul(line.substr(at + std::string_view(before).size(), 2), nullptr, 16));
    };
    const char* const durations[] = {"state", "latched", "momentary", "return"};
    std::uint8_t eventType = 0;
    std::uint8_t sensorType = 0;
    unsigned rows = 0;
    for (std::string line; std::getline(page, line);) {
        if (line.starts_with("## ")) {
            eventType = hexadecimal(line, "event type ");
            sensorType = hexadecimal(line, "sensor type ");
        }
        if (!line.starts_with("| ") || line[2] < '0' || line[2] > '9') continue;
        const auto offset = static_cast<std::uint8_t>(std::stoul(line.substr(2)));
        const EventGrade grade = GradeOf(eventType, sensorType, offset);
        const std::string row = "| " + std::to_string(offset) + " | " +
                                std::string(EventOffsetText(eventType, sensorType, offset)) +
                                " | " + Name(grade.asserted) + " | " + Name(grade.deasserted) +
                                " | " + durations[static_cast<int>(grade.duration)] + " | ";
        EXPECT_TRUE(line.starts_with(row)) << row;
        ++rows;
    }
    unsigned offsetsWithWords = 0;
    for (unsigned type = 0; type < 0x80 * 0x100; ++type) {
        const auto event = static_cast<std::uint8_t>(type >> 8);
        const auto sensor = static_cast<std::uint8_t>(type);
        if (event != kSensorSpecificEvents && sensor != 0) continue;  // the same for every sensor
        for (std::uint8_t offset = 0; offset < 16; ++offset) {
            offsetsWithWords += EventOffsetText(event, sensor, offset).empty() ? 0 : 1;
        }
    }
    EXPECT_EQ(rows, offsetsWithWords);
}

TEST(Severity, HasANameThatReadsBack) {
    for (const char* name : {"information", "ok", "warning", "critical", "fatal"}) {
        EXPECT_EQ(Name(ParseSeverity(name)), name);
    }
    EXPECT_EQ(ParseSeverity("Warning"), std::nullopt);
    EXPECT_EQ(ParseSeverity(""), std::nullopt);
}

TEST(Exclusion, IsOfStatesThatCannotHoldTogether) {
    const struct {
        std::uint8_t eventType;
        std::uint8_t sensorType;
        std::uint8_t asserted;
        std::uint8_t earlier;
        bool excludes;
    } cases[] = {
        {0x01, 0x01, 1, 0, true},  {0x01, 0x01, 1, 4, true},  {0x01, 0x01, 3, 0, false},
        {0x01, 0x01, 3, 4, true},  {0x01, 0x01, 6, 11, true}, {0x01, 0x01, 7, 9, false},
        {0x01, 0x01, 8, 7, false}, {0x04, 0x0D, 0, 1, true},  {0x07, 0x08, 0, 3, true},
        {0x07, 0x08, 2, 1, true},  {0x07, 0x08, 8, 1, false}, {0x07, 0x08, 2, 2, false},
        {0x08, 0x15, 1, 0, true},  {0x0A, 0x04, 0, 6, true},  {0x0B, 0x08, 0, 5, true},
        {0x0B, 0x08, 1, 5, false}, {0x0B, 0x08, 3, 1, false}, {0x0B, 0x08, 3, 5, true},
        {0x0B, 0x08, 4, 5, true},  {0x0B, 0x08, 6, 1, true},  {0x6F, 0x08, 0, 1, false},
        {0x6F, 0x08, 5, 3, true},  {0x6F, 0x22, 0, 5, true},  {0x6F, 0x22, 14, 0, false},
        {0x6F, 0x25, 0, 1, true},  {0x6F, 0x25, 0, 2, false}, {0x6F, 0x27, 1, 0, true},
        {0x6F, 0x2C, 4, 7, true},  {0x6F, 0x0C, 6, 0, false}, {0x70, 0x08, 0, 1, false},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(Excludes(c.eventType, c.sensorType, c.asserted, c.earlier), c.excludes)
            << +c.eventType << " " << +c.sensorType << " " << +c.asserted << " " << +c.earlier;
    }
}

TEST(Presence, IsToldByTheOffsetsThatSaySo) {
    EXPECT_EQ(PresenceOf(0x08, 0x15, 0), Presence::kAbsent);
    EXPECT_EQ(PresenceOf(0x08, 0x15, 1), Presence::kPresent);
    EXPECT_EQ(PresenceOf(0x6F, 0x0D, 0), Presence::kPresent);
    EXPECT_EQ(PresenceOf(0x6F, 0x25, 1), Presence::kAbsent);
    EXPECT_EQ(PresenceOf(0x6F, 0x0D, 1), std::nullopt);
    EXPECT_EQ(PresenceOf(0x0B, 0x0D, 0), std::nullopt);
}

}  // namespace ipmi
