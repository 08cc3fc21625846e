#include "ipmi/pef.h"

#include <gtest/gtest.h>

#include <vector>

namespace ipmi {
namespace {

using Bytes = std::vector<std::uint8_t>;

// Filter 3: temperature sensor 30h of the BMC going over an upper critical limit is critical.
const Bytes kFilter{0x03, 0x80, 0x01, 0x02, 0x10, 0x20, 0x00, 0x01, 0x30, 0x01, 0x00,
                    0x02, 0x00, 0x00, 0x00, 0xF0, 0xF0, 0x50, 0x0F, 0x03, 0x02};
const FilteredEvent kEvent{{0x20, 0x00}, 0x01, 0x30, 0x01, {0x59, 0x5A, 0x06}};

TEST(EventFilter, FieldsAreWhereTheStandardPutsThem) {
    const auto filter = EventFilter::Parse(kFilter).value();
    EXPECT_EQ(filter.number, 3);
    EXPECT_TRUE(filter.enabled);
    EXPECT_EQ(filter.actions, 1);
    EXPECT_EQ(filter.alertPolicy, 2);
    EXPECT_EQ(filter.severity, PefSeverity::kCritical);
    EXPECT_EQ(filter.offsets, 0x0200);
    for (std::size_t length = 0; length < kFilter.size(); ++length) {
        EXPECT_FALSE(EventFilter::Parse(std::span(kFilter).first(length)).has_value());
    }
}

TEST(EventFilter, EveryFieldMustMatchOrBeAny) {
    const auto matches = [](std::size_t at, std::uint8_t value) {
        Bytes bytes = kFilter;
        bytes[at] = value;
        return EventFilter::Parse(bytes)->Matches(kEvent);
    };
    EXPECT_TRUE(matches(0, 0x83));   // a reserved bit of the number
    EXPECT_FALSE(matches(1, 0x60));  // not enabled
    for (const std::size_t at : {5, 6, 7, 8, 9}) {
        EXPECT_FALSE(matches(at, 0x77)) << at;
        EXPECT_TRUE(matches(at, 0xFF)) << at;
    }
    EXPECT_FALSE(matches(9, 0x81));   // the other direction
    EXPECT_FALSE(matches(11, 0x01));  // offset 8, not 9
    EXPECT_FALSE(matches(17, 0x40));  // event data 2
    EXPECT_FALSE(matches(20, 0x01));  // event data 3
}

TEST(EventDataComparison, ExactBitsAndOneOfTheOthers) {
    const struct {
        EventDataComparison comparison;
        std::uint8_t byte;
        bool matches;
    } cases[] = {
        {{0x00, 0x00, 0x00}, 0xA5, true},  // nothing is looked at
        {{0xFF, 0xFF, 0xA5}, 0xA5, true},  // all exact
        {{0xFF, 0xFF, 0xA5}, 0xA4, false},
        {{0x0F, 0xFF, 0x05}, 0xA5, true},   // the high nibble is not looked at
        {{0x0F, 0x0C, 0x07}, 0x06, true},   // 01 exactly, and one of 11
        {{0x0F, 0x0C, 0x07}, 0x04, false},  // none of 11
        {{0x0F, 0x0C, 0x07}, 0x0B, false},  // not 01
        {{0x03, 0x00, 0x00}, 0x02, true},   // one bit is 0
        {{0x03, 0x00, 0x00}, 0x03, false},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(c.comparison.Matches(c.byte), c.matches)
            << int{c.comparison.compare2} << " " << int{c.byte};
    }
}

TEST(PlatformSeverity, TheFirstFilterThatMatchesDecides) {
    const auto with = [](std::uint8_t enabled, std::uint8_t severity) {
        Bytes bytes = kFilter;
        bytes[1] = enabled;
        bytes[4] = severity;
        return EventFilter::Parse(bytes).value();
    };
    const std::vector<EventFilter> filters{with(0x00, 0x20), with(0x80, 0x08), with(0x80, 0x10)};
    EXPECT_EQ(PlatformSeverity(filters, kEvent), PefSeverity::kNonCritical);
    EXPECT_EQ(PlatformSeverity({}, kEvent), std::nullopt);
    for (const std::uint8_t open : {0x00, 0x01, 0x03}) {
        const std::vector<EventFilter> unspecified{with(0x80, open), with(0x80, 0x10)};
        EXPECT_EQ(PlatformSeverity(unspecified, kEvent), std::nullopt) << int{open};
    }
}

}  // namespace
}  // namespace ipmi
