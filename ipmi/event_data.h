#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "ipmi/sel_record.h"

namespace ipmi {

/// What the kinds of event data 2 and 3 are, event data 1 bits 7..4 (IPMI 2.0 table 29-6).
enum class DataUse : std::uint8_t {
    kUnused,
    kTrigger,    ///< event data 2: reading of a threshold event, else previous state and severity;
                 ///< event data 3: threshold value
    kOem,        ///< the vendor's
    kExtension,  ///< sensor-specific, table 42-3
};
DataUse UseOfData2(const SelRecord& record);
DataUse UseOfData3(const SelRecord& record);

/// Slot types of sensor type 21h that code asks for by name.
constexpr std::uint8_t kPciSlot = 0;
constexpr std::uint8_t kExpansionSlot = 4;
constexpr std::uint8_t kEntitySlot = 5;  ///< its number is an instance of the sensor's entity
constexpr std::uint8_t kMemorySlot = 7;
constexpr std::uint8_t kPciExpressSlot = 9;

/// Event data 2 and 3 of a sensor event by what the standard says they mean. What is unspecified
/// there (FFh where the standard has it so) is left out.
struct EventData {
    std::optional<std::uint8_t> reading;    ///< raw, of a threshold event
    std::optional<std::uint8_t> threshold;  ///< raw, of a threshold event

    std::optional<std::uint8_t> memoryModule;  ///< relative to the sensor's entity, if it has one
    std::optional<std::uint8_t> processorInstance;  ///< entity instance of a processor
    std::optional<std::uint8_t> slotType;
    std::optional<std::uint8_t> slotNumber;
    std::optional<std::uint8_t> sensorNumber;  ///< of the sensor that failed, same owner
    std::optional<std::uint8_t> fruDevice;     ///< FRU device ID within the generator that failed

    /// All of it but reading and threshold in words, each a phrase, in the order of the bytes.
    std::vector<std::string> words;
    /// The bytes among event data 2 and 3 that are used and that the standard leaves to the vendor.
    std::vector<std::uint8_t> oemBytes;
};
EventData DecodeEventData(const SelRecord& record);

/// Which record it is of the pair around a change of the event log's clock: sensor type 12h,
/// offset 5. None for every other record, and where only the sensor repository's clock was changed.
enum class ClockSet : std::uint8_t { kFirst, kSecond, kUnspecified };
std::optional<ClockSet> ClockSetOf(const SelRecord& record);

}  // namespace ipmi
