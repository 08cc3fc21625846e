#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "ipmi/fru_multi_record.h"

// The inventory of a FRU device: Platform Management FRU Information Storage Definition 1.0,
// revision 1.3. Clauses are of that document.
//
//   common header (8)   0 format version (1), then where each area begins, in eights of bytes,
//                       0 for none: 1 internal use, 2 chassis, 3 board, 4 product,
//                       5 multi-records; 6 zero, 7 checksum
//   area (10 to 12)     0 format version, 1 length in eights of bytes; chassis: 2 type; board:
//                       2 language, 3-5 minutes since 1996; product: 2 language; then fields, C1h,
//                       zeros, checksum
//   field (13)          bits 7..6 encoding, 5..0 number of bytes; the bytes
//   multi-record (16)   0 type, 1 bit 7 last one, bits 3..0 format (2), 2 length of the data,
//                       3 checksum of the data, 4 checksum of the header; the data
//
// A checksum is right when the bytes that it covers and itself add up to 0 modulo 256.

namespace ipmi {

/// What stands in an area. A text that is not there, empty or blank is empty.
struct FruChassis {
    std::uint8_t type = 0;  ///< as of SMBIOS type 3
    std::string partNumber;
    std::string serialNumber;
    std::vector<std::string> custom;
};

struct FruBoard {
    std::optional<std::int64_t> manufactured;  ///< seconds since 1970-01-01, taken as UTC
    std::string manufacturer;
    std::string product;
    std::string serialNumber;
    std::string partNumber;
    std::string fruFile;
    std::vector<std::string> custom;
};

struct FruProduct {
    std::string manufacturer;
    std::string name;
    std::string partNumber;
    std::string version;
    std::string serialNumber;
    std::string assetTag;
    std::string fruFile;
    std::vector<std::string> custom;
};

struct FruInventory {
    std::optional<FruChassis> chassis;
    std::optional<FruBoard> board;
    std::optional<FruProduct> product;
    std::vector<FruMultiRecord> multiRecords;
    std::vector<std::string> problems;  ///< what is wrong with the bytes, a line each
    /// Whether header and areas are whole, with right checksums.
    bool sound = true;
};

/// Reads a device of `size` bytes of which `bytes` could be had. What is damaged is reported in the
/// problems, and what can be had beside it is had. Bytes that are no inventory give problems alone,
/// and so does an area whose checksum and fields are both wrong: something else stands there.
FruInventory ReadFruInventory(std::span<const std::uint8_t> bytes, std::size_t size);

/// The name of a chassis type (SMBIOS type 3, DSP0134 7.4.1); empty for one that it does not have.
std::string ChassisTypeName(std::uint8_t type);

}  // namespace ipmi
