#include "ipmi/smbios.h"

#include <algorithm>
#include <string_view>

#include "base/bytes.h"

namespace ipmi {
namespace {

using Bytes = std::span<const std::uint8_t>;

/// The formatted area of a structure of that type which is at least so long; else empty.
Bytes Formatted(Bytes structure, std::uint8_t type, std::size_t least) {
    if (structure.size() < 2 || structure[0] != type) return {};
    const std::size_t length = structure[1];
    if (length < least || length > structure.size()) return {};
    return structure.first(length);
}

bool EqualWithoutCase(std::string_view a, std::string_view b) {
    const auto lower = [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; };
    return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                      [&](char x, char y) { return lower(x) == lower(y); });
}

/// What firmware writes where it knows nothing.
bool IsPlaceholder(std::string_view text) {
    constexpr std::string_view kPlaceholders[] = {"Not Specified",
                                                  "To Be Filled By O.E.M.",
                                                  "To be filled by OEM",
                                                  "Unknown",
                                                  "None",
                                                  "N/A",
                                                  "NA",
                                                  "NO DIMM",
                                                  "Not Available",
                                                  "Default string",
                                                  "Not Provided",
                                                  "Undefined",
                                                  "Empty",
                                                  "System Serial Number",
                                                  "System Product Name",
                                                  "System manufacturer"};
    return std::any_of(std::begin(kPlaceholders), std::end(kPlaceholders),
                       [&](std::string_view other) { return EqualWithoutCase(text, other); });
}

std::string TextAt(Bytes structure, std::size_t offset) {
    std::string text = SmbiosStringAt(structure, offset);
    text.erase(text.find_last_not_of(' ') + 1);
    text.erase(0, std::min(text.find_first_not_of(' '), text.size()));
    return IsPlaceholder(text) ? std::string() : text;
}

std::uint16_t Word(Bytes area, std::size_t at) {
    return static_cast<std::uint16_t>(area[at] | area[at + 1] << 8);
}

/// 7.18.2, those that servers have.
std::string MemoryType(std::uint8_t type) {
    switch (type) {
        case 0x12:
            return "DDR";
        case 0x13:
            return "DDR2";
        case 0x14:
            return "DDR2 FB-DIMM";
        case 0x18:
            return "DDR3";
        case 0x1A:
            return "DDR4";
        case 0x20:
            return "HBM";
        case 0x21:
            return "HBM2";
        case 0x22:
            return "DDR5";
        case 0x24:
            return "HBM3";
        default:
            return {};
    }
}

/// Bytes 0Ch and 0Dh: FFFFh unknown, 7FFFh see the four bytes at 1Ch, bit 15 KiB in place of MiB.
std::optional<std::uint32_t> MemorySize(Bytes area) {
    constexpr std::size_t kSizeAt = 0x0C;
    constexpr std::size_t kExtendedAt = 0x1C;
    const std::uint16_t size = Word(area, kSizeAt);
    if (size == 0xFFFF) return std::nullopt;
    if (size == 0x7FFF) {
        if (area.size() < kExtendedAt + 4) return std::nullopt;
        ipmisel::ByteReader in(area.subspan(kExtendedAt));
        return in.U32() & 0x7FFFFFFF;
    }
    return (size & 0x8000) != 0 ? (size & 0x7FFFU) / 1024 : size;
}

}  // namespace

bool HasIpmiDevice(std::span<const std::vector<std::uint8_t>> structures) {
    return std::any_of(structures.begin(), structures.end(), [](const auto& structure) {
        return !structure.empty() && structure[0] == kSmbiosIpmiDevice;
    });
}

std::string SmbiosString(Bytes structure, std::size_t number) {
    if (number == 0 || structure.size() < 2 || structure[1] > structure.size()) return {};
    Bytes strings = structure.subspan(structure[1]);
    for (;;) {
        const auto end = std::find(strings.begin(), strings.end(), 0);
        // An empty string ends the set; one without its NUL is cut off.
        if (end == strings.begin() || end == strings.end()) return {};
        if (--number == 0) return {strings.begin(), end};
        strings = strings.subspan(static_cast<std::size_t>(end - strings.begin()) + 1);
    }
}

std::string SmbiosStringAt(Bytes structure, std::size_t offset) {
    if (structure.size() < 2 || offset >= structure[1] || offset >= structure.size()) return {};
    return SmbiosString(structure, structure[offset]);
}

