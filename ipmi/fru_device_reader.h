#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "ipmi/command.h"

// Reading a FRU device behind its controller: Get FRU Inventory Area Info and Read FRU Data (IPMI
// 2.0, 34.1 and 34.2).

namespace ipmi {

/// Answer of Get FRU Inventory Area Info.
struct FruAreaInfo {
    std::uint16_t size = 0;  ///< bytes
    bool byWords = false;    ///< offsets and counts of Read FRU Data are of words of two bytes
};

/// Reads the data after the completion code; empty when they are too short.
std::optional<FruAreaInfo> ParseFruAreaInfo(std::span<const std::uint8_t> data);

/// Plans the reads of a whole device and gathers their answers.
class FruDeviceReader {
public:
    FruDeviceReader(std::uint8_t device, FruAreaInfo info) : device_(device), info_(info) {}

    /// The next Read FRU Data; empty when there is nothing left to read.
    std::optional<Command> NextRequest() const;
    /// Takes the answer to it: the completion code and the data after it. A device that gives less
    /// than wanted is asked for the rest, one that cannot give so much at a time for less. Any
    /// other completion code and an answer without data end the reading.
    void TakeAnswer(std::uint8_t completionCode, std::span<const std::uint8_t> data);
    /// Ends the reading.
    void Stop() { ended_ = true; }

    const std::vector<std::uint8_t>& bytes() const { return bytes_; }
    bool complete() const { return bytes_.size() >= info_.size; }

private:
    static constexpr std::size_t kFirstChunk = 32;
    static constexpr std::size_t kLeastChunk = 4;

    std::size_t Unit() const { return info_.byWords ? 2 : 1; }
    /// Of the next request, in the device's units; at least 1 while something is left.
    std::size_t Count() const;

    std::uint8_t device_;
    FruAreaInfo info_;
    std::size_t chunk_ = kFirstChunk;  ///< bytes wanted in one answer
    bool ended_ = false;
    std::vector<std::uint8_t> bytes_;
};

}  // namespace ipmi
