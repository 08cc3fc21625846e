#include "ipmi/severity.h"

#include <gtest/gtest.h>

#include <fstream>
#include <string>
#include <string_view>

#include "ipmi/event_offsets.h"

namespace ipmi {

std::string Name(std::optional<Severity> severity) {
    return std::string(severity ? SeverityName(*severity) : "none");
}

TEST(Severity, IsThatOfTheTypeAndOffsetForEachDirection) {
    const struct {
        std::uint8_t eventType;
        std::uint8_t sensorType;
        std::uint8_t offset;
        const char* asserted;
        const char* deasserted;
        Duration duration;
    } cases[] = {
        // Thresholds: the standard's own words, and the way back
        {0x01, 0x02, 0, "warning", "ok", Duration::kState},
        {0x01, 0x02, 1, "ok", "information", Duration::kReturn},
        {0x01, 0x02, 4, "fatal", "ok", Duration::kState},
        {0x01, 0x02, 8, "warning", "information", Duration::kReturn},
        {0x01, 0x02, 11, "fatal", "ok", Duration::kState},
        {0x03, 0x07, 1, "none", "none", Duration::kState},
        {0x04, 0x0D, 1, "warning", "ok", Duration::kState},
        {0x07, 0x08, 2, "critical", "ok", Duration::kState},
        {0x07, 0x08, 7, "none", "none", Duration::kState},
        {0x08, 0x15, 1, "information", "warning", Duration::kState},
        {0x0A, 0x04, 6, "warning", "ok", Duration::kState},
        {0x0B, 0x09, 0, "ok", "warning", Duration::kState},
        {0x0B, 0x09, 5, "critical", "ok", Duration::kState},
        {0x6F, 0x05, 0, "warning", "ok", Duration::kState},
        {0x6F, 0x07, 1, "critical", "ok", Duration::kLatched},
        {0x6F, 0x08, 0, "information", "warning", Duration::kState},
        {0x6F, 0x08, 1, "critical", "ok", Duration::kState},
        {0x6F, 0x0C, 0, "warning", "ok", Duration::kLatched},
        {0x6F, 0x0C, 1, "critical", "ok", Duration::kLatched},
        {0x6F, 0x0D, 1, "critical", "ok", Duration::kState},
        {0x6F, 0x10, 2, "information", "information", Duration::kMomentary},
        {0x6F, 0x11, 5, "warning", "ok", Duration::kMomentary},
        {0x6F, 0x20, 1, "critical", "ok", Duration::kMomentary},
        {0x6F, 0x22, 5, "information", "information", Duration::kState},
        {0x6F, 0x22, 13, "none", "none", Duration::kState},
        {0x6F, 0x23, 0, "warning", "ok", Duration::kMomentary},
        {0x6F, 0x23, 3, "critical", "ok", Duration::kMomentary},
        {0x6F, 0x23, 8, "warning", "ok", Duration::kMomentary},
        {0x6F, 0x25, 1, "none", "none", Duration::kState},
        {0x6F, 0x27, 0, "warning", "ok", Duration::kState},
        {0x6F, 0x27, 1, "ok", "warning", Duration::kState},
        {0x6F, 0x2B, 7, "information", "warning", Duration::kMomentary},
        {0x6F, 0x2C, 7, "critical", "ok", Duration::kState},
        {0x70, 0x07, 1, "none", "none", Duration::kState},
        {0x6F, 0xC1, 1, "none", "none", Duration::kState},
        {0x01, 0x02, 12, "none", "none", Duration::kState},
    };
    for (const auto& c : cases) {
        const EventGrade grade = GradeOf(c.eventType, c.sensorType, c.offset);
        EXPECT_EQ(Name(grade.asserted), c.asserted) << +c.sensorType << " " << +c.offset;
        EXPECT_EQ(Name(grade.deasserted), c.deasserted) << +c.sensorType << " " << +c.offset;
        EXPECT_EQ(grade.duration, c.duration) << +c.sensorType << " " << +c.offset;
    }
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
                    ASSERT_EQ(grade.asserted, std::nullopt) << eventType << " " << sensorType;
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
    EXPECT_EQ(rows, 261u);
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
