#include "ipmi/sdr_record.h"

#include <gmock/gmock.h>

#include "base/bytes.h"

namespace ipmi {
namespace {

using ::testing::ElementsAre;

using Bytes = std::vector<std::uint8_t>;

Bytes Hex(const char* text) {
    const auto values = ipmisel::ScanHexRow(text, 300);
    return Bytes(values->begin(), values->end());
}

SdrRecord Parse(const Bytes& bytes) { return SdrRecord::Parse(bytes).value(); }

template <typename T>
T Body(const Bytes& bytes) {
    const SdrRecord record = Parse(bytes);
    EXPECT_TRUE(record.whole);
    return std::get<T>(record.body);
}

// A processor's temperature. Neighbouring fields differ.
const Bytes kFull =
    Hex("34 12 51 01 32  20 31 07  03 86 7f e9 01 01  95 0a 96 7a 3f 38  80 01 02"
        " 00 02 01 03 04 05 f0  05 59 5a 0b fe 80  64 5f 5a 05 0a 0f  02 03 00 00 00"
        " c7 43 50 55 20 54 6d 70");
// Two fans that share a record.
const Bytes kCompact =
    Hex("02 00 51 02 1e  20 00 40  1d 01 7f 40 04 08  01 00 02 00 03 00  c0 00 00"
        " 02 83  00 00 00 00 00 00 c3 46 61 6e");
const Bytes kEventOnly = Hex("03 00 51 03 0f  41 02 50  22 01 0f 6f  13 18  00 00 c3 53 4d 49");

// What a sensor's instance tells is seen there.
TEST(SdrRecord, AFullRecordHasItsFieldsWhereTheStandardPutsThem) {
    const auto sensor = Body<Sensor>(kFull);
    EXPECT_EQ(sensor.recordId, 0x1234);
    EXPECT_EQ(sensor.key, (SensorKey{0x20, 1, 7}));
    EXPECT_EQ(sensor.channel, 3);
    EXPECT_EQ(sensor.entity, (Entity{3, 6}));
    EXPECT_TRUE(sensor.entityIsLogical);
    EXPECT_TRUE(sensor.ignoredWithoutEntity);
    EXPECT_EQ(sensor.hysteresisAccess, LimitAccess::kSettable);
    EXPECT_EQ(sensor.thresholdAccess, LimitAccess::kSettable);
    EXPECT_EQ(sensor.assertionMask, 0x0A95);
    EXPECT_EQ(sensor.deassertionMask, 0x7A96);
    EXPECT_EQ(sensor.readingMask, 0x383F);
    const AnalogSensor& analog = *sensor.analog;
    EXPECT_EQ(analog.conversion.format, NumberFormat::kTwosComplement);
    EXPECT_EQ(analog.conversion.Value(0xFE), -0.1);  // (2 * -2 + 3) * 10^-1
    EXPECT_THAT(analog.thresholds.raw, ElementsAre(0x0F, 0x0A, 0x05, 0x5A, 0x5F, 0x64));
}

TEST(SdrRecord, OnlyFixedThresholdsAreTakenFromTheRecord) {
    Bytes bytes = kFull;
    EXPECT_EQ(Body<Sensor>(bytes).FixedThresholds().readable, 0);
    bytes[11] |= 0x0C;
    EXPECT_EQ(Body<Sensor>(bytes).FixedThresholds().readable, 0x3F);
}

TEST(SdrRecord, WhatHasANumericReading) {
    const struct {
        std::uint8_t eventType, units1, base;
        bool analog;
    } cases[] = {{0x01, 0x00, 0, true},
                 {0x01, 0xC0, 1, false},
                 {0x6F, 0x00, 0, false},  // many discrete sensors claim a format
                 {0x6F, 0x00, 6, true},   // but not one with a unit
                 {0x03, 0x01, 0, true}};
    for (const auto& c : cases) {
        Bytes bytes = kFull;
        bytes[13] = c.eventType;
        bytes[20] = c.units1;
        bytes[21] = c.base;
        EXPECT_EQ(Body<Sensor>(bytes).IsAnalog(), c.analog) << int{c.eventType} << int{c.units1};
    }
}

TEST(SdrRecord, ASharedRecordStandsForEachOfItsSensors) {
    const auto sensors = Parse(kCompact).Sensors();
    ASSERT_EQ(sensors.size(), 2u);
    EXPECT_EQ(sensors[0].name, "Fan 3");
    EXPECT_EQ(sensors[1].name, "Fan 4");
    EXPECT_EQ(sensors[1].key, (SensorKey{0x20, 0, 0x41}));
    EXPECT_EQ(sensors[0].entity, (Entity{0x1D, 1}));
    EXPECT_EQ(sensors[1].entity, (Entity{0x1D, 2}));
    EXPECT_FALSE(sensors[0].IsAnalog());

    Bytes bytes = kCompact;
    bytes[23] = 0x13;
    bytes[24] = 0x1A;  // letters from "AA", one entity for all
    bytes[7] = 0xFE;
    const auto letters = Parse(bytes).Sensors();
    ASSERT_EQ(letters.size(), 3u);
    EXPECT_EQ(letters[0].name, "Fan AA");
    EXPECT_EQ(letters[2].name, "Fan AC");
    EXPECT_EQ(letters[2].entity, (Entity{0x1D, 1}));
    EXPECT_EQ(letters[2].key.number, 0x00);  // numbers go round
    for (const std::uint8_t alone : {0x10, 0x11}) {
        bytes[23] = alone;
        EXPECT_EQ(Parse(bytes).Sensors().at(0).name, "Fan") << int{alone};
        EXPECT_EQ(Parse(bytes).Sensors().size(), 1u) << int{alone};
    }
    EXPECT_EQ(InstanceModifier(true, 25), "Z");
    EXPECT_EQ(InstanceModifier(true, 127), "DX");
    EXPECT_EQ(InstanceModifier(false, 127), "127");
}

TEST(SdrRecord, AnEventOnlyRecordIsShorterAndSharedToo) {
    const auto sensors = Parse(kEventOnly).Sensors();
    ASSERT_EQ(sensors.size(), 3u);
    EXPECT_EQ(sensors[0].name, "SMI Y");
    EXPECT_EQ(sensors[2].name, "SMI AA");
    EXPECT_EQ(sensors[0].key, (SensorKey{0x41, 2, 0x50}));
    EXPECT_EQ(sensors[0].entity, (Entity{0x22, 1}));
    EXPECT_EQ(sensors[0].sensorType, 0x0F);
    EXPECT_EQ(sensors[0].eventType, 0x6F);
    EXPECT_EQ(sensors[0].units.Format(), NumberFormat::kNone);
}

TEST(SdrRecord, AssociationsListTheirMembersOrGiveRanges) {
    auto list = Body<EntityAssociation>(Hex("04 00 51 08 0b  17 01 60  0a 01 0a 02 1d 81 00 00"));
    EXPECT_EQ(list.container, (Entity{0x17, 1}));
    EXPECT_TRUE(!list.isRange && list.isLinked);
    EXPECT_EQ(list.members.size(), 3u);
    EXPECT_TRUE(list.Contains({0x0A, 2}));
    EXPECT_TRUE(list.Contains({0x1D, 1}));
    EXPECT_FALSE(list.Contains({0x0A, 3}));

    const auto range =
        Body<EntityAssociation>(Hex("04 00 51 08 0b  17 01 80  0a 02 0a 04 1d 01 1d 01"));
    EXPECT_TRUE(range.isRange && !range.isLinked);
    EXPECT_FALSE(range.Contains({0x0A, 1}));
    EXPECT_TRUE(range.Contains({0x0A, 3}));
    EXPECT_FALSE(range.Contains({0x0A, 5}));
    EXPECT_TRUE(range.Contains({0x1D, 1}));

    const auto relative = Body<EntityAssociation>(Hex(
        "05 00 51 09 1b  17 61 82 30 00  84 40 0a 62  86 50 0a 63 00 00 00 00 00 00 00 00 00 00 "
        "00 00 00 00"));
    EXPECT_EQ(relative.container, (Entity{0x17, 0x61}));
    EXPECT_EQ(relative.containerAddress, 0x82);
    EXPECT_EQ(relative.containerChannel, 3);
    EXPECT_THAT(relative.members, ElementsAre(EntityAssociation::Member{{0x0A, 0x62}, 0x84, 4},
                                              EntityAssociation::Member{{0x0A, 0x63}, 0x86, 5}));
    EXPECT_TRUE(relative.container.IsDeviceRelative());
    EXPECT_FALSE((Entity{0x17, 0x5F}.IsDeviceRelative()));
}

TEST(SdrRecord, LocatorsAndTheOthers) {
    const auto fru =
        Body<FruLocator>(Hex("06 00 51 11 0e  21 05 9a 30 00 10 02 0a 81 00 c3 50 53 31"));
    EXPECT_EQ(fru.accessAddress, 0x20);
    EXPECT_EQ(fru.deviceId, 5);
    EXPECT_TRUE(fru.isLogical);
    EXPECT_EQ(fru.lun, 3);
    EXPECT_EQ(fru.bus, 2);
    EXPECT_EQ(fru.channel, 3);
    EXPECT_EQ(fru.deviceType, 0x10);
    EXPECT_EQ(fru.deviceTypeModifier, 2);
    EXPECT_EQ(fru.entity, (Entity{0x0A, 1}));
    EXPECT_EQ(fru.name, "PS1");

    const auto generic =
        Body<GenericLocator>(Hex("07 00 51 10 0e  20 a1 6a 01 00 08 03 07 02 00 c3 45 45 50"));
    EXPECT_EQ(generic.slaveAddress, 0xA0);
    EXPECT_EQ(generic.channel, 0x0B);
    EXPECT_EQ(generic.lun, 1);
    EXPECT_EQ(generic.bus, 2);
    EXPECT_EQ(generic.deviceType, 8);
    EXPECT_EQ(generic.entity, (Entity{7, 2}));
    EXPECT_EQ(generic.name, "EEP");

    const auto controller =
        Body<ControllerLocator>(Hex("08 00 51 12 0e  82 17 03 29 00 00 00 2e 01 00 c3 48 53 43"));
    EXPECT_EQ(controller.slaveAddress, 0x82);
    EXPECT_EQ(controller.channel, 7);
    EXPECT_EQ(controller.capabilities, 0x29);
    EXPECT_EQ(controller.entity, (Entity{0x2E, 1}));
    EXPECT_EQ(controller.name, "HSC");

    const auto confirmed =
        Body<ControllerConfirmation>(Hex("09 00 51 13 1b  20 21 12 02 15 51 57 01 00 34 12"
                                         " 00 01 02 03 04 05 06 07 08 09 0a 0b 0c 0d 0e 0f"));
    EXPECT_EQ(confirmed.manufacturerId, 0x157u);
    EXPECT_EQ(confirmed.productId, 0x1234);
    EXPECT_EQ(confirmed.channel, 1);
    EXPECT_EQ(confirmed.deviceRevision, 2);
    EXPECT_EQ(confirmed.guid[15], 0x0F);

    const auto channel =
        Body<MessageChannel>(Hex("0a 00 51 14 0b  11 24 00 00 00 00 00 1c ff 01 00"));
    EXPECT_EQ(channel.channels[7], 0x1C);
    EXPECT_EQ(channel.eventInterrupt, 1);

    const auto oem = Body<OemSdr>(Hex("0b 00 51 c0 05  57 01 02 aa bb"));
    EXPECT_EQ(oem.manufacturerId, 0x20157u);
    EXPECT_THAT(oem.data, ElementsAre(0xAA, 0xBB));

    const SdrRecord unknown = Parse(Hex("0c 00 51 0a 01 99"));
    EXPECT_TRUE(unknown.whole && unknown.body.index() == 0);
}

// Whatever is cut off, what comes before it is as it was, and the record says that it is not whole.
TEST(SdrRecord, ARecordCutAtAnyLengthKeepsWhatIsThere) {
    for (const Bytes& whole : {kFull, kCompact, kEventOnly}) {
        const auto all = Parse(whole).Sensors().front();
        for (std::size_t length = 0; length < whole.size(); ++length) {
            Bytes cut(whole.begin(), whole.begin() + static_cast<std::ptrdiff_t>(length));
            const auto record = SdrRecord::Parse(cut);
            ASSERT_EQ(record.has_value(), length >= kSdrHeaderLength) << length;
            if (!record) continue;
            EXPECT_FALSE(record->whole) << length;
            // The same by a length that the record claims.
            cut[4] = static_cast<std::uint8_t>(length - kSdrHeaderLength);
            cut.resize(whole.size(), 0xEE);
            EXPECT_FALSE(SdrRecord::Parse(cut)->whole) << length;
            const auto sensors = record->Sensors();
            ASSERT_EQ(SdrRecord::Parse(cut)->Sensors().size(), sensors.size()) << length;
            ASSERT_EQ(sensors.empty(), length < (whole == kEventOnly ? 12u : 14u)) << length;
            if (sensors.empty()) continue;
            EXPECT_EQ(sensors[0].key, all.key);
            EXPECT_EQ(sensors[0].eventType, all.eventType);
            if (length < 23) {
                EXPECT_EQ(sensors[0].units.Format(), NumberFormat::kNone) << length;
            }
            EXPECT_EQ(sensors[0].analog.has_value(), whole == kFull && length >= 30) << length;
            if (sensors[0].analog) {
                EXPECT_EQ(sensors[0].analog->nominal.has_value(), length >= 32) << length;
                EXPECT_EQ(sensors[0].analog->thresholds.readable, length >= 42 ? 0x3F : 0);
                EXPECT_EQ(sensors[0].analog->negativeHysteresis.has_value(), length >= 44);
            }
        }
    }
    EXPECT_EQ(Parse(Bytes(kFull.begin(), kFull.end() - 4)).Sensors().at(0).name, "CPU");
}

}  // namespace
}  // namespace ipmi
