#pragma once

#include <array>
#include <compare>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>

#include "ipmi/timestamp.h"

// A record of the event log is 16 bytes, least significant byte first (IPMI 2.0, tables 32-1 to
// 32-3):
//   all        0 record ID (2)  2 record type
//   02h        3 time stamp (4)  7 generator ID (2)  9 event message revision  10 sensor type
//              11 sensor number  12 direction (bit 7) and event type  13 event data (3)
//   C0h-DFh    3 time stamp (4)  7 manufacturer ID (3)  10 data (6)
//   E0h-FFh    3 data (13)
// A Linux kernel writes the text of a panic into records of type F0h: 3 slave address of the
// writer, 4 sequence number from 0, 5 eleven characters padded with NULs.

namespace ipmi {

constexpr std::size_t kSelRecordSize = 16;
using SelBytes = std::array<std::uint8_t, kSelRecordSize>;

constexpr std::uint8_t kSystemEventType = 0x02;
/// Written by some firmware in the layout of a system event, though the standard has no such type.
constexpr std::uint8_t kNonStandardEventType = 0x04;
constexpr std::uint8_t kLinuxPanicType = 0xF0;

enum class RecordKind : std::uint8_t {
    kSensorEvent,       ///< type 02h, and type 04h, which has its layout
    kOemTimestamped,    ///< C0h to DFh
    kOemUntimestamped,  ///< E0h to FFh but for F0h
    kLinuxPanic,        ///< F0h
    kUnknown,           ///< a type without a layout
};
RecordKind KindOfRecord(std::uint8_t recordType);

/// Who generated an event, table 32-1.
struct Generator {
    bool software = false;  ///< `id` is a software ID (7 bits), else a slave address (8 bits, even)
    std::uint8_t id = 0;
    std::uint8_t lun = 0;
    std::uint8_t channel = 0;
    auto operator<=>(const Generator&) const = default;
};
Generator ParseGenerator(std::uint8_t low, std::uint8_t high);
/// "BIOS (software ID 01h)", "controller 20h, LUN 0, channel 0".
std::string GeneratorText(const Generator& generator);

/// A record with its fields named. Those that its kind does not have are 0.
struct SelRecord {
    SelBytes bytes{};  ///< as on the wire
    std::uint16_t id = 0;
    std::uint8_t type = 0;
    RecordKind kind = RecordKind::kUnknown;

    std::uint32_t time = kUnspecifiedTime;  ///< kSensorEvent, kOemTimestamped; see KindOfTime

    // kSensorEvent
    Generator generator;
    std::uint8_t messageRevision = 0;
    std::uint8_t sensorType = 0;
    std::uint8_t sensorNumber = 0;
    bool deassertion = false;
    std::uint8_t eventType = 0;  ///< event/reading type, 7 bits
    std::array<std::uint8_t, 3> data{};

    std::uint32_t manufacturerId = 0;  ///< kOemTimestamped; IANA enterprise number

    /// The offset of the event within its type.
    std::uint8_t offset() const { return data[0] & 0x0F; }
    /// What the record leaves to its writer: the bytes after time and manufacturer of
    /// kOemTimestamped, after the type of kOemUntimestamped and kUnknown; none of the other kinds.
    std::span<const std::uint8_t> oemData() const;

    bool operator==(const SelRecord& other) const { return bytes == other.bytes; }
};

/// Sixteen bytes; more are not looked at, fewer are no record.
std::optional<SelRecord> ParseSelRecord(std::span<const std::uint8_t> bytes);

/// The answer of Get SEL Entry for a whole record, after the completion code.
struct SelEntry {
    std::uint16_t nextRecordId = 0;  ///< kLastRecordId after the last one
    SelRecord record;
};
std::optional<SelEntry> ParseSelEntry(std::span<const std::uint8_t> response);

/// The piece of a panic's text that a kLinuxPanic record has.
struct PanicPiece {
    std::uint8_t writer = 0;    ///< slave address
    std::uint8_t sequence = 0;  ///< from 0
    std::string text;           ///< at most 11 characters, up to the first NUL
};
PanicPiece ParsePanicPiece(const SelRecord& record);

/// A PCI Express error that a daemon of a Linux host wrote as a kOemTimestamped record.
struct PcieError {
    bool correctable = false;
    std::uint8_t segment = 0;
    std::uint8_t bus = 0;
    std::uint8_t device = 0;
    std::uint8_t function = 0;
};
std::optional<PcieError> ParsePcieError(const SelRecord& record);

}  // namespace ipmi
