#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

// SMBIOS structures as values (DSP0134 3.6): what the firmware tells the operating system about the
// parts of the machine. A structure: type, length of the formatted area (4 at least), handle (16
// bits), the rest of the formatted area; then its strings, each with its NUL, and a further NUL.
// Fields that name a string hold its number, from 1; 0 is none.

namespace ipmi {

/// Structure types that are read here.
constexpr std::uint8_t kSmbiosSystem = 1;
constexpr std::uint8_t kSmbiosProcessor = 4;
constexpr std::uint8_t kSmbiosSlot = 9;
constexpr std::uint8_t kSmbiosMemoryDevice = 17;
constexpr std::uint8_t kSmbiosIpmiDevice = 38;

/// Whether one of the structures is an IPMI device information: the machine has a BMC.
bool HasIpmiDevice(std::span<const std::vector<std::uint8_t>> structures);

/// The number-th string (from 1) of a structure; empty when it has none of that number.
std::string SmbiosString(std::span<const std::uint8_t> structure, std::size_t number);
/// The string whose number stands at `offset` of the formatted area; empty when the area ends
/// before it.
std::string SmbiosStringAt(std::span<const std::uint8_t> structure, std::size_t offset);

/// Texts below are without padding, and empty where the firmware says in words that it does not
/// know ("Not Specified", "To Be Filled By O.E.M." and the like).
struct SmbiosSystem {
    std::string manufacturer;
    std::string product;
    std::string serialNumber;
    std::optional<std::array<std::uint8_t, 16>> uuid;  ///< as it stands; all 00h or FFh is none
};

struct SmbiosProcessor {
    std::string socket;
    std::string manufacturer;
    std::string version;
    std::string serialNumber;
    std::string partNumber;
};

struct SmbiosSlot {
    struct Address {
        std::uint16_t segment = 0;
        std::uint8_t bus = 0;
        std::uint8_t device = 0;
        std::uint8_t function = 0;
    };
    std::string designation;
    std::uint16_t id = 0;            ///< of PCI slots: the number that software knows it by
    bool inUse = false;              ///< said to be
    std::optional<Address> address;  ///< of the device in it
};

struct SmbiosMemoryDevice {
    std::string slot;  ///< the label of the socket
    std::string bank;
    std::string type;  ///< "DDR4"; empty for those that are not in the list here
    std::optional<std::uint32_t> sizeMiB;  ///< 0: nothing in the slot
    std::string manufacturer;
    std::string serialNumber;
    std::string partNumber;

    bool isInstalled() const { return sizeMiB != 0U; }
};

/// Where the firmware says that the BMC's system interface is.
struct SmbiosIpmiDevice {
    enum class Interface : std::uint8_t { kUnknown, kKcs, kSmic, kBlockTransfer, kSsif };
    Interface interface {};
    bool isIo = false;          ///< in I/O space, else in memory
    std::uint64_t address = 0;  ///< of SSIF its slave address, in bits 7 to 1
};

/// Each reads a structure of its type, string set included; empty for another type, and for one
/// that ends before what is always there.
std::optional<SmbiosSystem> ReadSmbiosSystem(std::span<const std::uint8_t> structure);
std::optional<SmbiosProcessor> ReadSmbiosProcessor(std::span<const std::uint8_t> structure);
std::optional<SmbiosSlot> ReadSmbiosSlot(std::span<const std::uint8_t> structure);
std::optional<SmbiosMemoryDevice> ReadSmbiosMemoryDevice(std::span<const std::uint8_t> structure);
std::optional<SmbiosIpmiDevice> ReadSmbiosIpmiDevice(std::span<const std::uint8_t> structure);

}  // namespace ipmi
