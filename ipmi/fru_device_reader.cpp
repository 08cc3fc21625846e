#include "ipmi/fru_device_reader.h"

#include <algorithm>

#include "base/bytes.h"

namespace ipmi {

std::optional<FruAreaInfo> ParseFruAreaInfo(std::span<const std::uint8_t> data) {
    ipmisel::ByteReader in(data);
    FruAreaInfo info;
    info.size = in.U16();
    info.byWords = (in.U8() & 0x01) != 0;
    if (!in.ok()) return std::nullopt;
    return info;
}

std::size_t FruDeviceReader::Count() const {
    const std::size_t left = info_.size - bytes_.size();
    const std::size_t wanted = std::min(left, chunk_);
    return (wanted + Unit() - 1) / Unit();
}

std::optional<Command> FruDeviceReader::NextRequest() const {
    if (ended_ || complete()) return std::nullopt;
    return ReadFruData(device_, static_cast<std::uint16_t>(bytes_.size() / Unit()),
                       static_cast<std::uint8_t>(Count()));
}

void FruDeviceReader::TakeAnswer(std::uint8_t completionCode, std::span<const std::uint8_t> data) {
    if (ended_ || complete()) return;
    if (RefusesSoManyBytes(completionCode) && chunk_ > kLeastChunk) {
        chunk_ /= 2;
        return;
    }
    if (completionCode != kCompleted || data.size() < 2) return Stop();
    // The count, then the bytes: no more of them than wanted, claimed and there.
    const std::size_t given = std::min({data[0] * Unit(), Count() * Unit(), data.size() - 1});
    // A part of a word cannot be read on from.
    const std::size_t whole = given / Unit() * Unit();
    if (whole == 0) return Stop();
    const auto bytes = data.subspan(1, std::min(whole, info_.size - bytes_.size()));
    bytes_.insert(bytes_.end(), bytes.begin(), bytes.end());
}

}  // namespace ipmi
