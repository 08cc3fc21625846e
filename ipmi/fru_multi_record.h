#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

// Multi-records of a FRU device: Platform Management FRU Information Storage Definition 1.0,
// revision 1.3, clauses 16 to 18.

namespace ipmi {

/// One value of a multi-record, with its unit where it has one.
struct FruValue {
    std::string name;
    std::string value;
    std::string unit;
};

struct FruMultiRecord {
    std::uint8_t type = 0;
    std::string name;
    std::vector<FruValue> values;  ///< those that the record gives
};

/// Bytes of a record whose layout is of fixed length; 0 for the others.
std::size_t FixedMultiRecordLength(std::uint8_t type);

/// The values of a record from its data, without its header. Data that end early have the values
/// that are whole; a record without a standard layout has its bytes.
FruMultiRecord ReadMultiRecord(std::uint8_t type, std::span<const std::uint8_t> data);

/// The record's name, then each `name value unit`, all separated by "; ".
std::string MultiRecordText(const FruMultiRecord& record);

}  // namespace ipmi