std::optional<SmbiosSystem> ReadSmbiosSystem(Bytes structure) {  // 7.2
    constexpr std::size_t kUuidAt = 0x08;
    const Bytes area = Formatted(structure, kSmbiosSystem, kUuidAt);
    if (area.empty()) return std::nullopt;
    SmbiosSystem system;
    system.manufacturer = TextAt(structure, 0x04);
    system.product = TextAt(structure, 0x05);
    system.serialNumber = TextAt(structure, 0x07);
    std::array<std::uint8_t, 16> uuid{};
    if (area.size() >= kUuidAt + uuid.size()) {
        std::copy_n(area.begin() + kUuidAt, uuid.size(), uuid.begin());
        const bool all = std::all_of(uuid.begin(), uuid.end(), [&](std::uint8_t byte) {
            return byte == uuid[0] && (byte == 0x00 || byte == 0xFF);
        });
        if (!all) system.uuid = uuid;
    }
    return system;
}

std::optional<SmbiosProcessor> ReadSmbiosProcessor(Bytes structure) {  // 7.5
    constexpr std::size_t kLeast = 0x1A;                               // of SMBIOS 2.0
    if (Formatted(structure, kSmbiosProcessor, kLeast).empty()) return std::nullopt;
    SmbiosProcessor processor;
    processor.socket = TextAt(structure, 0x04);
    processor.manufacturer = TextAt(structure, 0x07);
    processor.version = TextAt(structure, 0x10);
    processor.serialNumber = TextAt(structure, 0x20);
    processor.partNumber = TextAt(structure, 0x22);
    return processor;
}

std::optional<SmbiosSlot> ReadSmbiosSlot(Bytes structure) {  // 7.10
    constexpr std::size_t kLeast = 0x0C;                     // of SMBIOS 2.0
    constexpr std::size_t kAddressAt = 0x0D;
    constexpr std::size_t kAddressEnd = 0x11;
    constexpr std::uint8_t kInUse = 4;
    const Bytes area = Formatted(structure, kSmbiosSlot, kLeast);
    if (area.empty()) return std::nullopt;
    SmbiosSlot slot;
    slot.designation = TextAt(structure, 0x04);
    slot.inUse = area[0x07] == kInUse;
    slot.id = Word(area, 0x09);
    if (area.size() >= kAddressEnd) {
        const SmbiosSlot::Address address{.segment = Word(area, kAddressAt),
                                          .bus = area[0x0F],
                                          .device = static_cast<std::uint8_t>(area[0x10] >> 3),
                                          .function = static_cast<std::uint8_t>(area[0x10] & 7)};
        // FFh in each: not of a kind that has an address.
        if (address.segment != 0xFFFF || address.bus != 0xFF || area[0x10] != 0xFF) {
            slot.address = address;
        }
    }
    return slot;
}

std::optional<SmbiosMemoryDevice> ReadSmbiosMemoryDevice(Bytes structure) {  // 7.18
    constexpr std::size_t kLeast = 0x15;                                     // of SMBIOS 2.1
    const Bytes area = Formatted(structure, kSmbiosMemoryDevice, kLeast);
    if (area.empty()) return std::nullopt;
    SmbiosMemoryDevice device;
    device.slot = TextAt(structure, 0x10);
    device.bank = TextAt(structure, 0x11);
    device.type = MemoryType(area[0x12]);
    device.sizeMiB = MemorySize(area);
    device.manufacturer = TextAt(structure, 0x17);
    device.serialNumber = TextAt(structure, 0x18);
    device.partNumber = TextAt(structure, 0x1A);
    return device;
}

std::optional<SmbiosIpmiDevice> ReadSmbiosIpmiDevice(Bytes structure) {  // 7.39
    constexpr std::size_t kLeast = 0x10;
    constexpr std::size_t kInterfaceAt = 0x04;
    constexpr std::size_t kAddressAt = 0x08;
    constexpr std::size_t kModifierAt = 0x10;
    constexpr std::uint8_t kOddAddress = 0x10;
    const Bytes area = Formatted(structure, kSmbiosIpmiDevice, kLeast);
    if (area.empty()) return std::nullopt;
    SmbiosIpmiDevice device;
    if (area[kInterfaceAt] <= static_cast<std::uint8_t>(SmbiosIpmiDevice::Interface::kSsif)) {
        device.interface = static_cast<SmbiosIpmiDevice::Interface>(area[kInterfaceAt]);
    }
    ipmisel::ByteReader in(area.subspan(kAddressAt));
    const std::uint64_t low = in.U32();
    device.address = low | static_cast<std::uint64_t>(in.U32()) << 32;
    if (device.interface == SmbiosIpmiDevice::Interface::kSsif) return device;
    // Bit 0 is the space; the address's own bit 0 stands in the modifier.
    device.isIo = (device.address & 1) != 0;
    device.address &= ~std::uint64_t{1};
    if (area.size() > kModifierAt && (area[kModifierAt] & kOddAddress) != 0) ++device.address;
    return device;
}

}  // namespace ipmi
