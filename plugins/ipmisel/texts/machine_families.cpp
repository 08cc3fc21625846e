#include "plugins/ipmisel/texts/machine_families.h"

#include <algorithm>
#include <array>

namespace ipmisel {
namespace {

using std::string_view;

// ---- The simulated server -----------------------------------------------------------------------

constexpr std::array<string_view, 1> kSimTypes{"SIM-1"};

constexpr std::array<VpdDevice, 6> kSimDevices{{{"CPU Card", 1, true},
                                                {"CPU", 2, true},
                                                {"System Board", 0},
                                                {"Memory Card 1", 3},
                                                {"Power Supply 1", 4},
                                                {"Power Supply 2", 5}}};

// Names in bit order (bit 0 first) or by code (code 0 first).
constexpr std::array<string_view, 7> kRails12V{"12V A", "12V B", "12V C", "12V D",
                                               "12V E", "12V F", "12V G"};
constexpr std::array<string_view, 5> kResetSources{"Power Supply", "BMC", "Remote", "Button",
                                                   "Southbridge Port 92"};
constexpr std::array<string_view, 4> kOnOffSources{"Power Supply", "BMC", "Remote", "Button"};
constexpr std::array<string_view, 2> kPingSources{"BMC", "Remote"};
constexpr std::array<string_view, 6> kSlots{"Slot 1", "Slot 2", "Slot 3",
                                            "Slot 4", "Slot 5", "Slot 6"};
constexpr std::array<string_view, 4> kCpuCardRails{"CPU 12V", "3.3V", "5V", "5V Aux"};
constexpr std::array<string_view, 5> kPciCardRails{"12V", "-12V", "5V", "3.3V", "3.3V Aux"};
constexpr std::array<string_view, 4> kSuperIoRails{"5V", "3.3V", "5V Aux", "3.3V Aux"};
constexpr std::array<string_view, 4> kMemoryCards{"Memory Card 1", "Memory Card 2", "Memory Card 3",
                                                  "Memory Card 4"};
constexpr std::array<string_view, 16> kDimms{
    "DIMM 1", "DIMM 2",  "DIMM 3",  "DIMM 4",  "DIMM 5",  "DIMM 6",  "DIMM 7",  "DIMM 8",
    "DIMM 9", "DIMM 10", "DIMM 11", "DIMM 12", "DIMM 13", "DIMM 14", "DIMM 15", "DIMM 16"};
constexpr std::array<string_view, 7> kLinksAndCards{
    "Link 1",        "Link 2",        "Link 3",       "Memory Card 1",
    "Memory Card 2", "Memory Card 3", "Memory Card 4"};
constexpr std::array<string_view, 4> kProcessors{"CPU 1", "CPU 2", "CPU 3", "CPU 4"};
constexpr std::array<string_view, 9> kPowerSupplyStates{"Normal Operation",
                                                        "DC Good Fault",
                                                        "Thermal Warning#",
                                                        "Thermal Fault#",
                                                        "Thermal Shutdown#",
                                                        "OV12#",
                                                        "UV12#",
                                                        "OC12#",
                                                        "CSF#"};

constexpr OemDetail Bits(std::uint8_t sensorType, std::uint8_t sensor, OemData data,
                         string_view heading, std::span<const string_view> names) {
    return {sensorType, sensor, sensor, data, OemForm::kBits, heading, names};
}
constexpr OemDetail Code(std::uint8_t sensorType, std::uint8_t sensor, string_view heading,
                         std::span<const string_view> names) {
    return {sensorType, sensor, sensor, OemData::kData2, OemForm::kCode, heading, names};
}

constexpr std::array<OemDetail, 19> kSimDetails{{
    Bits(0x02, 0xA0, OemData::kData2, "12V Fault(s): ", kRails12V),
    Bits(0x1D, 0xA1, OemData::kData2, "Reset Source(s): ", kResetSources),
    Bits(0x09, 0xA2, OemData::kData2, "On/Off Source(s): ", kOnOffSources),
    Code(0x28, 0xA3, "Ping received: ", kPingSources),
    Bits(0x13, 0xA4, OemData::kData2, "PCI fault(s): ", kSlots),
    Bits(0x13, 0xA4, OemData::kData3, "PCI PME: ", kSlots),
    Bits(0x09, 0xA5, OemData::kData2, "Good CPU Card Power: ", kCpuCardRails),
    Bits(0x09, 0xA6, OemData::kData2, "Good PCI-X Card Power: ", kPciCardRails),
    Bits(0x09, 0xA7, OemData::kData2, "Good Super I/O Card Power: ", kSuperIoRails),
    Bits(0x0C, 0xA8, OemData::kData2, "Machine Check on Memory Card fault: ", kMemoryCards),
    Bits(0x0C, 0xA9, OemData::kBoth, "Machine Check on Memory DIMM fault: ", kDimms),
    Bits(0x07, 0xAA, OemData::kData2, "Machine Check on Link or Card fault: ", kLinksAndCards),
    Bits(0x07, 0xAB, OemData::kData2, "Machine Check fault: ", kProcessors),
    Code(0x08, 0xB0, "Rack Power Supply 1 Fault: ", kPowerSupplyStates),
    Code(0x08, 0xB1, "Rack Power Supply 2 Fault: ", kPowerSupplyStates),
    Code(0x08, 0xB2, "Tower Power Supply 1 Fault: ", kPowerSupplyStates),
    Code(0x08, 0xB3, "Tower Power Supply 2 Fault: ", kPowerSupplyStates),
    Code(0x08, 0xB4, "Tower Power Supply 3 Fault: ", kPowerSupplyStates),
    Code(0x08, 0xB5, "Tower Power Supply 4 Fault: ", kPowerSupplyStates),
}};

constexpr std::uint8_t kSimNetFn = 0x3A;
constexpr std::array<std::uint8_t, 1> kFirstUnit{0x00};
constexpr std::array<std::uint8_t, 1> kSecondUnit{0x01};
constexpr std::array<FirmwareQuery, 4> kSimQueries{{
    {FirmwareKind::kCpld, 0, kSimNetFn, 0x91, kFirstUnit, 1, 2, VersionForm::kMajorMinor, false},
    {FirmwareKind::kFpga, 0, kSimNetFn, 0x92, kFirstUnit, 1, 1, VersionForm::kHex, false},
    {FirmwareKind::kBackplane, 0, kSimNetFn, 0x93, kFirstUnit, 1, 3, VersionForm::kMajorMinor,
     false},
    {FirmwareKind::kBackplane, 1, kSimNetFn, 0x93, kSecondUnit, 1, 3, VersionForm::kMajorMinor,
     false},
}};

// ---- Others -------------------------------------------------------------------------------------

// The FPGA revision is the text of the property page.
constexpr std::array<string_view, 1> kZorvanekTypes{"Zorvanek"};
constexpr std::array<FirmwareQuery, 1> kZorvanekQueries{
    {{FirmwareKind::kFpga, 0, 0x3A, 0x90, {}, 0, 0, VersionForm::kText, true}}};

constexpr std::array<string_view, 1> kMerrowgateTypes{"Merrowgate"};

constexpr std::array<MachineFamily, 3> kFamilies{{
    {"Simulated server", kSimTypes, kSimDevices, kSimDetails, kSimQueries},
    {"Zorvanek", kZorvanekTypes, {}, {}, kZorvanekQueries, kNoVpdDeviceList, true},
    {"Merrowgate",
     kMerrowgateTypes,
     {},
     {},
     {},
     "Could not find vital product data Device list for Baseboard Management Controller machine on "
     "Merrowgate",
     true},
}};

}  // namespace

const MachineFamily* FindMachineFamily(string_view machineType, int* index) {
    const auto* const found =
        std::find_if(kFamilies.begin(), kFamilies.end(), [&](const MachineFamily& family) {
            return std::find(family.machineTypes.begin(), family.machineTypes.end(), machineType) !=
                   family.machineTypes.end();
        });
    if (found == kFamilies.end()) return nullptr;
    if (index != nullptr) *index = static_cast<int>(found - kFamilies.begin());
    return found;
}

bool IsPassedOver(string_view idString) {
    constexpr std::array<string_view, 4> kBoards{"BPE3", "BSE3", "HSDC", "DC1"};
    return std::find(kBoards.begin(), kBoards.end(), idString) != kBoards.end() ||
           idString.find("Processor") != string_view::npos;
}

}  // namespace ipmisel
