#include "ipmi/sdr_record.h"

#include <algorithm>

#include "base/bytes.h"
#include "ipmi/id_string.h"

namespace ipmi {
namespace {

using Bytes = std::span<const std::uint8_t>;
using ipmisel::ByteReader;

std::uint8_t HighNibble(std::uint8_t byte) { return byte >> 4; }

LimitAccess Access(std::uint8_t bits) { return static_cast<LimitAccess>(bits & 0x03); }

/// Entity ID and instance, bit 7 of which marks a logical entity.
Entity ReadEntity(ByteReader* in, bool* isLogical = nullptr) {
    Entity entity{in->U8(), in->U8()};
    if (isLogical != nullptr) *isLogical = (entity.instance & 0x80) != 0;
    entity.instance &= 0x7F;
    return entity;
}

/// The type/length byte at `at` and the ID string behind it; false when the string is cut.
bool ReadName(Bytes record, std::size_t at, std::string* name) {
    if (at >= record.size()) return false;
    const Bytes rest = record.subspan(at + 1);
    *name = DecodeIdString(record[at], rest);
    return TypeLength::FromByte(record[at]).Bytes() <= rest.size();
}

void ReadKey(ByteReader* in, Sensor* sensor) {
    sensor->key.owner = in->U8();
    const std::uint8_t where = in->U8();
    sensor->key.lun = where & 0x03;
    sensor->channel = HighNibble(where);
    sensor->key.number = in->U8();
}

/// Bytes 9 to 23 of full and compact records; false when the record ends before the event type.
bool ReadCommon(ByteReader* in, Sensor* sensor) {
    ReadKey(in, sensor);
    sensor->entity = ReadEntity(in, &sensor->entityIsLogical);
    in->U8();  // initialisation
    const std::uint8_t capabilities = in->U8();
    sensor->ignoredWithoutEntity = (capabilities & 0x80) != 0;
    sensor->hysteresisAccess = Access(capabilities >> 4);
    sensor->thresholdAccess = Access(capabilities >> 2);
    sensor->sensorType = in->U8();
    sensor->eventType = in->U8();
    if (!in->ok()) return false;
    sensor->assertionMask = in->U16();
    sensor->deassertionMask = in->U16();
    sensor->readingMask = in->U16();
    sensor->units = {in->U8(), in->U8(), in->U8()};
    if (!in->ok()) sensor->units = {static_cast<std::uint8_t>(0xC0), 0, 0};  // no number format
    return true;
}

/// Bytes 24 to 44 of a full record, as far as they go; empty without the factors.
std::optional<AnalogSensor> ReadAnalog(Bytes record, const Sensor& sensor) {
    constexpr std::size_t kLinearization = 23;
    constexpr std::size_t kAnalogFlags = 30;
    if (record.size() < kAnalogFlags) return std::nullopt;
    AnalogSensor analog;
    analog.conversion.format = sensor.units.Format();
    analog.conversion.linearization = record[kLinearization] & 0x7F;
    analog.conversion.factors = *ReadingFactors::Parse(record.subspan(kLinearization + 1));
    ByteReader in(record.subspan(kAnalogFlags));
    const std::uint8_t given = in.U8();
    const auto next = [&](bool isGiven) {
        const std::uint8_t value = in.U8();
        return isGiven && in.ok() ? std::optional(value) : std::nullopt;
    };
    analog.nominal = next((given & 0x01) != 0);
    analog.normalMaximum = next((given & 0x02) != 0);
    analog.normalMinimum = next((given & 0x04) != 0);
    in.Skip(2);  // sensor maximum and minimum
    // From upper non-recoverable down to lower non-critical: masks and answers count the other way.
    constexpr Threshold kOrder[] = {
        Threshold::kUpperNonRecoverable, Threshold::kUpperCritical, Threshold::kUpperNonCritical,
        Threshold::kLowerNonRecoverable, Threshold::kLowerCritical, Threshold::kLowerNonCritical};
    for (const Threshold threshold : kOrder) {
        analog.thresholds.raw[static_cast<std::size_t>(threshold)] = in.U8();
    }
    if (in.ok()) analog.thresholds.readable = sensor.readingMask & 0x3F;
    analog.positiveHysteresis = next(true);
    analog.negativeHysteresis = next(true);
    return analog;
}

SdrRecord::Sharing ReadSharing(std::uint8_t first, std::uint8_t second) {
    return {.count = std::max(1U, first & 0x0FU),
            .alphabetic = (first >> 4 & 0x03) == 1,
            .entityInstances = (second & 0x80) != 0,
            .offset = second & 0x7FU};
}

/// Of all the readers below: the body goes into the record when its key is there; true when every
/// field of the type is.
bool ReadSensor(Bytes bytes, SdrRecord* record) {
    ByteReader in(bytes.subspan(kSdrHeaderLength));
    Sensor sensor;
    sensor.recordId = record->header.recordId;
    sensor.type = record->header.type;
    bool whole = false;
    if (sensor.type == SdrType::kEventOnly) {
        ReadKey(&in, &sensor);
        sensor.entity = ReadEntity(&in, &sensor.entityIsLogical);
        sensor.sensorType = in.U8();
        sensor.eventType = in.U8();
        sensor.units.flags = 0xC0;  // such a sensor cannot be read
        if (!in.ok()) return false;
        const std::uint8_t share = in.U8();
        const std::uint8_t modifier = in.U8();
        if (in.ok()) record->sharing = ReadSharing(share, modifier);
        whole = ReadName(bytes, kEventOnlyNameAt, &sensor.name);
    } else {
        if (!ReadCommon(&in, &sensor)) return false;
        if (sensor.type == SdrType::kFull) {
            sensor.analog = ReadAnalog(bytes, sensor);
            whole = ReadName(bytes, kFullNameAt, &sensor.name);
        } else {
            const std::uint8_t share = in.U8();
            const std::uint8_t modifier = in.U8();
            if (in.ok()) record->sharing = ReadSharing(share, modifier);
            whole = ReadName(bytes, kCompactNameAt, &sensor.name);
        }
    }
    record->body = std::move(sensor);
    return whole;
}

bool ReadAssociation(Bytes bytes, SdrRecord* record) {
    ByteReader in(bytes.subspan(kSdrHeaderLength));
    const bool relative = record->header.type == SdrType::kDeviceRelativeAssociation;
    EntityAssociation association;
    association.container = ReadEntity(&in);
    if (relative) {
        association.containerAddress = in.U8() & 0xFE;
        association.containerChannel = HighNibble(in.U8());
    }
    const std::uint8_t flags = in.U8();
    if (!in.ok()) return false;
    association.isRange = (flags & 0x80) != 0;
    association.isLinked = (flags & 0x40) != 0;
    for (int i = 0; i < 4; ++i) {
        EntityAssociation::Member member;
        if (relative) {
            member.address = in.U8() & 0xFE;
            member.channel = HighNibble(in.U8());
        }
        member.entity = ReadEntity(&in);
        if (in.ok() && member.entity.IsSpecified()) association.members.push_back(member);
    }
    record->body = std::move(association);
    return in.ok();
}

/// What every locator ends with: whose it is, and its name. False when the name is not whole.
template <typename Locator>
bool ReadNamedEntity(ByteReader in, Bytes bytes, Locator locator, SdrRecord* record) {
    locator.entity = ReadEntity(&in);
    if (!in.ok()) locator.entity = {};
    const bool whole = ReadName(bytes, kLocatorNameAt, &locator.name);
    record->body = std::move(locator);
    return whole;
}

/// The end of a locator of a device: its type before that.
template <typename Locator>
bool ReadDevice(ByteReader in, Bytes bytes, Locator locator, SdrRecord* record) {
    locator.deviceType = in.U8();
    locator.deviceTypeModifier = in.U8();
    return ReadNamedEntity(in, bytes, std::move(locator), record);
}

bool ReadFruLocator(Bytes bytes, SdrRecord* record) {
    ByteReader in(bytes.subspan(kSdrHeaderLength));
    FruLocator locator;
    locator.accessAddress = in.U8() & 0xFE;
    locator.deviceId = in.U8();
    const std::uint8_t access = in.U8();
    locator.channel = HighNibble(in.U8());
    if (!in.ok()) return false;
    locator.isLogical = (access & 0x80) != 0;
    locator.lun = access >> 3 & 0x03;
    locator.bus = access & 0x07;
    in.Skip(1);  // reserved
    return ReadDevice(in, bytes, std::move(locator), record);
}

bool ReadGenericLocator(Bytes bytes, SdrRecord* record) {
    ByteReader in(bytes.subspan(kSdrHeaderLength));
    GenericLocator locator;
    locator.accessAddress = in.U8() & 0xFE;
    const std::uint8_t slave = in.U8();
    const std::uint8_t where = in.U8();
    if (!in.ok()) return false;
    locator.slaveAddress = slave & 0xFE;
    locator.channel = static_cast<std::uint8_t>((slave & 0x01) << 3 | where >> 5);
    locator.lun = where >> 3 & 0x03;
    locator.bus = where & 0x07;
    in.Skip(2);  // address span, reserved
    return ReadDevice(in, bytes, std::move(locator), record);
}

bool ReadControllerLocator(Bytes bytes, SdrRecord* record) {
    ByteReader in(bytes.subspan(kSdrHeaderLength));
    ControllerLocator locator;
    locator.slaveAddress = in.U8() & 0xFE;
    locator.channel = in.U8() & 0x0F;
    if (!in.ok()) return false;
    in.U8();  // power states, initialisation
    locator.capabilities = in.U8();
    in.Skip(3);
    return ReadNamedEntity(in, bytes, std::move(locator), record);
}

bool ReadConfirmation(Bytes bytes, SdrRecord* record) {
    ByteReader in(bytes.subspan(kSdrHeaderLength));
    ControllerConfirmation confirmation;
    confirmation.slaveAddress = in.U8() & 0xFE;
    confirmation.deviceId = in.U8();
    const std::uint8_t where = in.U8();
    confirmation.channel = HighNibble(where);
    confirmation.deviceRevision = where & 0x0F;
    for (std::uint8_t& byte : confirmation.firmwareRevision) byte = in.U8();
    confirmation.ipmiVersion = in.U8();
    confirmation.manufacturerId = in.U24();
    confirmation.productId = in.U16();
    for (std::uint8_t& byte : confirmation.guid) byte = in.U8();
    if (!in.ok()) return false;
    record->body = confirmation;
    return true;
}

bool ReadMessageChannel(Bytes bytes, SdrRecord* record) {
    ByteReader in(bytes.subspan(kSdrHeaderLength));
    MessageChannel message;
    for (std::uint8_t& channel : message.channels) channel = in.U8();
    message.messageInterrupt = in.U8();
    message.eventInterrupt = in.U8();
    if (!in.ok()) return false;
    record->body = message;
    return true;
}

bool ReadOem(Bytes bytes, SdrRecord* record) {
    ByteReader in(bytes.subspan(kSdrHeaderLength));
    OemSdr oem;
    oem.manufacturerId = in.U24();
    if (!in.ok()) return false;
    oem.data.assign(bytes.begin() + kSdrHeaderLength + 3, bytes.end());
    record->body = std::move(oem);
    return true;
}

bool ReadBody(Bytes bytes, SdrRecord* record) {
    switch (record->header.type) {
        case SdrType::kFull:
        case SdrType::kCompact:
        case SdrType::kEventOnly:
            return ReadSensor(bytes, record);
        case SdrType::kEntityAssociation:
        case SdrType::kDeviceRelativeAssociation:
            return ReadAssociation(bytes, record);
        case SdrType::kGenericLocator:
            return ReadGenericLocator(bytes, record);
        case SdrType::kFruLocator:
            return ReadFruLocator(bytes, record);
        case SdrType::kControllerLocator:
            return ReadControllerLocator(bytes, record);
        case SdrType::kControllerConfirmation:
            return ReadConfirmation(bytes, record);
        case SdrType::kMessageChannel:
            return ReadMessageChannel(bytes, record);
        case SdrType::kOem:
            return ReadOem(bytes, record);
    }
    return true;  // of another type nothing is known, so nothing is missing
}

}  // namespace

std::optional<SdrHeader> SdrHeader::Parse(std::span<const std::uint8_t> bytes) {
    ByteReader in(bytes);
    SdrHeader header;
    header.recordId = in.U16();
    header.version = in.U8();
    header.type = static_cast<SdrType>(in.U8());
    header.length = in.U8();
    if (!in.ok()) return std::nullopt;
    return header;
}

std::optional<SdrRecord> SdrRecord::Parse(std::span<const std::uint8_t> bytes) {
    const auto header = SdrHeader::Parse(bytes);
    if (!header) return std::nullopt;
    SdrRecord record;
    record.header = *header;
    const std::size_t claimed = header->RecordLength();
    record.whole =
        ReadBody(bytes.first(std::min(bytes.size(), claimed)), &record) && bytes.size() >= claimed;
    return record;
}

bool SdrRecord::IsOfSensor() const {
    return header.type == SdrType::kFull || header.type == SdrType::kCompact ||
           header.type == SdrType::kEventOnly;
}

std::vector<Sensor> SdrRecord::Sensors() const {
    const auto* first = std::get_if<Sensor>(&body);
    if (first == nullptr) return {};
    std::vector<Sensor> sensors;
    for (unsigned i = 0; i < sharing.count; ++i) {
        Sensor sensor = *first;
        if (sharing.count > 1) {
            sensor.key.number = static_cast<std::uint8_t>(first->key.number + i);
            sensor.name += (sensor.name.empty() ? "" : " ") +
                           InstanceModifier(sharing.alphabetic, sharing.offset + i);
            if (sharing.entityInstances) {
                sensor.entity.instance = (first->entity.instance + i) & 0x7F;
            }
        }
        sensors.push_back(std::move(sensor));
    }
    return sensors;
}

bool Sensor::IsAnalog() const {
    if (!analog || units.Format() == NumberFormat::kNone) return false;
    return IsThreshold() || units.base != 0 || units.IsPercentage();
}

SensorThresholds Sensor::FixedThresholds() const {
    if (!analog || thresholdAccess != LimitAccess::kFixed) return {};
    return analog->thresholds;
}

bool EntityAssociation::Contains(const Entity& entity) const {
    if (!isRange) {
        return std::any_of(members.begin(), members.end(),
                           [&](const Member& member) { return member.entity == entity; });
    }
    for (std::size_t i = 0; i + 1 < members.size(); i += 2) {
        const Entity& first = members[i].entity;
        const Entity& last = members[i + 1].entity;
        if (entity.id == first.id && entity.id == last.id && entity.instance >= first.instance &&
            entity.instance <= last.instance) {
            return true;
        }
    }
    return false;
}

std::string InstanceModifier(bool alphabetic, unsigned offset) {
    if (!alphabetic) return std::to_string(offset);
    std::string letters(1, static_cast<char>('A' + offset % 26));
    for (; offset >= 26;) {
        offset = offset / 26 - 1;
        letters.insert(letters.begin(), static_cast<char>('A' + offset % 26));
    }
    return letters;
}

}  // namespace ipmi
